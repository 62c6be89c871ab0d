#pragma once

#include "commands/division.h"
#include "pyramid/level_shape.h"

namespace lumo {

/// Divides the making of a pyramid: each share has lines of the raster that give whole rows of
/// tiles of all levels up to the top one; levels above it come out of the lines of that one, and
/// cross shares.
class VEXG_EXPORT LevelShares {
 public:
  /// @param samples,lines  of the raster.
  /// @param levelMax       that is made.
  /// @param side           of tiles.
  /// @param count          of shares; some may get no lines.
  LevelShares(unsigned samples, unsigned lines, unsigned levelMax, unsigned side, unsigned count);

  /// The last level that shares make: the higher it is, the less is left over, and the less evenly
  /// the lines are divided. No share has more than an eighth above its part, where that can be.
  unsigned Top() const { return top_; }
  /// The first line of the raster that a share has.
  unsigned First(unsigned share) const { return LineAt(Share{share, count_}.Begin(Units())); }
  /// The line behind the last of a share.
  unsigned End(unsigned share) const { return LineAt(Share{share, count_}.End(Units())); }
  unsigned Count() const { return count_; }

 private:
  /// Lines of the raster under a row of tiles of a level.
  std::uint64_t UnitOf(unsigned level) const { return std::uint64_t{side_} << level; }
  std::uint64_t UnitsOf(unsigned level) const {
    return (lines_ + UnitOf(level) - 1) / UnitOf(level);
  }
  std::uint64_t Units() const { return UnitsOf(top_); }
  unsigned LineAt(std::uint64_t unit) const;
  bool IsEven(unsigned level) const;

  std::uint64_t lines_;
  unsigned side_;
  unsigned count_;
  unsigned top_ = 0;
};

}  // namespace lumo
