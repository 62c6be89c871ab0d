#pragma once

#include <optional>

#include "raster/raster_enums.h"

namespace lumo {

/// How the pixels of a pyramid's levels come out of those of the raster.
enum class LevelReduction : unsigned {
  kTold = 0,     ///< as the resampling method says; in a file of our own every 2^level-th one
  kAverage = 1,  ///< the mean of all valid ones below
  kMode = 2      ///< the most frequent of four, level by level
};

VEXG_EXPORT std::span<const EnumWord<LevelReduction>> WordsOf(LevelReduction);

// A store keeps the reduction as its resampling method, by a code of our own behind those that have
// a word.

/// The last code that a store may hold.
inline constexpr std::int32_t kLastLevelMethod = 7;

/// The code of a reduction; nothing for the told form.
VEXG_EXPORT std::optional<PyramidResamplingMethod> MethodOf(LevelReduction reduction);
/// The reduction of a code; told for all others.
VEXG_EXPORT LevelReduction ReductionOf(PyramidResamplingMethod method);
/// The method with a word that comes nearest: Linear for means and Majority for modes.
VEXG_EXPORT PyramidResamplingMethod ToldMethodOf(PyramidResamplingMethod method);

}  // namespace lumo
