#pragma once

#include <cstdint>

#include "regions/roi_def.h"

namespace lumo {

/// How often a region of interest has become another one: numbers at hand of its pixels hold for
/// one such count. 0 for an empty definition. Threads: any number.
VEXG_EXPORT std::uint64_t ChangesOf(const ROIDefPtr& definition);

}  // namespace lumo
