#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <type_traits>

// The loops under TextureWindows, written for the vector registers. A line of a plane has the
// values of one band, with kNoValue<P> where there is none. P is std::int32_t or double.

namespace lumo {

/// Stands for a pixel that is in no window.
template <typename P>
inline constexpr P kNoValue = std::is_floating_point_v<P> ? std::numeric_limits<P>::quiet_NaN()
                                                          : std::numeric_limits<P>::max();

/// The sums of the columns of some lines.
struct ColumnSums {
  double* sum;
  double* squares;
  std::int32_t* count;
};

/// Adds a line to the sums of its columns, or takes it off again.
void AddLine(const std::int32_t* line, std::size_t columns, const ColumnSums& to);
void AddLine(const double* line, std::size_t columns, const ColumnSums& to);
void TakeLineOff(const std::int32_t* line, std::size_t columns, const ColumnSums& from);

/// Finds the extremes of the columns of lines; of a column without a value the largest number as
/// the minimum and the least as the maximum.
void ColumnExtremes(const std::int32_t* const* lines, std::size_t count, std::size_t columns,
                    std::int32_t* min, std::int32_t* max);
void ColumnExtremes(const double* const* lines, std::size_t count, std::size_t columns, double* min,
                    double* max);

/// Replaces element i, for i below `count`, by the sum, the minimum or the maximum of the elements
/// i to i + side - 1. There are count + side - 1 elements, of which all are changed.
/// @param scratch  as long.
void SumWindows(double* values, std::size_t count, std::size_t side, double* scratch);
void SumWindows(std::int32_t* values, std::size_t count, std::size_t side, std::int32_t* scratch);
void MinWindows(std::int32_t* values, std::size_t count, std::size_t side);
void MinWindows(double* values, std::size_t count, std::size_t side);
void MaxWindows(std::int32_t* values, std::size_t count, std::size_t side);
void MaxWindows(double* values, std::size_t count, std::size_t side);

/// Counts for window i, of the columns i to i + side - 1 of `side` lines, the values in the first
/// and in the third of three bins between `min[i]` and `max[i]`, half of that range wide.
void CountBins(const std::int32_t* const* lines, std::size_t count, std::size_t side,
               const std::int32_t* min, const std::int32_t* max, std::int32_t* first,
               std::int32_t* third);
void CountBins(const double* const* lines, std::size_t count, std::size_t side, const double* min,
               const double* max, std::int32_t* first, std::int32_t* third);

/// The figures of windows, of which a window without a value has 0.
/// @param shift  is added to the means.
struct WindowFigures {
  double* range;
  double* mean;
  double* variance;
};
void FindFigures(const std::int32_t* counts, const double* sums, const double* squares,
                 const std::int32_t* min, const std::int32_t* max, double shift, std::size_t count,
                 const WindowFigures& to);
void FindFigures(const std::int32_t* counts, const double* sums, const double* squares,
                 const double* min, const double* max, double shift, std::size_t count,
                 const WindowFigures& to);

/// Counts of the values of windows, and of those in the first and in the third of three bins.
struct WindowCounts {
  const std::int32_t* all;
  const std::int32_t* first;
  const std::int32_t* third;
};

/// Finds -(t[a] + t[b] + t[c]) for the counts of the bins of windows, 0 where the range is no
/// greater than `even`.
/// @param terms  t, for every count that comes.
void FindEntropy(const WindowCounts& counts, const double* range, double even, const double* terms,
                 std::size_t count, double* entropy);

/// Finds (l[n] - l[a] - l[b] - l[c]) / n in the same way, and no less than 0.
/// @param logs  l, the products of counts and their logarithms.
void FindEntropyOverN(const WindowCounts& counts, const double* range, double even,
                      const double* logs, std::size_t count, double* entropy);

}  // namespace lumo
