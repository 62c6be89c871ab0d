#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// The drains of the pixels of a strip of whole lines, by the rules of Watershed, where the lines
/// above and below belong to other strips. A pixel is a byte, a cell: the way it drains, and which
/// of its neighbours are on its level, so that levels are needed only once.
///
/// Threads: one at a time; the work arrays are kept from strip to strip.
class VEXG_EXPORT StripDrains {
 public:
  using Cell = std::uint8_t;

  /// The ways of a cell: a neighbour, or one of the last two. Of several neighbours the last
  /// counts.
  enum Way : Cell {
    kUp = 0,
    kLeft = 1,
    kRight = 2,
    kDown = 3,
    kNowhere = 4,  ///< a plateau without a way down, or whose way isn't known yet
    kExcluded = 5,
  };
  /// The bits of a cell that hold its way.
  static constexpr Cell kWayBits = 7;
  /// Stands for the distance of a pixel from which no lower ground is reached.
  static constexpr std::uint32_t kFar = 0xFFFFFFFF;

  /// Gives the bit of a cell whose neighbour in a direction is on the same level.
  static constexpr Cell SameBit(unsigned direction) {
    return static_cast<Cell>(1U << (4 + direction));
  }

  /// The lines of levels around one line; above and below null at the edges of the raster.
  struct Levels {
    const std::int32_t* above = nullptr;
    const std::int32_t* line = nullptr;
    const std::int32_t* below = nullptr;
    /// Not 0 for excluded pixels; all null when none is excluded. Null with the line of levels.
    const std::uint8_t* excludedAbove = nullptr;
    const std::uint8_t* excluded = nullptr;
    const std::uint8_t* excludedBelow = nullptr;
  };
  /// Makes the cells of a line: drains to lower neighbours, and who is on the same level.
  static void MarkLine(const Levels& levels, std::uint32_t width, Cell* cells);

  /// Some whole lines of levels, from the line above them on where the image has one, to the line
  /// below them where it has one.
  struct LevelLines {
    const std::int32_t* levels = nullptr;
    const std::uint8_t* excluded = nullptr;  ///< like `levels`; null when no pixel is
    std::uint32_t lines = 0;                 ///< without those above and below
    bool hasAbove = false;
    bool hasBelow = false;
  };
  /// Makes the cells of some lines.
  static void MarkLines(const LevelLines& from, std::uint32_t width, Cell* cells);

  /// How far the pixels along an edge of a strip are from lower ground on their plateaus; null for
  /// none.
  struct Beyond {
    const std::uint32_t* above = nullptr;  ///< in the line above the strip
    const std::uint32_t* below = nullptr;
  };

  /// Takes the cells of a strip, as MarkLine made them.
  void Begin(std::vector<Cell>&& cells, std::uint32_t width);
  /// The cells; DrainPlateaus changes them.
  const std::vector<Cell>& Cells() const { return cells_; }
  /// Gives the cells back.
  std::vector<Cell> TakeCells() { return std::move(cells_); }
  /// Finds the drains on plateaus.
  /// @param first,last  [out] the distances of the pixels in the first and in the last line: 0 for
  ///                    those with a lower neighbour, kFar for those from which none is reached.
  void DrainPlateaus(const Beyond& beyond, std::uint32_t* first, std::uint32_t* last);

  /// Calls `visit(pixel)` with the first pixel of each plateau without a way down, in their order.
  template <typename Visit>
  void ForEachMinimum(const Visit& visit);

  /// Labels the pixels of the strip by where they drain to.
  /// @param labels       [out] 0 for excluded pixels.
  /// @param labelOfMinimum  called with the first pixel of each minimum, or part of one that the
  ///                        strip cuts off, in the order of these; gives its label, not 0.
  /// @param labelAbove,labelBelow  called with a column; the label, not 0, of the pixel there in
  ///                               the line above or below the strip.
  template <typename OfMinimum, typename Above, typename Below>
  void Label(std::int32_t* labels, const OfMinimum& labelOfMinimum, const Above& labelAbove,
             const Below& labelBelow);

 private:
  static constexpr Cell kNew = 8;  // a way that was found in this step from lower ground

