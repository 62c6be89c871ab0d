#pragma once

#include <optional>
#include <string>

#include "raster/pixel_value.h"
#include "raster/raster_def.h"

namespace lumo {

/// Holds a no-data value of any pixel type: a number, and for integers of 64 bits the digits that a
/// double lacks.
struct VEXG_EXPORT NoDataNumber {
  double number = 0;
  std::string whole;  ///< the integer as a text; "" where the number is exact

  /// The value as one of pixels; nothing when no pixel can hold it.
  template <typename T>
  std::optional<T> As() const {
    return whole.empty() ? ToPixel<T>(number) : ToPixel<T>(whole);
  }
  /// True for the same value; NaN is the same as NaN.
  bool IsSame(const NoDataNumber& other) const;
};

/// The no-data value of a band of a definition; nothing when it has none. The exact integer of a
/// detail counts where it goes with the number, see raster_details.h.
VEXG_EXPORT std::optional<NoDataNumber> NoDataOf(const RasterDef& def, unsigned band);

}  // namespace lumo
