#pragma once

#include "data/plain_raster_reader.h"
#include "pyramid_build.h"
#include "pyramid_tile_cache.h"

namespace lumo::pyramid {

/// A pyramid file as a raster source: what stands on the disk, and the build that is to replace it.
/// docs/file-formats.md describes the format.
///
/// One that is made has no file until a build of it is whole.
class Connection final : public PlainRasterConnection {
 public:
  ~Connection() override { Disconnect(); }

  bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
               const MetadataPtr& metadata) override;
  void Disconnect() override;
  bool CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) override;

  const lumo::RasterDef& Def() const { return def_; }
  lumo::RasterDef& Def() { return def_; }
  const std::string& Path() const { return path_; }
  /// How the tiles of a build are packed.
  Packing GetPacking() const { return compression_; }

  /// The file that stands on the disk; null when there is none.
  PyramidFile* File() const { return file_.get(); }
  TileCache& Cache() { return cache_; }
  /// The build under way; null when there is none.
  Build* GetBuild() const { return build_.get(); }

  bool BeginBuild(const Header& wanted);
  /// Completes a build that is whole, and shows it. It takes its place unless another connection
  /// has written it and is still open; where it lies until then it may get its statistics, without
  /// which it goes. A build that is not whole ends, unless another connection writes to it.
  /// @param values  for a build that is completed.
  /// @param getsStats  statistics are made of such pixels.
  /// @return whether there is a file.
  bool Refresh(const std::string& values, bool getsStats);
  /// Where the file lies that is shown.
  const std::string& PathShown() const;
  /// Lets `change` change the values of the file that is shown.
  bool ChangeValues(const std::function<bool(const std::string&, std::string&)>& change);
  bool Delete();

  bool Fail(const std::string& fault) const;

 private:
  void ShowFault() const;
  bool Begin(const Array<String>& connStrings);
  bool OpenFile();
  bool IsPending() const { return build_ != nullptr && build_->IsComplete() && !build_->IsOver(); }
  void LeaveBuild();
  bool MakeReader();

  std::string path_;
  Packing compression_ = Packing::kLz4;
  lumo::RasterDef def_;
  std::unique_ptr<PyramidFile> file_;
  std::shared_ptr<Build> build_;
  TileCache cache_;
};

/// The contents of connection strings beside the format's key: the path, and how tiles are packed.
struct Place {
  std::string path;  ///< absolute, with links resolved; empty when the strings name none
  Packing compression = Packing::kLz4;
};
/// False, with SetFault, for strings that name no file, or have a piece too many.
bool FindPlace(const Array<String>& connStrings, Place& place);

}  // namespace lumo::pyramid
