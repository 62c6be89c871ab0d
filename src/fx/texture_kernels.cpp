#include "fx/texture_kernels.h"

#include <algorithm>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

#define VEXG_INLINE [[gnu::always_inline]] inline

VEXG_INLINE bool HasValue(std::int32_t value) {
  return value != kNoValue<std::int32_t>;
}
VEXG_INLINE bool HasValue(double value) {
  return value == value;
}

template <int kSign, typename P>
VEXG_INLINE void AddTo(const P* line, std::size_t columns, const ColumnSums& to) {
  double* const sum = to.sum;
  double* const squares = to.squares;
  std::int32_t* const counts = to.count;
  for (std::size_t x = 0; x < columns; ++x) {
    const bool has = HasValue(line[x]);
    const auto value = static_cast<double>(has ? line[x] : P());
    sum[x] += kSign * value;
    squares[x] += kSign * (value * value);
    counts[x] += has ? kSign : 0;
  }
}

template <typename P>
VEXG_INLINE void FindExtremes(const P* const* lines, std::size_t count, std::size_t columns, P* min,
                              P* max) {
  std::fill_n(min, columns, std::numeric_limits<P>::max());
  std::fill_n(max, columns, std::numeric_limits<P>::lowest());
  for (std::size_t y = 0; y < count; ++y) {
    const P* const line = lines[y];
    for (std::size_t x = 0; x < columns; ++x) {
      const P low = HasValue(line[x]) ? line[x] : std::numeric_limits<P>::max();
      const P high = HasValue(line[x]) ? line[x] : std::numeric_limits<P>::lowest();
      min[x] = low < min[x] ? low : min[x];
      max[x] = high > max[x] ? high : max[x];
    }
  }
}

/// Puts windows together from ones whose sides are powers of two.
template <typename V>
VEXG_INLINE void Sum(V* values, std::size_t count, std::size_t side, V* scratch) {
  std::size_t length = count + side - 1, offset = 0;
  std::fill_n(scratch, count, V());
  for (std::size_t power = 1, rest = side;; power *= 2) {
    if ((rest & 1) != 0) {
      const V* const from = values + offset;
      for (std::size_t x = 0; x < count; ++x) scratch[x] += from[x];
      offset += power;
    }
    rest >>= 1;
    if (rest == 0) break;
    length -= power;
    const V* const next = values + power;
    for (std::size_t x = 0; x < length; ++x) values[x] += next[x];
  }
  std::copy_n(scratch, count, values);
}

template <bool kMin, typename P>
VEXG_INLINE void Extreme(P* values, std::size_t count, std::size_t side) {
  const auto combine = [values](std::size_t length, std::size_t step) {
    const P* const next = values + step;
    for (std::size_t x = 0; x < length; ++x) {
      values[x] = (kMin ? next[x] < values[x] : next[x] > values[x]) ? next[x] : values[x];
    }
  };
  std::size_t length = count + side - 1, power = 1;
  for (; 2 * power <= side; power *= 2) {
    length -= power;
    combine(length, power);
  }
  if (side != power) combine(count, side - power);
}

VEXG_INLINE bool IsInFirst(std::int32_t value, std::int32_t min, std::int32_t max) {
  return value < ((min + max + 1) >> 1);  // both are of 17 bits at most
}
VEXG_INLINE bool IsInThird(std::int32_t value, std::int32_t /*min*/, std::int32_t max) {
  return value == max;
}
VEXG_INLINE bool IsInFirst(double value, double min, double max) {
  return value - min < (max - min) / 2;
}
VEXG_INLINE bool IsInThird(double value, double min, double max) {
  return value - min >= max - min;
}

/// @tparam kSide  the side of the windows where it is known, so that its loop goes away; else 0.
template <std::size_t kSide, typename P>
VEXG_INLINE void Count(const P* const* lines, std::size_t count, std::size_t side, const P* min,
                       const P* max, std::int32_t* first, std::int32_t* third) {
  constexpr std::size_t kBlock = 1024;  // stays in the first cache
  constexpr std::size_t kStep = kSide != 0 ? kSide : 1;
  std::fill_n(first, count, 0);
  std::fill_n(third, count, 0);
  for (std::size_t from = 0; from < count; from += kBlock) {
    const std::size_t to = std::min(from + kBlock, count);
    for (std::size_t y = 0; y < side; ++y) {
      for (std::size_t dx = 0; dx < side; dx += kStep) {
        const P* const line = lines[y] + dx;
        for (std::size_t x = from; x < to; ++x) {
          std::int32_t inFirst = first[x], inThird = third[x];
#pragma GCC unroll 16
          for (std::size_t i = 0; i < kStep; ++i) {
            inFirst += IsInFirst(line[x + i], min[x], max[x]) ? 1 : 0;
            inThird += IsInThird(line[x + i], min[x], max[x]) ? 1 : 0;
          }
          first[x] = inFirst;
          third[x] = inThird;
        }
      }
    }
  }
}

template <typename P>
VEXG_INLINE void CountAny(const P* const* lines, std::size_t count, std::size_t side, const P* min,
                          const P* max, std::int32_t* first, std::int32_t* third) {
  switch (side) {
    case 3:
      return Count<3>(lines, count, side, min, max, first, third);
    case 5:
      return Count<5>(lines, count, side, min, max, first, third);
    case 7:
      return Count<7>(lines, count, side, min, max, first, third);
    default:
      return Count<0>(lines, count, side, min, max, first, third);
  }
}

