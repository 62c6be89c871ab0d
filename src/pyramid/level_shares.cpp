#include "pyramid/level_shares.h"

#include <algorithm>
#include <bit>

namespace lumo {

LevelShares::LevelShares(unsigned samples, unsigned lines, unsigned levelMax, unsigned side,
                         unsigned count)
    : lines_(lines), side_(std::max(side, 1U)), count_(std::max(count, 1U)) {
  const auto bits = static_cast<unsigned>(std::bit_width(std::min(samples, lines)));
  const unsigned last = bits == 0 ? 0 : std::min(levelMax, bits - 1);  // that has pixels
  // Lines of the raster itself are never left over, but where nothing else is made.
  const unsigned least = last == 0 ? 0 : 1;
  top_ = last;
  while (top_ > least && !IsEven(top_)) --top_;
}

bool LevelShares::IsEven(unsigned level) const {
  const std::uint64_t most = (UnitsOf(level) + count_ - 1) / count_ * UnitOf(level);
  const std::uint64_t even = (lines_ + count_ - 1) / count_;
  return most <= even + even / 8;
}

unsigned LevelShares::LineAt(std::uint64_t unit) const {
  return static_cast<unsigned>(std::min(unit * UnitOf(top_), lines_));
}

}  // namespace lumo
