#include "regions/region_states.h"

#include <algorithm>
#include <cstring>
#include <vector>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

constexpr unsigned kStripPixels = 0x10000;  // of a mask, which stays in the caches

VEXG_VECTOR_CLONES void SetOutside(unsigned char* states, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    states[i] = static_cast<unsigned char>(states[i] | PixelValueState::OutsideROI);
  }
}

VEXG_VECTOR_CLONES void ClearOutside(unsigned char* states, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    states[i] = static_cast<unsigned char>(states[i] & ~PixelValueState::OutsideROI);
  }
}

void Put(unsigned char* states, std::size_t count, bool outside) {
  outside ? SetOutside(states, count) : ClearOutside(states, count);
}

/// The states of a block, written in runs of pixels of one line.
class StateBlock {
 public:
  StateBlock(unsigned char* states, Interleave interleave, std::size_t width, std::size_t height,
             std::size_t bands)
      : states_(states), interleave_(interleave), width_(width), height_(height), bands_(bands) {}

  std::size_t GetCount() const { return width_ * height_ * bands_; }
  void PutAll(bool outside) { Put(states_, GetCount(), outside); }

  void PutRun(std::size_t line, std::size_t first, std::size_t count, bool outside) {
    if (interleave_ == Interleave::BIP || bands_ == 1) {
      Put(states_ + (line * width_ + first) * bands_, count * bands_, outside);
      return;
    }
    const std::size_t bandStep = interleave_ == Interleave::BIL ? width_ : height_ * width_;
    const std::size_t lineStep = interleave_ == Interleave::BIL ? bands_ * width_ : width_;
    for (std::size_t band = 0; band < bands_; ++band) {
      Put(states_ + line * lineStep + band * bandStep + first, count, outside);
    }
  }

  /// Writes a line by the bytes of its mask, run by run.
  void PutLine(std::size_t line, const unsigned char* mask) {
    for (std::size_t first = 0; first < width_;) {
      const int inside = mask[first];
      const void* const end = std::memchr(mask + first, 1 - inside, width_ - first);
      const std::size_t stop =
          end != nullptr ? static_cast<std::size_t>(static_cast<const unsigned char*>(end) - mask)
                         : width_;
      PutRun(line, first, stop - first, inside == 0);
      first = stop;
    }
  }

 private:
  unsigned char* states_;
  Interleave interleave_;
  std::size_t width_;
  std::size_t height_;
  std::size_t bands_;
};

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
  StateBlock block(states.GetData(), interleave, window.width, window.height,
                   interleave == Interleave::None ? 1 : bands);
  if (block.GetCount() != states.GetCount()) return false;
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
      block.PutLine(first + line, mask.data() + std::size_t{line} * window.width);
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

bool MeasureRegion(RasterizedROI& region, unsigned samples, unsigned lines, const IPC& ipc,
                   RegionExtent& extent) {
  constexpr unsigned kWidth = 4096;
  constexpr unsigned kHeight = 64;
  extent = {};
  std::vector<unsigned char> bytes;
  for (unsigned top = 0; top < lines; top += kHeight) {
    if (ipc.abort->IsSet()) return false;
    for (unsigned left = 0; left < samples; left += kWidth) {
      const RegionWindow window{left, top, std::min(kWidth, samples - left),
                                std::min(kHeight, lines - top)};
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
