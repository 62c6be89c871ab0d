#pragma once

#include <span>

#include "commands/value_text.h"

namespace lumo {

/// Says what becomes of several polygons of one label. Told: the values of the last one stay.
/// Together: all their rings are one shape.
enum class RegionParts { kTold = 0, kTogether = 1 };

/// "Told", "Together".
VEXG_EXPORT std::span<const EnumWord<RegionParts>> WordsOf(RegionParts);

}  // namespace lumo
