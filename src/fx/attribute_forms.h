#pragma once

#include <span>

#include "commands/value_text.h"

namespace lumo {

/// Says how values of regions are summed. Told: in float, tile after tile. Exact: in integers or
/// doubles, and as floats only in the file.
enum class RegionSums { kTold = 0, kExact = 1 };

/// "Told", "Exact".
VEXG_EXPORT std::span<const EnumWord<RegionSums>> WordsOf(RegionSums);

/// Says what becomes of several polygons of one label. Told: the values of the last one stay.
/// Together: all their rings are one shape.
enum class RegionParts { kTold = 0, kTogether = 1 };

/// "Told", "Together".
VEXG_EXPORT std::span<const EnumWord<RegionParts>> WordsOf(RegionParts);

}  // namespace lumo
