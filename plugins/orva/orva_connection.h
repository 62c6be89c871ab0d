#pragma once

#include <memory>

#include "data/raster_reader.h"
#include "orva/orva_file.h"

namespace lumo::orva {

/// An open ORVA raster. docs/file-formats.md describes the format.
///
/// A new raster gets its header, and thereby becomes one, when the connection is let go.
class Connection final : public RasterDataConnection {
 public:
  ~Connection() override { Disconnect(); }

  bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
               const MetadataPtr& metadata) override;
  void Disconnect() override;
  bool IsConnected() override { return file_ != nullptr; }
  /// The format's key and the path, absolute.
  Array<String> ConnectionStrings() override;
  lumo::URI URI() override;
  std::int32_t DataSourceType() override {
    return static_cast<std::int32_t>(DataSourceKind::kRaster);
  }
  std::int32_t DataType() override { return static_cast<std::int32_t>(def_.dataType); }
  bool CanWrite() override { return file_ != nullptr && file_->CanWrite(); }
  /// False: there are no definition files for these headers yet.
  bool GetMetadata(const String& mdfPath, const LockableMetadataImplPtr& store) override;

  RasterReaderDispatchPtr RasterReaderDispatch() override { return dispatch_; }
  lumo::RasterDef RasterDef() override { return def_; }
  bool CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) override;
  DataConnectionPtr SelfPointer() override { return DataConnectionPtr(this, true); }

  File* GetFile() { return file_.get(); }

 private:
  bool MakeReader();

  std::unique_ptr<File> file_;
  lumo::RasterDef def_;
  RasterReaderDispatchPtr dispatch_{new lumo::RasterReaderDispatch};
};

}  // namespace lumo::orva
