#include "regions/span_rows.h"

#include <algorithm>

namespace lumo {
namespace {

/// Takes the columns of `holes` out of `spans`; both in order and apart.
void Subtract(const std::vector<ColumnSpan>& holes, std::vector<ColumnSpan>& spans) {
  std::vector<ColumnSpan> left;
  auto hole = holes.begin();
  for (ColumnSpan span : spans) {
    while (hole != holes.end() && hole->last < span.first) ++hole;
    for (auto cut = hole; cut != holes.end() && cut->first <= span.last; ++cut) {
      if (cut->first > span.first) left.push_back({span.first, cut->first - 1});
      span.first = cut->last + 1;
    }
    if (span.first <= span.last) left.push_back(span);
  }
  spans.swap(left);
}

}  // namespace

void MergeSpans(std::vector<ColumnSpan>& spans) {
  if (spans.size() < 2) return;
  std::sort(spans.begin(), spans.end(),
            [](const ColumnSpan& a, const ColumnSpan& b) { return a.first < b.first; });
  std::size_t end = 0;
  for (const ColumnSpan& span : spans) {
    if (end != 0 && span.first <= std::int64_t{spans[end - 1].last} + 1) {
      spans[end - 1].last = std::max(spans[end - 1].last, span.last);
    } else {
      spans[end++] = span;
    }
  }
  spans.resize(end);
}

void SpanRows::Start(std::int64_t firstRow) {
  firstRow_ = firstRow;
  ends_.clear();
  spans_.clear();
}

const ColumnSpan* SpanRows::Begin(std::int64_t row) const {
  if (row <= firstRow_ || row > LastRow()) return spans_.data();
  return spans_.data() + ends_[static_cast<std::size_t>(row - firstRow_ - 1)];
}

const ColumnSpan* SpanRows::End(std::int64_t row) const {
  if (row < firstRow_ || row > LastRow()) return Begin(row);
  return spans_.data() + ends_[static_cast<std::size_t>(row - firstRow_)];
}

void SpanRows::Mark(RegionMarks& marks) const {
  const std::int64_t last = std::min(LastRow(), marks.Window().Bottom());
  for (std::int64_t row = std::max(firstRow_, marks.Window().top); row <= last; ++row) {
    const ColumnSpan* const end = End(row);
    for (const ColumnSpan* span = Begin(row); span != end; ++span) {
      marks.MarkSpan(row, span->first, span->last);
    }
  }
}

RegionCover SpanRows::Cover(const RegionWindow& window) const {
  bool isInside = window.top >= firstRow_ && window.Bottom() <= LastRow();
  bool isOutside = true;
  const std::int64_t last = std::min(LastRow(), window.Bottom());
  for (std::int64_t row = std::max(firstRow_, window.top); row <= last; ++row) {
    bool covers = false;
    const ColumnSpan* const end = End(row);
    for (const ColumnSpan* span = Begin(row); span != end; ++span) {
      if (span->last < window.left || span->first > window.Right()) continue;
      isOutside = false;
      covers = covers || (span->first <= window.left && span->last >= window.Right());
    }
    isInside = isInside && covers;
    if (!isInside && !isOutside) return RegionCover::kPartly;
  }
  return isOutside ? RegionCover::kOutside : isInside ? RegionCover::kInside : RegionCover::kPartly;
}

bool SpanRows::Contains(std::int64_t column, std::int64_t row) const {
  return std::any_of(Begin(row), End(row), [&](const ColumnSpan& span) {
    return span.first <= column && column <= span.last;
  });
}

bool SpanRows::AreApart() const {
  std::size_t at = 0;
  for (const std::uint32_t end : ends_) {
    for (std::size_t i = at + 1; i < end; ++i) {
      if (spans_[i].first <= spans_[i - 1].last) return false;
    }
    at = end;
  }
  return true;
}

SpanRows CombineRows(const std::vector<PartRows>& parts) {
  std::vector<std::size_t> waiting;  // parts that begin further down, the topmost last
  std::int64_t last = std::numeric_limits<std::int64_t>::min();
  for (std::size_t i = 0; i < parts.size(); ++i) {
    if (parts[i].rows->IsEmpty()) continue;
    waiting.push_back(i);
    last = std::max(last, parts[i].rows->LastRow());
  }
  SpanRows all;
  if (waiting.empty()) return all;
  std::sort(waiting.begin(), waiting.end(), [&](std::size_t a, std::size_t b) {
    return parts[a].rows->FirstRow() > parts[b].rows->FirstRow();
  });
  const std::int64_t first = parts[waiting.back()].rows->FirstRow();
  all.Start(first);
  std::vector<std::size_t> active;  // in the order of the parts
  std::vector<ColumnSpan> row;
  std::vector<ColumnSpan> hole;
  for (std::int64_t y = first; y <= last; ++y) {
    std::erase_if(active, [&](std::size_t i) { return parts[i].rows->LastRow() < y; });
    while (!waiting.empty() && parts[waiting.back()].rows->FirstRow() <= y) {
      active.insert(std::upper_bound(active.begin(), active.end(), waiting.back()), waiting.back());
      waiting.pop_back();
    }
    row.clear();
    for (const std::size_t i : active) {
      const SpanRows& rows = *parts[i].rows;
      if (!parts[i].isHole) {
        row.insert(row.end(), rows.Begin(y), rows.End(y));
        continue;
      }
      hole.assign(rows.Begin(y), rows.End(y));
      MergeSpans(hole);
      MergeSpans(row);
      Subtract(hole, row);
    }
    MergeSpans(row);
    for (const ColumnSpan& span : row) all.Add(span.first, span.last);
    all.EndRow();
  }
  return all;
}

}  // namespace lumo