  static constexpr unsigned Back(unsigned direction) { return 3 - direction; }
  std::ptrdiff_t StepTo(unsigned direction) const {
    const auto width = static_cast<std::ptrdiff_t>(width_);
    const std::ptrdiff_t steps[] = {-width, -1, 1, width};
    return steps[direction];
  }
  bool IsInside(std::size_t pixel, unsigned direction) const {
    return direction == kUp     ? pixel >= width_
           : direction == kDown ? pixel + width_ < cells_.size()
                                : true;
  }
  static Cell WithWay(Cell cell, Cell way) {
    return static_cast<Cell>((cell & ~(kWayBits | kNew)) | way);
  }
  /// Calls `visit(neighbour, direction)` for the neighbours in the strip on the same level.
  template <typename Visit>
  void ForEachSame(std::uint32_t pixel, Visit&& visit) const {
    const Cell cell = cells_[pixel];
    if ((cell & SameBit(kUp)) != 0 && pixel >= width_) visit(pixel - width_, kUp);
    if ((cell & SameBit(kLeft)) != 0) visit(pixel - 1, kLeft);
    if ((cell & SameBit(kRight)) != 0) visit(pixel + 1, kRight);
    if ((cell & SameBit(kDown)) != 0 && pixel + width_ < cells_.size()) {
      visit(pixel + width_, kDown);
    }
  }
  void Reach(std::uint32_t pixel, Cell way);
  void FindFirstStep();
  void GatherEntries(const Beyond& beyond);

  /// A pixel that is reached from another strip, at a distance.
  struct Entry {
    std::uint32_t distance;
    std::uint32_t pixel;
    Cell way;
  };

  std::uint32_t width_ = 0;
  std::vector<Cell> cells_;
  std::vector<std::uint32_t> front_, next_;
  std::vector<Entry> entries_;
};

template <typename Visit>
void StripDrains::ForEachMinimum(const Visit& visit) {
  for (std::uint32_t pixel = 0; pixel < cells_.size(); ++pixel) {
    if ((cells_[pixel] & (kWayBits | kNew)) != kNowhere) continue;
    visit(pixel);
    cells_[pixel] |= kNew;
    front_.assign(1, pixel);
    while (!front_.empty()) {
      const std::uint32_t at = front_.back();
      front_.pop_back();
      ForEachSame(at, [&](std::uint32_t neighbour, unsigned) {
        if ((cells_[neighbour] & kNew) != 0) return;
        cells_[neighbour] |= kNew;
        front_.push_back(neighbour);
      });
    }
  }
  for (Cell& cell : cells_) cell &= static_cast<Cell>(~kNew);
}

template <typename OfMinimum, typename Above, typename Below>
void StripDrains::Label(std::int32_t* labels, const OfMinimum& labelOfMinimum,
                        const Above& labelAbove, const Below& labelBelow) {
  const std::size_t count = cells_.size();
  std::fill_n(labels, count, 0);
  for (std::uint32_t pixel = 0; pixel < count; ++pixel) {
    if ((cells_[pixel] & kWayBits) != kNowhere || labels[pixel] != 0) continue;
    const std::int32_t label = labelOfMinimum(pixel);
    labels[pixel] = label;
    front_.assign(1, pixel);
    while (!front_.empty()) {
      const std::uint32_t at = front_.back();
      front_.pop_back();
      ForEachSame(at, [&](std::uint32_t neighbour, unsigned) {
        if (labels[neighbour] != 0) return;
        labels[neighbour] = label;
        front_.push_back(neighbour);
      });
    }
  }
  const std::ptrdiff_t steps[] = {StepTo(kUp), StepTo(kLeft), StepTo(kRight), StepTo(kDown)};
  for (std::size_t pixel = 0; pixel < count; ++pixel) {
    if (labels[pixel] != 0 || (cells_[pixel] & kWayBits) == kExcluded) continue;
    std::size_t end = pixel;
    std::int32_t label = 0;
    while (label == 0) {
      const unsigned way = cells_[end] & kWayBits;
      if (IsInside(end, way)) {
        end += static_cast<std::size_t>(steps[way]);
        label = labels[end];
      } else {
        label = way == kUp ? labelAbove(static_cast<std::uint32_t>(end))
                           : labelBelow(static_cast<std::uint32_t>(end + width_ - count));
        labels[end] = label;
      }
    }
    for (std::size_t at = pixel; labels[at] == 0;) {
      labels[at] = label;
      at += static_cast<std::size_t>(steps[cells_[at] & kWayBits]);
    }
  }
}

}  // namespace lumo
