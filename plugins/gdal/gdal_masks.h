#pragma once

#include "gdal_raster.h"

namespace lumo::gdal {

/// Excludes pixels of some bands, beside their no-data values, by a mask of the whole source, an
/// alpha band, or no-data values that count only when all bands have them.
class Masks {
 public:
  Masks(const RasterLevel& level, const Array<unsigned>& bands);

  /// False when nothing is excluded.
  bool IsNeeded() const { return !masks_.empty(); }

  /// Sets bits in the state bytes of a block, whose strides are given. False when GDAL fails, or
  /// memory does.
  bool Apply(const BlockPlace& place, GSpacing pixel, GSpacing line, GSpacing band,
             unsigned char* state) const;

 private:
  struct Mask {
    GDALRasterBandH band;
    unsigned char bit;
    std::vector<unsigned> targets;  // places in the block's list of bands
  };
  std::vector<Mask> masks_;
};

}  // namespace lumo::gdal
