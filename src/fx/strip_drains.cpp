#include "fx/strip_drains.h"

#include <algorithm>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

using Cell = StripDrains::Cell;

/// The cells of pixels that have all four neighbours, none of them excluded.
VEXG_VECTOR_CLONES
void MarkInner(const std::int32_t* above, const std::int32_t* line, const std::int32_t* below,
               std::size_t count, Cell* cells) {
  for (std::size_t i = 0; i < count; ++i) {
    const std::int32_t level = line[i], up = above[i], left = line[i - 1], right = line[i + 1],
                       down = below[i];
    std::int32_t cell = StripDrains::kNowhere;
    cell = up < level ? StripDrains::kUp : cell;
    cell = left < level ? StripDrains::kLeft : cell;
    cell = right < level ? StripDrains::kRight : cell;
    cell = down < level ? StripDrains::kDown : cell;
    cell |= (up == level ? StripDrains::SameBit(StripDrains::kUp) : 0) |
            (left == level ? StripDrains::SameBit(StripDrains::kLeft) : 0) |
            (right == level ? StripDrains::SameBit(StripDrains::kRight) : 0) |
            (down == level ? StripDrains::SameBit(StripDrains::kDown) : 0);
    cells[i] = static_cast<Cell>(cell);
  }
}

Cell MarkAny(const StripDrains::Levels& levels, std::uint32_t width, std::uint32_t x) {
  const auto isExcluded = [](const std::uint8_t* excluded, std::uint32_t at) {
    return excluded != nullptr && excluded[at] != 0;
  };
  if (isExcluded(levels.excluded, x)) return StripDrains::kExcluded;
  const std::int32_t level = levels.line[x];
  Cell way = StripDrains::kNowhere, same = 0;
  const auto look = [&](Cell direction, const std::int32_t* line, const std::uint8_t* excluded,
                        std::uint32_t at) {
    if (isExcluded(excluded, at)) return;
    if (line[at] < level) way = direction;
    if (line[at] == level) same |= StripDrains::SameBit(direction);
  };
  if (levels.above != nullptr) look(StripDrains::kUp, levels.above, levels.excludedAbove, x);
  if (x > 0) look(StripDrains::kLeft, levels.line, levels.excluded, x - 1);
  if (x + 1 < width) look(StripDrains::kRight, levels.line, levels.excluded, x + 1);
  if (levels.below != nullptr) look(StripDrains::kDown, levels.below, levels.excludedBelow, x);
  return way | same;
}

}  // namespace

void StripDrains::MarkLine(const Levels& levels, std::uint32_t width, Cell* cells) {
  const bool areInner =
      levels.above != nullptr && levels.below != nullptr && levels.excluded == nullptr && width > 2;
  if (!areInner) {
    for (std::uint32_t x = 0; x < width; ++x) cells[x] = MarkAny(levels, width, x);
    return;
  }
  cells[0] = MarkAny(levels, width, 0);
  MarkInner(levels.above + 1, levels.line + 1, levels.below + 1, width - 2, cells + 1);
  cells[width - 1] = MarkAny(levels, width, width - 1);
}

void StripDrains::MarkLines(const LevelLines& from, std::uint32_t width, Cell* cells) {
  for (std::uint32_t y = 0; y < from.lines; ++y) {
    const std::size_t at = std::size_t{width} * (y + (from.hasAbove ? 1 : 0));
    Levels levels;
    levels.line = from.levels + at;
    if (from.excluded != nullptr) levels.excluded = from.excluded + at;
    if (y > 0 || from.hasAbove) {
      levels.above = levels.line - width;
      if (from.excluded != nullptr) levels.excludedAbove = levels.excluded - width;
    }
    if (y + 1 < from.lines || from.hasBelow) {
      levels.below = levels.line + width;
      if (from.excluded != nullptr) levels.excludedBelow = levels.excluded + width;
    }
    MarkLine(levels, width, cells + std::size_t{width} * y);
  }
}

void StripDrains::Begin(std::vector<Cell>&& cells, std::uint32_t width) {
  cells_ = std::move(cells);
  width_ = width;
}

/// Notes a way by which a pixel is reached in this step; of several the last direction stays.
void StripDrains::Reach(std::uint32_t pixel, Cell way) {
  Cell& cell = cells_[pixel];
  if ((cell & kNew) != 0) {
    if ((cell & kWayBits) < way) cell = WithWay(cell, way | kNew);
  } else if ((cell & kWayBits) == kNowhere) {
    cell = WithWay(cell, way | kNew);
    next_.push_back(pixel);
  }
}

/// Reaches all pixels beside one of their plateau that has a lower neighbour.
void StripDrains::FindFirstStep() {
  constexpr Cell kSameBits = 0xF0;
  for (std::uint32_t pixel = 0; pixel < cells_.size(); ++pixel) {
    if ((cells_[pixel] & kWayBits) != kNowhere || (cells_[pixel] & kSameBits) == 0) continue;
    ForEachSame(pixel, [&](std::uint32_t neighbour, unsigned direction) {
      if ((cells_[neighbour] & (kWayBits | kNew)) < kNowhere) {
        Reach(pixel, static_cast<Cell>(direction));
      }
    });
  }
}

void StripDrains::GatherEntries(const Beyond& beyond) {
  entries_.clear();
  const auto lastLine = static_cast<std::uint32_t>(cells_.size() - width_);
  const auto gather = [this](const std::uint32_t* distances, std::uint32_t line, Way way) {
    if (distances == nullptr) return;
    for (std::uint32_t x = 0; x < width_; ++x) {
      const Cell cell = cells_[line + x];
      if ((cell & SameBit(way)) == 0 || (cell & kWayBits) != kNowhere || distances[x] == kFar) {
        continue;
      }
      entries_.push_back({distances[x] + 1, line + x, way});
    }
  };
  gather(beyond.above, 0, kUp);
  gather(beyond.below, lastLine, kDown);
  std::sort(entries_.begin(), entries_.end(),
            [](const Entry& a, const Entry& b) { return a.distance < b.distance; });
}

void StripDrains::DrainPlateaus(const Beyond& beyond, std::uint32_t* first, std::uint32_t* last) {
  const auto lastLine = static_cast<std::uint32_t>(cells_.size() - width_);
  for (std::uint32_t x = 0; x < width_; ++x) {
    first[x] = (cells_[x] & kWayBits) < kNowhere ? 0 : kFar;
    last[x] = (cells_[lastLine + x] & kWayBits) < kNowhere ? 0 : kFar;
  }
  GatherEntries(beyond);
  auto entry = entries_.cbegin();
  next_.clear();
  FindFirstStep();
  for (std::uint32_t distance = 1;; ++distance) {
    if (next_.empty()) {
      if (entry == entries_.cend()) break;
      distance = std::max(distance, entry->distance);
    }
    for (; entry != entries_.cend() && entry->distance == distance; ++entry) {
      Reach(entry->pixel, entry->way);
    }
    for (const std::uint32_t pixel : next_) {
      cells_[pixel] &= static_cast<Cell>(~kNew);
      if (pixel < width_) first[pixel] = distance;
      if (pixel >= lastLine) last[pixel - lastLine] = distance;
    }
    front_.swap(next_);
    next_.clear();
    for (const std::uint32_t pixel : front_) {
      ForEachSame(pixel, [&](std::uint32_t neighbour, unsigned direction) {
        Reach(neighbour, static_cast<Cell>(Back(direction)));
      });
    }
  }
}

}  // namespace lumo
