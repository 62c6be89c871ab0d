#pragma once

#include <span>

#include "commands/value_text.h"

namespace lumo {

/// Says which pixels the colours of scenes are matched by.
enum class MatchMode : unsigned {
  kOverlaps = 0,  ///< those that a scene has in common with the reference
  kScenes = 1,    ///< all of both
};

/// "Overlaps", "Scenes".
VEXG_EXPORT std::span<const EnumWord<MatchMode>> WordsOf(MatchMode);

/// The greatest feathering width, in pixels of the mosaic.
inline constexpr double kMostFeatherWidth = 4096;

}  // namespace lumo
