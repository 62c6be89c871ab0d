#include "regions/region_states.h"

#include <algorithm>
#include <cstring>
#include <vector>

#include "raster/state_runs.h"

namespace lumo {
namespace {

constexpr unsigned kStripPixels = 0x10000;  // of a mask, which stays in the caches

/// Lines of a window from `first` on.
RegionWindow LinesOf(const RegionWindow& window, unsigned first, unsigned lines) {
  RegionWindow strip = window;
  strip.top += std::int64_t{first} << window.level;
  strip.height = lines;
  return strip;
}

/// Grows the bounds of an extent by the marks of a block.
void AddBounds(const RegionMarks& marks, const unsigned char* bytes, RegionExtent& extent) {
  const RegionWindow& window = marks.Window();
  const auto blockLeft = static_cast<unsigned>(window.left);
  for (unsigned line = 0; line < window.height; ++line) {
    const unsigned char* const row = bytes + std::size_t{line} * window.width;
    const void* const first = std::memchr(row, 1, window.width);
    if (first == nullptr) continue;
    unsigned last = window.width - 1;
    while (row[last] == 0) --last;
    const auto left =
        blockLeft + static_cast<unsigned>(static_cast<const unsigned char*>(first) - row);
    const auto y = static_cast<unsigned>(window.top) + line;
    const SubRect span(left, y, blockLeft + last, y);
    SubRect& all = extent.bounds;
    all = extent.pixels == 0 ? span
                             : SubRect(std::min(all.left, left), std::min(all.top, y),
                                       std::max(all.right, span.right), std::max(all.bottom, y));
    extent.pixels += CountMarks(row, window.width);
  }
}

}  // namespace

bool FillRegionStates(RasterizedROI& region, unsigned level, const SubRect& rect,
                      Interleave interleave, unsigned bands, Array<unsigned char>& states) {
  const RegionWindow window = WindowOf(rect, level);
  StateRuns block(PixelValueState::OutsideROI, states, interleave, window.width, window.height,
                  bands);
  if (!block.Fits()) return false;
  const RegionCover cover = region.Cover(window);
  if (cover != RegionCover::kPartly) {
    block.PutAll(cover == RegionCover::kOutside);
    return true;
  }
  const unsigned stripLines = std::clamp<unsigned>(kStripPixels / window.width, 1, window.height);
  std::vector<unsigned char> mask(std::size_t{stripLines} * window.width);
  for (unsigned first = 0; first < window.height; first += stripLines) {
    const unsigned lines = std::min(stripLines, window.height - first);
    std::memset(mask.data(), 0, mask.size());
    RegionMarks marks(LinesOf(window, first, lines), mask.data());
    if (!region.Mark(marks)) return false;
    for (unsigned line = 0; line < lines; ++line) {
      block.PutLine(first + line, mask.data() + std::size_t{line} * window.width, 0);
    }
  }
  return true;
}

bool MaskAtLevel(RasterizedROI& region, unsigned level, const SubRect& rect,
                 Array<unsigned char>& mask, std::uint64_t& count) {
  count = 0;
  if (!ShapeMask(rect, mask)) return false;
  RegionMarks marks(WindowOf(rect, level), mask.GetData());
  if (!region.Mark(marks)) return false;
  count = marks.Count();
  return true;
}

bool MeasureRegion(RasterizedROI& region, const SubRect& rect, const IPC& ipc,
                   RegionExtent& extent) {
  constexpr std::uint64_t kWidth = 4096;
  constexpr std::uint64_t kHeight = 64;
  extent = {};
  std::vector<unsigned char> bytes;
  const std::uint64_t right = std::uint64_t{rect.right} + 1,
                      bottom = std::uint64_t{rect.bottom} + 1;
  for (std::uint64_t top = rect.top; top < bottom; top += kHeight) {
    if (ipc.abort->IsSet()) return false;
    for (std::uint64_t left = rect.left; left < right; left += kWidth) {
      const RegionWindow window{static_cast<std::int64_t>(left), static_cast<std::int64_t>(top),
                                static_cast<unsigned>(std::min(kWidth, right - left)),
                                static_cast<unsigned>(std::min(kHeight, bottom - top))};
      if (region.Cover(window) == RegionCover::kOutside) continue;
      bytes.assign(window.PixelCount(), 0);
      RegionMarks marks(window, bytes.data());
      if (!region.Mark(marks)) return false;
      AddBounds(marks, bytes.data(), extent);
    }
  }
  return true;
}

}  // namespace lumo
