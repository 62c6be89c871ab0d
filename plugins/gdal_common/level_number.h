#pragma once

#include <algorithm>

namespace lumo::gdal {

/// The number n of a reduction by 2^n; 0 when it is none.
inline unsigned LevelNumber(unsigned fullSamples, unsigned fullLines, unsigned samples,
                            unsigned lines) {
  if (samples == 0 || lines == 0) return 0;
  for (unsigned level = 1; level < 31; ++level) {
    const auto fits = [level](unsigned whole, unsigned reduced) {
      const unsigned down = whole >> level;
      const bool isExact = (down << level) == whole;
      return reduced == std::max(down, 1U) || reduced == down + (isExact ? 0 : 1);
    };
    if (fits(fullSamples, samples) && fits(fullLines, lines)) return level;
  }
  return 0;
}

}  // namespace lumo::gdal
