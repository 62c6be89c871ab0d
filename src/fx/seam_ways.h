#pragma once

#include <cstdint>
#include <vector>

#include "foundation/run_controls.h"
#include "fx/seam_lines.h"

namespace lumo {

/// Follows the pixels of the lines at which strips meet to the minima that they drain to, where
/// their ways lead from strip to strip. The lines of three strips are in memory at a time.
///
/// A label below 0 says that the way of a pixel goes on: to column x of the line above its strip as
/// -1 - x, of the line below it as -1 - width - x. Strips are gone through downward and upward, as
/// long as one has such labels; a way that turns n times between strips takes about n of these.
///
/// Threads: one at a time. Failure: false, with the fault set.
class SeamWays {
 public:
  /// @param lines   outlives this.
  /// @param isOpen  by strip: not 0 where a label of its lines may be below 0.
  SeamWays(SeamLines& lines, std::uint32_t width, std::vector<std::uint8_t>&& isOpen);

  /// Gives all pixels of the lines labels above 0; at an abort some may stay as they are.
  bool Follow(const AbortFlag* abort);

 private:
  /// The lines of a strip, side by side: the first one, then the last one.
  using Labels = std::vector<std::int32_t>;

  bool FollowStrip(unsigned strip);
  std::int32_t LabelAt(std::int32_t way, std::size_t& place) const;
  void FollowFrom(std::size_t start);

  SeamLines& lines_;
  std::uint32_t width_;
  std::vector<std::uint8_t> isOpen_;
  Labels own_, above_, below_;
  Labels ends_;  // of the ways from own_: a label, 0 where it isn't known yet, or kBeyond
  std::vector<std::size_t> places_;
  bool hasMoved_ = false;
};

}  // namespace lumo
