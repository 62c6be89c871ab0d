#pragma once

#include <functional>

#include "data/data_connection.h"
#include "foundation/color.h"
#include "raster/raster_def.h"
#include "tiff/tiff_stats.h"
#include "tiff/tiff_window.h"

namespace lumo::tiff {

/// Opens a source by GDAL.
using Opener = std::function<DataConnectionPtr()>;

/// An open TIFF file of a usual kind, with what its reader needs whatever the pixel type.
///
/// It describes itself, and gives its pixels, as GDAL would. What is asked of it beyond that, and
/// what it can't read, goes to a connection of GDAL's, which is opened when that is first needed.
/// Threads: one at a time, always the same.
class Source {
 public:
  /// Opens a file. Null, without a word, for one that is GDAL's to open.
  /// @param path  absolute.
  static std::unique_ptr<Source> Open(const std::string& path, const String& formatKey,
                                      Opener opener);

  /// The description, with its metadata.
  const RasterDef& Def() const { return def_; }
  /// The no-data value of all bands.
  const std::optional<double>& NoData() const { return noData_; }
  const std::string& Path() const { return file_->Handle().Path(); }

  /// The colours of the values of the one band; none where they aren't such numbers.
  const Palette& Colors() const { return colors_; }
  /// The last band, where the pixels at which it is 0 are masked in all others.
  const std::optional<unsigned>& MaskingBand() const { return maskingBand_; }

  /// The levels by number: 0, and a range without gaps from 1 on.
  const std::map<unsigned, Image>& Levels() const { return levels_; }

  /// True when a mask says which pixels of each level are valid.
  bool HasMasks() const { return !masks_.empty(); }
  /// Reads the mask of a rectangle of a level: a byte for each pixel, 0 where it isn't valid.
  bool ReadMask(const Rect& rect, unsigned level, std::vector<unsigned char>& mask);

  /// Reads a rectangle of a level.
  /// @param order  of the axes, that of the description; or any where that is BIP.
  bool Read(const Rect& rect, const Array<unsigned>& bands, unsigned level, Interleave order,
            unsigned char* pixels);

  /// True when the file may be written.
  bool CanWrite();

  /// GDAL's connection, empty with the fault set when the file can't be opened so.
  RasterDataConnectionPtr Inner();
  /// The values of its bands that GDAL stored.
  const StoredItems& Stored() const { return stored_; }
  /// True once Inner was asked for.
  bool HasInner() const { return bool(inner_); }

 private:
  Source(std::unique_ptr<File> file, Opener opener)
      : file_(std::move(file)), opener_(std::move(opener)) {}
  bool Describe(const String& formatKey);
  bool FindLevels();
  bool FindMasks();
  bool TakeSideFile();

  const std::unique_ptr<File> file_;
  const Opener opener_;
  RasterDef def_;
  std::optional<double> noData_;
  Palette colors_;
  std::optional<unsigned> maskingBand_;
  std::map<unsigned, Image> levels_;
  std::map<unsigned, Image> masks_;  // of all levels, or none
  std::map<unsigned, std::unique_ptr<Window>> windows_, maskWindows_;
  StoredItems stored_;
  std::optional<bool> canWrite_;
  RasterDataConnectionPtr inner_;
};

}  // namespace lumo::tiff
