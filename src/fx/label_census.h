#pragma once

#include "fx/label_table.h"
#include "raster/raster_iterator.h"

namespace lumo {

/// The lines of a strip. Strips are the units of sums: within one they run line after line, and
/// strips are joined from top to bottom, so that a result has the same bits however a raster is cut
/// into tiles of whole strips.
inline constexpr unsigned kStripLines = 16;

/// The types of label rasters.
using LabelTypes = TypeList<std::int32_t, std::uint32_t>;

/// Cuts a raster into whole lines, in numbers that kStripLines divides, as its storage suggests.
/// @param lineBytes  of a line of what is read.
VEXG_EXPORT TileDimensions StripTiles(const BasicRaster& raster, std::size_t lineBytes);

/// The tiles of the first band of a raster of labels, of the size that `tiles` has.
template <typename L>
RasterIteratorPtr<L> LabelTiles(const RasterPtr<L>& labels, TileDimensions tiles) {
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = 0;
  tiles.bands = 0;
  return RasterIteratorPtr<L>(new RasterIterator<L>(labels, tiles, bands));
}

/// Knows for each label of a raster the strips with its first and its last valid pixel. Whoever
/// goes through the raster again then knows when a region is complete.
///
///     LabelCensus census;
///     if (!census.Run(labels, ipc)) return false;  // TakeFault() says why
///     if (census.Of(label).last == strip) Finish(label);
///
/// Cost: a pass over the labels; eight bytes for each label, more where they lie far apart.
/// Failure: false, with the fault set, for a raster of other types, a negative label, and when the
///          raster can't be read; and at an abort.
class VEXG_EXPORT LabelCensus {
 public:
  /// Strips, from 0.
  struct Extent {
    std::uint32_t first = 0;
    std::uint32_t last = 0;
  };

  bool Run(const BasicRasterPtr& labels, const IPC& ipc);

  /// The strips of a label that is there.
  Extent Of(std::uint32_t label) const {
    const Extent extent = extents_.Get(label);
    return {extent.first - 1, extent.last - 1};
  }
  /// True when a valid pixel has the label.
  bool Has(std::uint32_t label) const { return extents_.Get(label).last != 0; }
  /// How many labels there are.
  std::uint64_t Count() const { return count_; }

 private:
  template <typename L>
  bool RunTyped(const RasterPtr<L>& labels, const IPC& ipc);
  void Note(std::uint32_t strip, const std::vector<std::uint32_t>& labels);

  LabelTable<Extent> extents_;  // counted from 1; 0 for none
  std::uint64_t count_ = 0;
};

}  // namespace lumo