template <typename P>
VEXG_INLINE void Figures(const std::int32_t* counts, const double* sums, const double* squares,
                         const P* min, const P* max, double shift, std::size_t count,
                         const WindowFigures& to) {
  double* const range = to.range;
  double* const mean = to.mean;
  double* const variance = to.variance;
  for (std::size_t x = 0; x < count; ++x) {
    const auto n = static_cast<double>(counts[x]);
    const double extent = static_cast<double>(max[x]) - static_cast<double>(min[x]);
    const double middle = sums[x] / n + shift;
    // Of integers both products are exact, and so a window of equal values has no variance.
    const double spread = n * squares[x] - sums[x] * sums[x];
    const double part = spread / (n * (n - 1));
    range[x] = n > 0 ? extent : 0;
    mean[x] = n > 0 ? middle : 0;
    variance[x] = ((n > 1) & (spread > 0)) ? part : 0;
  }
}

}  // namespace

VEXG_VECTOR_CLONES void AddLine(const std::int32_t* line, std::size_t columns,
                                const ColumnSums& to) {
  AddTo<1>(line, columns, to);
}
VEXG_VECTOR_CLONES void AddLine(const double* line, std::size_t columns, const ColumnSums& to) {
  AddTo<1>(line, columns, to);
}
VEXG_VECTOR_CLONES void TakeLineOff(const std::int32_t* line, std::size_t columns,
                                    const ColumnSums& from) {
  AddTo<-1>(line, columns, from);
}

VEXG_VECTOR_CLONES void ColumnExtremes(const std::int32_t* const* lines, std::size_t count,
                                       std::size_t columns, std::int32_t* min, std::int32_t* max) {
  FindExtremes(lines, count, columns, min, max);
}
VEXG_CHOOSING_VECTOR_CLONES void ColumnExtremes(const double* const* lines, std::size_t count,
                                                std::size_t columns, double* min, double* max) {
  FindExtremes(lines, count, columns, min, max);
}

VEXG_VECTOR_CLONES void SumWindows(double* values, std::size_t count, std::size_t side,
                                   double* scratch) {
  Sum(values, count, side, scratch);
}
VEXG_VECTOR_CLONES void SumWindows(std::int32_t* values, std::size_t count, std::size_t side,
                                   std::int32_t* scratch) {
  Sum(values, count, side, scratch);
}
VEXG_VECTOR_CLONES void MinWindows(std::int32_t* values, std::size_t count, std::size_t side) {
  Extreme<true>(values, count, side);
}
VEXG_CHOOSING_VECTOR_CLONES void MinWindows(double* values, std::size_t count, std::size_t side) {
  Extreme<true>(values, count, side);
}
VEXG_VECTOR_CLONES void MaxWindows(std::int32_t* values, std::size_t count, std::size_t side) {
  Extreme<false>(values, count, side);
}
VEXG_CHOOSING_VECTOR_CLONES void MaxWindows(double* values, std::size_t count, std::size_t side) {
  Extreme<false>(values, count, side);
}

VEXG_VECTOR_CLONES void CountBins(const std::int32_t* const* lines, std::size_t count,
                                  std::size_t side, const std::int32_t* min,
                                  const std::int32_t* max, std::int32_t* first,
                                  std::int32_t* third) {
  CountAny(lines, count, side, min, max, first, third);
}
VEXG_CHOOSING_VECTOR_CLONES void CountBins(const double* const* lines, std::size_t count,
                                           std::size_t side, const double* min, const double* max,
                                           std::int32_t* first, std::int32_t* third) {
  CountAny(lines, count, side, min, max, first, third);
}

VEXG_CHOOSING_VECTOR_CLONES void FindFigures(const std::int32_t* counts, const double* sums,
                                             const double* squares, const std::int32_t* min,
                                             const std::int32_t* max, double shift,
                                             std::size_t count, const WindowFigures& to) {
  Figures(counts, sums, squares, min, max, shift, count, to);
}
VEXG_CHOOSING_VECTOR_CLONES void FindFigures(const std::int32_t* counts, const double* sums,
                                             const double* squares, const double* min,
                                             const double* max, double shift, std::size_t count,
                                             const WindowFigures& to) {
  Figures(counts, sums, squares, min, max, shift, count, to);
}

VEXG_CHOOSING_VECTOR_CLONES void FindEntropy(const WindowCounts& counts, const double* range,
                                             double even, const double* terms, std::size_t count,
                                             double* entropy) {
  const std::int32_t *const all = counts.all, *const first = counts.first,
                            *const third = counts.third;
  for (std::size_t x = 0; x < count; ++x) {
    const std::int32_t second = all[x] - first[x] - third[x];
    const double sum = 0 - terms[first[x]] - terms[second] - terms[third[x]];
    entropy[x] = range[x] > even ? sum : 0;
  }
}

VEXG_CHOOSING_VECTOR_CLONES void FindEntropyOverN(const WindowCounts& counts, const double* range,
                                                  double even, const double* logs,
                                                  std::size_t count, double* entropy) {
  const std::int32_t *const all = counts.all, *const first = counts.first,
                            *const third = counts.third;
  for (std::size_t x = 0; x < count; ++x) {
    const std::int32_t second = all[x] - first[x] - third[x];
    const double sum = (logs[all[x]] - logs[first[x]] - logs[second] - logs[third[x]]) / all[x];
    entropy[x] = ((range[x] > even) & (sum > 0)) ? sum : 0;
  }
}

}  // namespace lumo
