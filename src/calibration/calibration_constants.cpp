#include "calibration/calibration_constants.h"

#include <fmt/format.h>

#include "foundation/fault.h"

namespace lumo {
namespace {

bool FitsBands(const char* name, const Array<double>& values, unsigned bands) {
  if (values.IsValid() && values.GetCount() == bands) return true;
  SetFault(fmt::format("{}: the raster has {} bands, and needs a value for each", name, bands));
  return false;
}

}  // namespace

std::span<const EnumWord<CalibrationQuantity>> WordsOf(CalibrationQuantity) {
  static constexpr EnumWord<CalibrationQuantity> kWords[] = {
      {"Radiance", CalibrationQuantity::kRadiance},
      {"Reflectance", CalibrationQuantity::kReflectance},
      {"Temperature", CalibrationQuantity::kTemperature}};
  return kWords;
}

std::span<const EnumWord<TemperatureUnit>> WordsOf(TemperatureUnit) {
  static constexpr EnumWord<TemperatureUnit> kWords[] = {{"Kelvin", TemperatureUnit::kKelvin},
                                                         {"Celsius", TemperatureUnit::kCelsius}};
  return kWords;
}

bool CalibrationConstants::Fit(unsigned bands) const {
  if (quantity == CalibrationQuantity::kUnknown) {
    SetFault("Quantity: neither Radiance nor Reflectance nor Temperature");
    return false;
  }
  if (unit == TemperatureUnit::kUnknown) {
    SetFault("Unit: neither Kelvin nor Celsius");
    return false;
  }
  if (!FitsBands("Gain", gains, bands) || !FitsBands("Offset", offsets, bands)) return false;
  switch (quantity) {
    case CalibrationQuantity::kReflectance:
      return irradiances.GetCount() == 0 || FitsBands("SolarIrradiance", irradiances, bands);
    case CalibrationQuantity::kTemperature:
      return FitsBands("K1", k1, bands) && FitsBands("K2", k2, bands);
    default:
      return true;
  }
}

std::unique_ptr<CalibrationFormula> CalibrationConstants::MakeFormula(const Array<unsigned>& bands,
                                                                      double storedScale) const {
  const auto choose = [&](const Array<double>& values) {
    Array<double> chosen{ArrayDims(bands.GetCount())};
    for (unsigned i = 0; i < bands.GetCount(); ++i) chosen[i] = values[bands[i]];
    return chosen;
  };
  switch (quantity) {
    case CalibrationQuantity::kReflectance:
      if (irradiances.GetCount() == 0) {
        return MakeRescaledReflectanceFormula(choose(gains), choose(offsets), sunElevation, scale);
      }
      return MakeReflectanceFormula(choose(gains), choose(offsets), choose(irradiances),
                                    sunElevation, earthSunDistance, scale);
    case CalibrationQuantity::kTemperature:
      return MakeTemperatureFormula(choose(gains), choose(offsets), choose(k1), choose(k2),
                                    storedScale, unit == TemperatureUnit::kCelsius ? -273.15 : 0.0);
    default:
      return MakeRadianceFormula(choose(gains), choose(offsets), storedScale);
  }
}

}  // namespace lumo
