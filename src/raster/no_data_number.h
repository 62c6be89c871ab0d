#pragma once

#include <optional>
#include <string>

#include "raster/pixel_value.h"
#include "raster/raster_def.h"

namespace lumo {

/// A no-data value whatever the pixel type: a number, which of 64-bit integers has digits that a
/// double lacks.
struct VEXG_EXPORT NoDataNumber {
  double number = 0;
  std::string whole;  ///< the integer as a text; "" where the number tells all

  /// The value as one of pixels; nothing when no pixel can hold it.
  template <typename T>
  std::optional<T> As() const {
    return whole.empty() ? ToPixel<T>(number) : ToPixel<T>(whole);
  }
  /// NaN is the same as NaN.
  bool IsSame(const NoDataNumber& other) const;
};

/// The no-data value of a band of a definition; nothing when it has none. The exact integer of a
/// detail counts where it goes with the number, see raster_details.h.
VEXG_EXPORT std::optional<NoDataNumber> NoDataOf(const RasterDef& def, unsigned band);

}  // namespace lumo
