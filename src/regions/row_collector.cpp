#include "regions/row_collector.h"

#include <algorithm>

namespace lumo {

SpanRows RowCollector::GetRows() {
  SpanRows rows;
  if (pieces_.empty()) return rows;
  std::stable_sort(pieces_.begin(), pieces_.end(),
                   [](const Piece& a, const Piece& b) { return a.row < b.row; });
  std::int64_t row = pieces_.front().row;
  rows.Start(row);
  std::vector<ColumnSpan> spans;
  for (std::size_t i = 0; i < pieces_.size();) {
    for (; row < pieces_[i].row; ++row) rows.EndRow();
    spans.clear();
    for (; i < pieces_.size() && pieces_[i].row == row; ++i) spans.push_back(pieces_[i].span);
    MergeSpans(spans);
    for (const ColumnSpan& span : spans) rows.Add(span.first, span.last);
    rows.EndRow();
    ++row;
  }
  return rows;
}

}  // namespace lumo
