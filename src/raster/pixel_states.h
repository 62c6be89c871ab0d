#pragma once

#include <cstddef>

#include "raster/raster_enums.h"

// Questions about state bytes, many at a time.

namespace lumo {

/// Tells that none of the states has a bit that makes a pixel count for nothing.
VEXG_EXPORT bool AllValid(const unsigned char* states, std::size_t count);

/// Turns states into bytes of ones where a value is valid, else zeros. `states` may be null: all
/// valid. @return how many are valid.
VEXG_EXPORT std::size_t MaskValid(const unsigned char* states, std::size_t count,
                                  unsigned char* mask);

}  // namespace lumo
