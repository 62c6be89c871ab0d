#include "calibration/calibrated_raster.h"
#include "views/publish_raster.h"

namespace lumo {
namespace {

const CommandDeclaration kCalibrated{
    "CreateCalibratedRasterCommand",
    "Calibration",
    "Shows the physical values of a raster of digital numbers: DN * Gain + Offset, and what "
    "follows "
    "from it. A command of this library's own.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster to stand on"},
     {"Quantity", Presence::kRequired, ValueKind::kWord,
      "of the values that are shown: Radiance, Reflectance or Temperature", "",
      &WordsIn<CalibrationQuantity>},
     {"Gain", Presence::kRequired, ValueKind::kNumberArray, "for each band"},
     {"Offset", Presence::kRequired, ValueKind::kNumberArray, "for each band"},
     {"SolarIrradiance", Presence::kOptional, ValueKind::kNumberArray,
      "for each band, with Reflectance; when absent Gain and Offset make reflectance, and not "
      "radiance, which is divided by the sine of SunElevation alone"},
     {"SunElevation", Presence::kOptional, ValueKind::kNumber,
      "above the horizon, with Reflectance; 90 when absent with no SolarIrradiance", "degrees"},
     {"EarthSunDistance", Presence::kOptional, ValueKind::kNumber,
      "on the day, with SolarIrradiance", "astronomical units"},
     {"K1", Presence::kOptional, ValueKind::kNumberArray,
      "with Temperature: first thermal constant of each band, in the unit of radiance"},
     {"K2", Presence::kOptional, ValueKind::kNumberArray,
      "with Temperature: second thermal constant of each band", "K"},
     {"Unit", Presence::kOptional, ValueKind::kWord,
      "of Temperature: Kelvin, as it is when absent, or Celsius", "", &WordsIn<TemperatureUnit>},
     {"ScaleFactor", Presence::kOptional, ValueKind::kNumber,
      "factor on the result; 1 when absent"},
     {"DataType", Presence::kOptional, ValueKind::kWord,
      "pixel type; Single when absent. Values for integers are cut, and keep their low bits", "",
      &EightTypeWords}},
    PublishedOutputs()};

class CreateCalibratedRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    CalibrationConstants constants;
    constants.quantity = Read<CalibrationQuantity>("Quantity");
    if (const char* const missing = FindMissing(constants.quantity)) {
      return Fail(std::string(missing) + ": the quantity needs it");
    }
    constants.gains = Read<Array<double>>("Gain");
    constants.offsets = Read<Array<double>>("Offset");
    const auto take = [&](const char* name, auto& value) {
      if (HasInput(name)) value = Read<std::remove_reference_t<decltype(value)>>(name);
    };
    take("SolarIrradiance", constants.irradiances);
    take("SunElevation", constants.sunElevation);
    take("EarthSunDistance", constants.earthSunDistance);
    take("K1", constants.k1);
    take("K2", constants.k2);
    take("Unit", constants.unit);
    take("ScaleFactor", constants.scale);
    const unsigned dataType =
        HasInput("DataType") ? ParseDataType(Read<String>("DataType")) : kDataTypeOf<float>;
    BasicRasterPtr view;
    const bool isKnown = DispatchType(EightTypes{}, dataType, [&]<typename T>() {
      view.Reset(new CalibratedRaster<T>(source, constants));
      return true;
    });
    if (!isKnown) return Fail("DataType: there is no such view of this pixel type");
    return view->IsValid() ? Publish(view) : Fail();
  }

  /// The first input that the quantity needs and nobody gave; null for none.
  const char* FindMissing(CalibrationQuantity quantity) const {
    std::vector<const char*> needed;
    if (quantity == CalibrationQuantity::kTemperature) needed = {"K1", "K2"};
    if (quantity == CalibrationQuantity::kReflectance && HasInput("SolarIrradiance")) {
      needed = {"SunElevation", "EarthSunDistance"};
    }
    for (const char* const name : needed) {
      if (!HasInput(name)) return name;
    }
    return nullptr;
  }
};

const CommandFactoryT<CreateCalibratedRasterCommand> createCalibratedRasterFactory(kCalibrated);

}  // namespace
}  // namespace lumo
