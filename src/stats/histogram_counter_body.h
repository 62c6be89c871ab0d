#pragma once

#include <algorithm>
#include <limits>

#include "stats/exact_bins.h"
#include "stats/histogram_counter.h"

namespace lumo {
namespace detail {

/// Sets what the exact form of the bins of a band needs.
template <typename T>
void SetExactBins(HistogramBins<T>& bins, T upper) {
  bins.form = Form::kExact;
  bins.span = bins.size;
  if constexpr (std::is_integral_v<T>) {
    // Sizes that were found from a number of bins have quotients without rounding.
    if (upper < bins.min) return;
    if (bins.size == ExactBinSize(bins.min, upper, std::max(bins.count, 1U))) {
      const Int128 values = ValuesBetween(bins.min, upper);
      bins.parts = bins.count;
      bins.span = static_cast<double>(values);
      bins.wholeSpan = static_cast<typename HistogramBins<T>::WholeSpan>(values);
    } else if (std::trunc(bins.size) == bins.size && bins.size < 0x1p64) {
      bins.wholeSpan = static_cast<std::uint64_t>(bins.size);
    } else {
      bins.wholeSpan = 0;
    }
  }
}

/// The bins of a band of `histogram`.
template <typename T>
HistogramBins<T> BinsOf(const RasterHistogram<T>& histogram, unsigned band) {
  HistogramBins<T> bins;
  bins.lower = bins.min = histogram.Min(band);
  bins.upper = histogram.Max(band);
  bins.size = histogram.BinSize(band);
  bins.count = histogram.BinCount(band);
  if (histogram.Bins() == Form::kExact) {
    SetExactBins(bins, histogram.Max(band));
  } else if constexpr (std::is_integral_v<T>) {
    constexpr auto kMost = static_cast<double>(std::numeric_limits<std::uint64_t>::max());
    if (!(bins.size > 0)) bins.size = 1;
    if (bins.size >= 1) {
      bins.wholeSize = bins.size < kMost ? static_cast<std::uint64_t>(bins.size)
                                         : std::numeric_limits<std::uint64_t>::max();
      bins.size = static_cast<double>(bins.wholeSize);
    }
  }
  bool any = bins.count != 0;
  if (histogram.Sign() == HistogramSign::kPositive) bins.lower = std::max(bins.lower, T(0));
  if (histogram.Sign() == HistogramSign::kNegative) {
    if constexpr (std::is_floating_point_v<T>) {
      bins.upper = std::min(bins.upper, -std::numeric_limits<T>::denorm_min());
    } else if constexpr (std::is_signed_v<T>) {
      bins.upper = std::min(bins.upper, T(-1));
    } else {
      any = false;
    }
  }
  if (!any) bins.count = 0;
  return bins;
}

}  // namespace detail

template <typename T>
HistogramCounter<T>::HistogramCounter(const RasterHistogram<T>& bins) : counts_(bins) {
  counts_.FillBins();
  const unsigned bands = bins.BandCount();
  std::uint32_t most = 0;
  for (unsigned band = 0; band < bands; ++band) {
    bins_.push_back(detail::BinsOf(bins, band));
    most = std::max(most, bins_.back().count);
  }
  tableSize_ = std::size_t{most} + 1;  // the last is for what doesn't count
  if constexpr (sizeof(T) <= 2) {
    constexpr std::size_t kValues = std::size_t{1} << (8 * sizeof(T));
    constexpr std::size_t kMostBytes = 16 << 20;
    byValue_ = kValues * bands * sizeof(std::uint32_t) <= kMostBytes;
    if (byValue_) tableSize_ = kValues;
  }
  constexpr std::size_t kSmall = 4096;
  if (tableSize_ <= kSmall) tablesOfBand_ = 4;
  tables_.resize(bands * tablesOfBand_ * tableSize_);
}

template <typename T>
bool HistogramCounter<T>::Count(const Tile<T>& tile, const TilePart& part) {
  if (tile.Bands() != bins_.size() || !counts_.CanCount()) return false;
  const std::uint64_t pixels =
      std::uint64_t{part.rowTo - part.rowFrom} * (part.columnTo - part.columnFrom);
  if (pixels_ + pixels > std::numeric_limits<std::uint32_t>::max()) Spill();
  pixels_ += pixels;
  ValidPlanes<T> planes;
  PlaneWalk<T>(tile).ForEach(part, [&](const PlaneGroup<T>& group) {
    for (unsigned band = 0; band < bins_.size(); ++band) {
      const std::size_t at = band * group.stride;
      // Values that aren't finite find no bin.
      const ValidPlane<T> plane =
          planes.Find(group.values + at, group.states != nullptr ? group.states + at : nullptr,
                      group.count, true);
      if (plane.count != 0) CountPlane(band, plane, group.count);
    }
  });
  return true;
}

template <typename T>
void HistogramCounter<T>::CountPlane(unsigned band, const ValidPlane<T>& plane, std::size_t count) {
  std::uint32_t* const tables = &tables_[band * tablesOfBand_ * tableSize_];
  const auto fillers = static_cast<std::uint32_t>(count - plane.count);
  if constexpr (sizeof(T) <= 2) {
    if (byValue_) {
      using Bits = std::make_unsigned_t<T>;
      Tally(
          tables, [&](std::size_t i) { return static_cast<Bits>(plane.values[i]); }, count);
      tables[static_cast<Bits>(plane.filler)] -= fillers;
      return;
    }
  }
  std::uint32_t found[kPlane];
  FindBins(bins_[band], plane.values, count, found);
  Tally(
      tables, [&](std::size_t i) { return found[i]; }, count);
  tables[bins_[band].Find(plane.filler)] -= fillers;  // one table for itself may go below 0
}

/// Counts the entries of the tables of a band, in turn.
template <typename T>
template <typename Index>
void HistogramCounter<T>::Tally(std::uint32_t* tables, const Index& index,
                                std::size_t count) const {
  std::size_t i = 0;
  if (tablesOfBand_ == 4) {
    const std::size_t size = tableSize_;
    for (; i + 4 <= count; i += 4) {
      ++tables[index(i)];
      ++tables[size + index(i + 1)];
      ++tables[2 * size + index(i + 2)];
      ++tables[3 * size + index(i + 3)];
    }
  }
  for (; i < count; ++i) ++tables[index(i)];
}

/// Empties the tables into the bins.
template <typename T>
void HistogramCounter<T>::Spill() {
  for (unsigned band = 0; band < bins_.size(); ++band) {
    const HistogramBins<T>& bins = bins_[band];
    unsigned long long* const counts = counts_.Counts(band);
    std::uint32_t* const tables = &tables_[band * tablesOfBand_ * tableSize_];
    for (std::size_t i = 0; i < tableSize_; ++i) {
      std::uint32_t sum = 0;
      for (unsigned table = 0; table < tablesOfBand_; ++table) {
        sum += tables[table * tableSize_ + i];
      }
      if (sum == 0) continue;
      std::size_t bin = i;
      if constexpr (sizeof(T) <= 2) {
        if (byValue_) bin = bins.Find(static_cast<T>(i));
      }
      if (bin < bins.count) counts[bin] += sum;
    }
  }
  std::fill(tables_.begin(), tables_.end(), 0U);
  pixels_ = 0;
}

template <typename T>
const RasterHistogram<T>& HistogramCounter<T>::Finish() {
  Spill();
  return counts_;
}

}  // namespace lumo
