#pragma once

#include <cstdint>
#include <vector>

#include "fx/minimum_numbers.h"
#include "fx/strip_drains.h"

namespace lumo {

/// A plateau, or the part of one in a strip, without a way down inside.
struct StripMinimum {
  std::uint32_t first = 0;  ///< pixel of the strip
  std::int32_t level = 0;
};

/// Holds where the pixels at the edges of a strip drain to, whose drains are final: a minimum, by
/// its number in the strip and 1, or a column x of the line above as -1 - x, or of the line below
/// as -1 - width - x; 0 for excluded ones.
struct VEXG_EXPORT StripWays {
  std::uint32_t minima = 0;  ///< of the strip
  std::vector<std::int32_t> firstLabels, lastLabels;

  /// Finds the ways of a strip.
  /// @param kept  minima of the strip alone; those that drain into another strip go. Null where
  ///              nobody wants them.
  static StripWays Find(StripDrains& drains, std::uint32_t width, std::vector<StripMinimum>* kept);
};

/// Labels the pixels of a strip whose drains are final.
/// @param minima       gives the labels of its minima.
/// @param above,below  the labels of the lines beside it; null where there is none.
VEXG_EXPORT void LabelStrip(StripDrains& drains, MinimumNumbers::Walk minima,
                            const std::int32_t* above, const std::int32_t* below,
                            std::int32_t* labels);

}  // namespace lumo
