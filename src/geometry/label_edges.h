#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// A bit for each column of a raster, 64 to a word; bits past the last column are 0.
class ColumnBits {
 public:
  ColumnBits() = default;
  /// @param columns  bits, all 0 at first.
  explicit ColumnBits(std::size_t columns) : words_((columns + 63) / 64) {}

  /// Words of 64 columns.
  std::size_t WordCount() const { return words_.size(); }
  std::uint64_t Word(std::size_t index) const { return words_[index]; }
  std::uint64_t* Words() { return words_.data(); }
  /// Sets the bit of a column, which has to be there.
  void Set(std::size_t column) { words_[column / 64] |= std::uint64_t{1} << (column % 64); }
  /// Clears all bits.
  void Clear() { words_.assign(words_.size(), 0); }
  /// Sets the bits of the first `columns` columns, and no others.
  void SetFirst(std::size_t columns);

 private:
  std::vector<std::uint64_t> words_;
};

/// Sets bit i of `bits` where a[i] differs from b[i], and clears it elsewhere. The columns from
/// `count` to the next multiple of 64 are cleared. Exists for the pixel types of EightTypes.
/// @param count  columns; `bits` has (count + 63) / 64 words.
template <typename T>
VEXG_EXPORT void MarkDifferences(const T* a, const T* b, std::size_t count, std::uint64_t* bits);

/// Marks the edges between the pixels of one line: bit x is set when pixel x - 1 and pixel x
/// differ, and at both ends of the line, x = 0 and x = `width`.
/// @param line  `width` labels.
/// @param bits  for width + 1 columns.
template <typename T>
VEXG_EXPORT void MarkEdgesInLine(const T* line, std::size_t width, ColumnBits& bits);

}  // namespace lumo
