#pragma once

#include <vector>

#include "regions/span_rows.h"

namespace lumo {

/// Rows of spans that are put in any order. Only rows from 0 to below a limit are kept.
class RowCollector {
 public:
  explicit RowCollector(std::int64_t rowLimit) : rowLimit_(rowLimit) {}

  /// Rows from here on are dropped.
  std::int64_t RowLimit() const { return rowLimit_; }
  /// Adds the columns from `first` to `last`, inclusive, of a row.
  void Put(std::int64_t row, std::int64_t first, std::int64_t last) {
    if (row < 0 || row >= rowLimit_) return;
    pieces_.push_back({row, {ClampColumn(first), ClampColumn(last)}});
  }

  /// The rows, with the spans of each in order and apart.
  SpanRows GetRows();

 private:
  struct Piece {
    std::int64_t row;
    ColumnSpan span;
  };

  std::int64_t rowLimit_;
  std::vector<Piece> pieces_;
};

}  // namespace lumo
