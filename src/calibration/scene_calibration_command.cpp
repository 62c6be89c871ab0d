#include <algorithm>
#include <cmath>

#include "calibration/calibration_constants.h"
#include "calibration/scene_bands.h"
#include "raster/raster_command.h"

namespace lumo {
namespace {

const CommandDeclaration kGetCalibration{
    "GetMetadataCalibrationCommand",
    "Metadata",
    "Gives what metadata say that calibration needs. What they do not say is absent, and NaN where "
    "they say it of other bands only.",
    {{"URI", Presence::kRequired, ValueKind::kURI, "the metadata"},
     {"RasterURI", Presence::kOptional, ValueKind::kURI,
      "the raster whose bands the lists are of, as far as it can be told which bands of the "
      "metadata these are; the lists are of the bands of the metadata when absent"},
     {"Bands", Presence::kOptional, ValueKind::kTextList,
      "which bands of the metadata those of the raster are: 4, B04, 6_VCID_1"},
     {"Quantity", Presence::kOptional, ValueKind::kWord,
      "for which the constants are, Radiance, Reflectance or Temperature; where it is that, as "
      "many bands as have thermal "
      "constants are those",
      "", &WordsIn<CalibrationQuantity>},
     {"SunElevation", Presence::kOptional, ValueKind::kNumber,
      "in the place of what the metadata say", "degrees"}},
    {{"BandNames", ValueKind::kTextList, "of the bands below, in their order"},
     {"Gain", ValueKind::kNumberArray, "radiance of one count of each band", "W/(m2 sr um)"},
     {"Offset", ValueKind::kNumberArray, "radiance of count 0 of each band", "W/(m2 sr um)"},
     {"SolarIrradiance", ValueKind::kNumberArray, "for each band", "W/(m2 um)"},
     {"ReflectanceGain", ValueKind::kNumberArray, "reflectance of one count of each band"},
     {"ReflectanceOffset", ValueKind::kNumberArray, "reflectance of count 0 of each band"},
     {"ReflectanceSun", ValueKind::kBoolean,
      "with ReflectanceGain: the elevation of the sun is in it; else it is to be divided by its "
      "sine"},
     {"K1", ValueKind::kNumberArray, "first thermal constant of each band", "W/(m2 sr um)"},
     {"K2", ValueKind::kNumberArray, "second thermal constant of each band", "K"},
     {"SunElevation", ValueKind::kNumber, "above the horizon", "degrees"},
     {"EarthSunDistance", ValueKind::kNumber, "on the day", "astronomical units"},
     {"BandsFrom", ValueKind::kText, "what told which bands those of the raster are"},
     {"Doubt", ValueKind::kText,
      "why that isn't known, or no constants hold for them; the "
      "lists are absent then, but for names to choose from"},
     {"Warning", ValueKind::kText, "what is odd about it"}}};

class GetMetadataCalibrationCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata(CatalogFind(Read<URI>("URI")));
    if (!metadata) return Fail("URI: no such metadata is open");
    if (HasInput("Quantity") &&
        Read<CalibrationQuantity>("Quantity") == CalibrationQuantity::kUnknown) {
      return Fail("Quantity: neither Radiance nor Reflectance nor Temperature");
    }
    SceneCalibration scene = ReadSceneCalibration(*metadata);
    if (HasInput("SunElevation")) scene.sunElevation = Read<double>("SunElevation");
    DeriveRadiances(scene);
    std::string doubt = scene.fault.ToUTF8();
    // Other metadata list their bands in the order of the pixels.
    const bool isOfBands = scene.instrument.GetLength() != 0 || HasInput("Bands");
    if (doubt.empty() && HasInput("RasterURI") && isOfBands) {
      const BasicRasterPtr raster = FindRaster("RasterURI");
      if (!raster) return Fail();
      doubt = ChooseBands(*raster, scene);
    }
    if (doubt.empty()) {
      WriteBands(scene);
    } else {
      Write("Doubt", String(doubt));
    }
    if (scene.sunElevation) Write("SunElevation", *scene.sunElevation);
    if (scene.earthSunDistance) Write("EarthSunDistance", *scene.earthSunDistance);
    return Succeed();
  }

  /// Leaves the constants of the bands of a raster. Gives why these aren't known.
  std::string ChooseBands(const BasicRaster& raster, SceneCalibration& scene) {
    std::vector<std::string> chosen;
    for (const String& name : Read<Array<String>>("Bands")) chosen.push_back(name.ToUTF8());
    const bool isThermal = HasInput("Quantity") && Read<CalibrationQuantity>("Quantity") ==
                                                       CalibrationQuantity::kTemperature;
    const SceneBands found = FindSceneBands(scene, BandsOfRaster(raster), chosen, isThermal);
    if (!found.doubt.empty()) {
      WriteList("BandNames", scene.bandNames);  // to choose from
      return found.doubt;
    }
    scene = ChooseSceneBands(scene, found.bands);
    Write("BandsFrom", String(found.how));
    if (!found.warning.empty()) Write("Warning", String(found.warning));
    return {};
  }

  void WriteBands(const SceneCalibration& scene) {
    WriteList("BandNames", scene.bandNames);
    WriteList("Gain", scene.gains);
    WriteList("Offset", scene.offsets);
    WriteList("SolarIrradiance", scene.irradiances);
    WriteList("ReflectanceGain", scene.reflectanceGains);
    WriteList("ReflectanceOffset", scene.reflectanceOffsets);
    WriteList("K1", scene.k1);
    WriteList("K2", scene.k2);
    if (!scene.reflectanceGains.empty()) Write("ReflectanceSun", scene.isSunIn);
  }

  template <typename T>
  void WriteList(const char* name, const std::vector<T>& values) {
    if constexpr (std::is_floating_point_v<T>) {
      const auto isUntold = [](double value) { return std::isnan(value); };
      if (std::all_of(values.begin(), values.end(), isUntold)) return;
    }
    if (values.empty()) return;
    Array<T> array{ArrayDims(static_cast<unsigned>(values.size()))};
    std::copy(values.begin(), values.end(), array.begin());
    Write(name, array);
  }
};

const CommandFactoryT<GetMetadataCalibrationCommand> getMetadataCalibrationFactory(kGetCalibration);

}  // namespace
}  // namespace lumo
