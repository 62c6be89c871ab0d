#pragma once

#include <vector>

#include "stats/histogram_bins.h"
#include "stats/plane_walk.h"
#include "stats/raster_histogram.h"

namespace lumo {

/// Counts the values of tiles, on one thread at a time. Exists for TenTypes.
///
/// Types of 8 and 16 bits are counted value by value, and only what was counted is parted into
/// bins; for the others each value's bin is found in vector registers first. Counts do not depend
/// on how the pixels are divided among counters.
template <typename T>
class HistogramCounter {
 public:
  /// @param bins  what is to be counted; its counts are of no account.
  explicit HistogramCounter(const RasterHistogram<T>& bins);

  /// Counts a part of a tile. @return false for a tile with another number of bands.
  bool Count(const Tile<T>& tile, const TilePart& part);

  /// What was counted.
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
