#pragma once

#include <vector>

#include "stats/histogram_bins.h"
#include "stats/plane_walk.h"
#include "stats/raster_histogram.h"

namespace lumo {

/// Counts the values of tiles, on one thread at a time. Exists for TenTypes.
///
/// Types of 8 and 16 bits are counted value by value, and only then are the counts put into bins;
/// for the others each value's bin is found in vector registers first. Counts do not depend on how
/// the pixels are divided among counters.
///
///     HistogramCounter<std::uint16_t> counter(bins);
///     counter.Count(tile, {0, tile.Height(), 0, tile.Width()});
///     joined.Join(counter.Finish());
template <typename T>
class HistogramCounter {
 public:
  /// @param bins  are copied; counts that they hold already don't matter.
  explicit HistogramCounter(const RasterHistogram<T>& bins);

  /// Counts a part of a tile. @return false for a tile with another number of bands.
  bool Count(const Tile<T>& tile, const TilePart& part);

  /// Brings the counts together. The result lives as long as the counter.
  const RasterHistogram<T>& Finish();

 private:
  void CountPlane(unsigned band, const ValidPlane<T>& plane, std::size_t count);
  template <typename Index>
  void Tally(std::uint32_t* tables, const Index& index, std::size_t count) const;
  void Spill();

  RasterHistogram<T> counts_;
  std::vector<HistogramBins<T>> bins_;
  bool byValue_ = false;
  std::size_t tableSize_ = 0;
  unsigned tablesOfBand_ = 1;          // in turn, so that equal values do not wait for each other
  std::vector<std::uint32_t> tables_;  // bands by tables by size
  std::uint64_t pixels_ = 0;           // counted in the tables
};

VEXG_EXTERN(TEN, HistogramCounter);

}  // namespace lumo
