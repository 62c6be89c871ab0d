#include "regions/region_window.h"

#include <algorithm>
#include <cstring>

#include "platform/vector_clones.h"

namespace lumo {

VEXG_VECTOR_CLONES std::uint64_t CountMarks(const unsigned char* bytes, std::size_t count) {
  constexpr std::size_t kStretch = 128;  // whose sum a byte can hold
  std::uint64_t total = 0;
  for (; count >= kStretch; bytes += kStretch, count -= kStretch) {
    unsigned char lanes[32] = {};
    for (std::size_t i = 0; i < kStretch; i += 32) {
      for (std::size_t lane = 0; lane < 32; ++lane) {
        lanes[lane] = static_cast<unsigned char>(lanes[lane] + bytes[i + lane]);
      }
    }
    unsigned sum = 0;
    for (const unsigned char lane : lanes) sum += lane;
    total += sum;
  }
  for (; count != 0; --count) total += *bytes++;
  return total;
}

void RegionMarks::MarkSpan(std::int64_t row, std::int64_t first, std::int64_t last) {
  const std::int64_t line = (row - window_.top) >> window_.level;
  const std::int64_t from = std::max<std::int64_t>((first - window_.left) >> window_.level, 0);
  const std::int64_t to = std::min<std::int64_t>((last - window_.left) >> window_.level,
                                                 window_.width - std::int64_t{1});
  if (line < 0 || line >= window_.height || from > to) return;
  unsigned char* const at = bytes_ + line * std::int64_t{window_.width} + from;
  const auto width = static_cast<std::size_t>(to - from + 1);
  count_ += width - CountMarks(at, width);
  std::memset(at, 1, width);
}

}  // namespace lumo
