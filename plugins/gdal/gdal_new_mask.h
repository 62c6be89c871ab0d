#pragma once

#include <memory>
#include <string>
#include <vector>

#include "gdal_common/source.h"
#include "gdal_raster.h"

namespace lumo::gdal {

/// The mask of a raster that is being made: which of its pixels are not valid though neither their
/// values nor an alpha band mark so. It costs nothing until the first such pixel comes.
///
/// Failure: false, with the fault set.
class NewMask {
 public:
  /// @param scratch  the name of a file for masks that are too large for memory.
  NewMask(std::string scratch, unsigned samples, unsigned lines)
      : scratch_(std::move(scratch)), samples_(samples), lines_(lines) {}
  ~NewMask();
  NewMask(const NewMask&) = delete;
  NewMask& operator=(const NewMask&) = delete;

  bool IsEmpty() const { return bytes_.empty() && file_ == nullptr; }

  /// Takes in a block.
  /// @param excluded  a byte for each pixel of the block, not 0 where it is to be excluded; empty
  ///                  when none is.
  /// @param isWhole   the block has all bands: pixels that it doesn't exclude are valid again.
  bool Take(const BlockPlace& place, const std::vector<unsigned char>& excluded, bool isWhole);

  /// Gets the pixels of a place that are excluded.
  /// @param excluded  [out] a byte for each, not 0 for those; empty while there is no mask.
  bool Read(const BlockPlace& place, std::vector<unsigned char>& excluded);

  /// Gives the mask to a finished raster file: into a TIFF file, beside any other one. Pixels that
  /// hold the no-data values of all bands are excluded as well, since other programs look at the
  /// mask alone.
  bool WriteTo(const std::string& path, const std::string& driver);

 private:
  bool Begin();
  bool Transfer(GDALRWFlag direction, const BlockPlace& place, unsigned char* values);
  bool Excluded(GDALDatasetH file, int line, std::vector<unsigned char>& row) const;

  const std::string scratch_;
  const unsigned samples_;
  const unsigned lines_;
  // One band: 0 excluded, else 255.
  std::vector<unsigned char> bytes_;
  DatasetPtr file_;  // of one that is too large for memory
};

}  // namespace lumo::gdal
