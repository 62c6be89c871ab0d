#pragma once

#include <memory>
#include <span>

#include "calibration/calibration_formula.h"
#include "commands/value_text.h"

namespace lumo {

/// The physical values that digital numbers become.
enum class CalibrationQuantity { kUnknown, kRadiance, kReflectance, kTemperature };

/// "Radiance", "Reflectance", "Temperature".
VEXG_EXPORT std::span<const EnumWord<CalibrationQuantity>> WordsOf(CalibrationQuantity);
inline CalibrationQuantity UnknownValueOf(CalibrationQuantity) {
  return CalibrationQuantity::kUnknown;
}

/// Units of brightness temperature.
enum class TemperatureUnit { kUnknown, kKelvin, kCelsius };

/// "Kelvin", "Celsius".
VEXG_EXPORT std::span<const EnumWord<TemperatureUnit>> WordsOf(TemperatureUnit);
inline TemperatureUnit UnknownValueOf(TemperatureUnit) {
  return TemperatureUnit::kUnknown;
}

/// Holds a calibration of a raster: its quantity and the constants, a value for each band in the
/// lists. Lists that the quantity has no use for are empty.
struct VEXG_EXPORT CalibrationConstants {
  CalibrationQuantity quantity = CalibrationQuantity::kRadiance;
  Array<double> gains;
  Array<double> offsets;
  Array<double> irradiances;      ///< with reflectance: empty where gains and offsets make
                                  ///< reflectance, and not radiance
  double sunElevation = 90.0;     ///< degrees
  double earthSunDistance = 1.0;  ///< astronomical units; with irradiances
  Array<double> k1;
  Array<double> k2;
  TemperatureUnit unit = TemperatureUnit::kKelvin;
  double scale = 1.0;

  /// True when the lists that the quantity needs have a value for each of so many bands; else sets
  /// the fault text.
  bool Fit(unsigned bands) const;

  /// Makes the formula of some of the bands, in the order given; see calibration_formula.h.
  /// @param storedScale  the scale in the precision of the result, which the formulas but that of
  ///                     reflectance take.
  std::unique_ptr<CalibrationFormula> MakeFormula(const Array<unsigned>& bands,
                                                  double storedScale) const;
};

}  // namespace lumo
