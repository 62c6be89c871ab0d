#pragma once

#include <cstdint>
#include <limits>
#include <vector>

#include "regions/region_window.h"

namespace lumo {

/// A run of columns of one row, both ends inclusive.
struct ColumnSpan {
  std::int32_t first;
  std::int32_t last;
};

/// The nearest column that a span can hold; there is room for one more on each side.
inline std::int32_t ClampColumn(std::int64_t column) {
  constexpr std::int64_t kMost = std::numeric_limits<std::int32_t>::max() - 1;
  return static_cast<std::int32_t>(column < -kMost ? -kMost : column > kMost ? kMost : column);
}

/// Rows of column spans, one row after the other, as the scan of a shape makes them. Memory is 4
/// bytes a row and 8 a span.
///
///     SpanRows rows;
///     rows.Start(10);
///     rows.Add(3, 7);  // columns 3 to 7 of row 10
///     rows.EndRow();
class VEXG_EXPORT SpanRows {
 public:
  /// Begins at a row; rows are then added in order.
  void Start(std::int64_t firstRow);
  /// Adds a span to the row that is being filled.
  void Add(std::int64_t first, std::int64_t last) {
    spans_.push_back({ClampColumn(first), ClampColumn(last)});
  }
  /// Ends the row that is being filled.
  void EndRow() { ends_.push_back(static_cast<std::uint32_t>(spans_.size())); }

  /// True without a pixel.
  bool IsEmpty() const { return spans_.empty(); }
  std::int64_t FirstRow() const { return firstRow_; }
  /// The last row that was ended; FirstRow() - 1 without any.
  std::int64_t LastRow() const { return firstRow_ + static_cast<std::int64_t>(ends_.size()) - 1; }
  /// The spans of a row, none for one outside of the first and the last.
  const ColumnSpan* Begin(std::int64_t row) const;
  const ColumnSpan* End(std::int64_t row) const;

  /// Marks the pixels that lie in a window.
  void Mark(RegionMarks& marks) const;
  /// Says whether a window lies wholly inside or outside.
  RegionCover Cover(const RegionWindow& window) const;
  /// True when a span of the row holds the column.
  bool Contains(std::int64_t column, std::int64_t row) const;
  /// True when the spans of each row are in order and apart.
  bool AreApart() const;

 private:
  std::int64_t firstRow_ = 0;
  std::vector<std::uint32_t> ends_;  // for each row, the number of spans up to its end
  std::vector<ColumnSpan> spans_;
};

/// Rows that are put together with others.
struct PartRows {
  const SpanRows* rows;
  bool isHole;
};

/// Puts parts together in their order: each adds its pixels, or takes them away where it is a hole.
/// The spans of a row are then in order and apart from one another.
VEXG_EXPORT SpanRows CombineRows(const std::vector<PartRows>& parts);

/// Puts spans in order, and joins those that overlap or touch.
VEXG_EXPORT void MergeSpans(std::vector<ColumnSpan>& spans);

}  // namespace lumo
