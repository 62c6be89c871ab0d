#pragma once

#include <cstddef>
#include <cstdint>

#include "foundation/sub_rect.h"
#include "platform/export.h"

namespace lumo {

/// A block of pixels on the grid of a region, seen at a pyramid level: pixel (x, y) of the block
/// stands for the square of 2^level by 2^level pixels of the grid whose first is
/// (left + (x << level), top + (y << level)).
struct RegionWindow {
  std::int64_t left = 0;  ///< may lie below 0, as `top` may: outside of every raster
  std::int64_t top = 0;
  unsigned width = 0;  ///< of the block, as `height`
  unsigned height = 0;
  unsigned level = 0;  ///< pyramid level, 0 for full resolution
  /// The last column and row of the grid that the block covers.
  std::int64_t Right() const { return left + (std::int64_t{width} << level) - 1; }
  std::int64_t Bottom() const { return top + (std::int64_t{height} << level) - 1; }
  /// Pixels of the block.
  std::uint64_t PixelCount() const { return std::uint64_t{width} * height; }

  /// The window moved by pixels of the grid.
  RegionWindow Moved(std::int64_t x, std::int64_t y) const {
    return {left + x, top + y, width, height, level};
  }
};

/// The window of a rectangle of a raster's pyramid level.
inline RegionWindow WindowOf(const SubRect& rect, unsigned level = 0) {
  return {std::int64_t{rect.left} << level, std::int64_t{rect.top} << level, rect.Width(),
          rect.Height(), level};
}

/// The marks of a region in a window: a byte for each pixel of the block, line after line, 1 where
/// the region has a pixel of the square, and how many were set.
///
/// The bytes are the caller's, which has zeroed them; those that are set already are not counted
/// again. Threads: one at a time.
class VEXG_EXPORT RegionMarks {
 public:
  /// @param bytes  window.PixelCount() of them; they outlive the marks.
  RegionMarks(const RegionWindow& window, unsigned char* bytes) : window_(window), bytes_(bytes) {}

  /// Marks the pixels of one row of the grid from column `first` to `last`, inclusive; what lies
  /// outside the window is left out.
  void MarkSpan(std::int64_t row, std::int64_t first, std::int64_t last);

  /// Runs `mark`, a function of RegionMarks that gives whether it succeeded, with the same bytes as
  /// a window elsewhere on another grid.
  template <typename Work>
  bool MarkMoved(const RegionWindow& window, Work&& mark) {
    const RegionWindow own = window_;
    window_ = window;
    const bool hasMarked = mark(*this);
    window_ = own;
    return hasMarked;
  }

  /// The number of bytes that were set.
  std::uint64_t Count() const { return count_; }
  /// The window that the bytes belong to.
  const RegionWindow& Window() const { return window_; }

 private:
  RegionWindow window_;
  unsigned char* bytes_;
  std::uint64_t count_ = 0;
};

/// The sum of bytes that are 0 or 1.
VEXG_EXPORT std::uint64_t CountMarks(const unsigned char* bytes, std::size_t count);

/// How much of a window a region covers, as far as that is known without marking it.
enum class RegionCover {
  kOutside,  ///< none of it
  kPartly,   ///< some of it, or that isn't known
  kInside,   ///< every pixel of the grid in it
};

}  // namespace lumo
