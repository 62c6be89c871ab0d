#pragma once

#include "raster/raster_iterator.h"

namespace lumo {

/// Keeps what a process needs to know of its input without keeping the raster: its size, and the
/// grid of an iterator on it. A copy of the moment it was made.
class VEXG_EXPORT RasterProps : public Object {
 public:
  static const unsigned TypeCode;

  RasterProps(const BasicRaster& raster, const BasicRasterIterator& iterator)
      : samples(raster.Samples()),
        lines(raster.Lines()),
        bands(raster.Bands()),
        columns(iterator.Columns()),
        rows(iterator.Rows()),
        tiles(iterator.Dimensions()) {}

  bool IsA(unsigned typeCode) const override;

  unsigned samples;  ///< pixels of a line
  unsigned lines;
  unsigned bands;        ///< of the raster
  unsigned columns;      ///< tiles in a row of the grid
  unsigned rows;         ///< tiles in a column of it
  TileDimensions tiles;  ///< their size and borders
};

using RasterPropsPtr = Pointer<RasterProps>;

}  // namespace lumo
