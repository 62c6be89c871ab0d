#include "calibration/scene_calibration.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <limits>
#include <numbers>

#include <fmt/format.h>

#include "commands/value_text.h"

namespace lumo {
namespace {

constexpr double kDegree = std::numbers::pi / 180.0;

template <typename T>
std::vector<T> ReadList(const Metadata& metadata, const char* path) {
  Array<T> values;
  if (!metadata.GetArray(path, values)) return {};
  return {values.begin(), values.end()};
}

/// The bands of a scene whose metadata have a section for each, in the order of its pixels.
std::vector<String> BandsOfSelection(const Metadata& metadata) {
  String selection;
  metadata.Get("/Bands/Selection/", selection);
  if (selection == "RGB") return {"R", "G", "B"};
  if (selection == "NRG") return {"N", "R", "G"};
  std::vector<String> present;
  for (const char* const band : {"P", "C", "B", "G", "Y", "R", "RE", "N", "N2", "S1", "S2", "S3",
                                 "S4", "S5", "S6", "S7", "S8"}) {
    if (metadata.Exists(String("/Bands/") + band + "/AbsoluteFactor/")) present.emplace_back(band);
  }
  return present;
}

/// Gains out of the radiance of a count over a whole band, and the width of the band. Counts of
/// such scenes have no offset.
void TakeBandSections(const Metadata& metadata, SceneCalibration& scene) {
  for (const String& band : BandsOfSelection(metadata)) {
    double factor = 0.0, width = 0.0;
    const String place = String("/Bands/") + band;
    if (!metadata.Get(place + "/AbsoluteFactor/", factor) ||
        !metadata.Get(place + "/EffectiveWidth/", width) || !(width > 0.0)) {
      scene.bandNames.clear();
      scene.gains.clear();
      return;
    }
    scene.bandNames.push_back(band);
    scene.gains.push_back(factor / width);
  }
  scene.offsets.assign(scene.gains.size(), 0.0);
}

/// The irradiances in the order of the bands, where both have names.
void TakeIrradiances(const Metadata& metadata, SceneCalibration& scene) {
  const auto values = ReadList<double>(metadata, "/Radiometry/SolarIrradiances/");
  const auto names = ReadList<String>(metadata, "/Radiometry/SolarIrradianceBandNames/");
  if (names.size() != values.size() || scene.bandNames.empty()) {
    if (names.empty()) scene.irradiances = values;
    return;
  }
  for (const String& band : scene.bandNames) {
    const auto at = std::find(names.begin(), names.end(), band);
    if (at == names.end()) return scene.irradiances.clear();
    scene.irradiances.push_back(values[static_cast<std::size_t>(at - names.begin())]);
  }
}

void TakeGains(const Metadata& metadata, SceneCalibration& scene) {
  scene.gains = ReadList<double>(metadata, "/Radiometry/Gains/");
  scene.offsets = ReadList<double>(metadata, "/Radiometry/Offsets/");
  scene.bandNames = ReadList<String>(metadata, "/Radiometry/BandNames/");
  if (!scene.gains.empty()) return;
  const auto counts = ReadList<double>(metadata, "/Radiometry/CountsPerRadiance/");
  if (std::all_of(counts.begin(), counts.end(), [](double count) { return count > 0.0; })) {
    for (const double count : counts) scene.gains.push_back(1.0 / count);
  }
  if (counts.empty()) TakeBandSections(metadata, scene);
}

constexpr double kNotTold = std::numeric_limits<double>::quiet_NaN();

/// Empties a list of which nothing is told.
void DropUntold(std::vector<double>& values) {
  if (std::all_of(values.begin(), values.end(), [](double v) { return std::isnan(v); })) {
    values.clear();
  }
}

/// One of the constants of a band that has a section of its own.
struct OfSection {
  const char* name;
  std::vector<double> SceneCalibration::*values;
};
constexpr OfSection kOfSections[] = {{"RadianceGain", &SceneCalibration::gains},
                                     {"RadianceOffset", &SceneCalibration::offsets},
                                     {"ReflectanceGain", &SceneCalibration::reflectanceGains},
                                     {"ReflectanceOffset", &SceneCalibration::reflectanceOffsets},
                                     {"K1", &SceneCalibration::k1},
                                     {"K2", &SceneCalibration::k2}};

/// Takes what the sections of bands tell, as those of Landsat scenes do. False without one.
bool TakeRescaling(const Metadata& metadata, SceneCalibration& scene) {
  for (const char* const band : {"B1", "B2", "B3", "B4", "B5", "B6", "B6_VCID_1", "B6_VCID_2", "B7",
                                 "B8", "B9", "B10", "B11"}) {
    const String place = String("/Bands/") + band + "/";
    if (!metadata.Exists(place + "RadianceGain/") && !metadata.Exists(place + "ReflectanceGain/")) {
      continue;
    }
    scene.bandNames.emplace_back(band);
    scene.bandFiles.emplace_back();
    metadata.Get(place + "File/", scene.bandFiles.back());
    for (const OfSection& constant : kOfSections) {
      double value = kNotTold;
      metadata.Get(place + constant.name + "/", value);
      (scene.*constant.values).push_back(value);
    }
  }
  for (const OfSection& constant : kOfSections) DropUntold(scene.*constant.values);
  return !scene.bandNames.empty();
}

/// The values of the bands, by the numbers that a list has for them; in its order where the list
/// has none.
std::vector<double> ValuesById(const Metadata& metadata, const char* values, const char* ids,
                               const std::vector<String>& bandIds) {
  const auto list = ReadList<double>(metadata, values);
  const auto listIds = ReadList<String>(metadata, ids);
  if (listIds.empty() && list.size() == bandIds.size()) return list;
  std::vector<double> ordered(bandIds.size(), kNotTold);
  for (std::size_t i = 0; i < std::min(list.size(), listIds.size()); ++i) {
    const auto at = std::find(bandIds.begin(), bandIds.end(), listIds[i]);
    if (at != bandIds.end()) ordered[static_cast<std::size_t>(at - bandIds.begin())] = list[i];
  }
  DropUntold(ordered);
  return ordered;
}

/// Takes reflectances that are counts with an offset divided by one number, as those of Sentinel-2
/// are. False without that number.
bool TakeQuantification(const Metadata& metadata, SceneCalibration& scene) {
  double quantification = 0.0;
  if (!metadata.Get("/Radiometry/ReflectanceQuantification/", quantification) ||
      !(quantification > 0.0)) {
    return false;
  }
  scene.bandNames = ReadList<String>(metadata, "/Bands/SpectralNames/");
  auto ids = ReadList<String>(metadata, "/Bands/SpectralIds/");
  if (scene.bandNames.empty() || ids.size() != scene.bandNames.size()) {
    scene.bandNames = {"B1", "B2",  "B3", "B4",  "B5",  "B6", "B7",
                       "B8", "B8A", "B9", "B10", "B11", "B12"};
    ids.clear();
    for (unsigned id = 0; id < scene.bandNames.size(); ++id)
      ids.push_back(String::Format("%u", id));
  }
  scene.instrument = "MSI";
  scene.isSunIn = true;
  scene.irradiances =
      ValuesById(metadata, "/Radiometry/SolarIrradiances/", "/Radiometry/SolarIrradianceIds/", ids);
  scene.reflectanceGains.assign(ids.size(), 1.0 / quantification);
  scene.reflectanceOffsets = ValuesById(metadata, "/Radiometry/ReflectanceCountOffsets/",
                                        "/Radiometry/ReflectanceCountOffsetIds/", ids);
  const bool hasOffsets = metadata.Exists("/Radiometry/ReflectanceCountOffsets/");
  if (!hasOffsets) scene.reflectanceOffsets.assign(ids.size(), 0.0);
  for (double& offset : scene.reflectanceOffsets) offset /= quantification;
  return true;
}

/// Takes when the scene was taken, and where the sun stood.
void TakeSun(const Metadata& metadata, SceneCalibration& scene) {
  double value = 0.0;
  if (metadata.Get("/Acquisition/SunElevation/", value)) {
    scene.sunElevation = value;
  } else if (metadata.Get("/Acquisition/SunZenith/", value)) {
    scene.sunElevation = 90.0 - value;
  }
  if (metadata.Get("/Acquisition/EarthSunDistance/", value)) {
    scene.earthSunDistance = value;
  } else if (metadata.Get("/Acquisition/SunDistanceFactor/", value) && value > 0.0) {
    scene.earthSunDistance = 1.0 / std::sqrt(value);
  }
  String time;
  for (const char* const path : {"/Acquisition/Time/", "/Acquisition/Date/"}) {
    if (!scene.earthSunDistance && metadata.Get(path, time)) {
      scene.earthSunDistance = EarthSunDistance(time);
    }
  }
}

/// Level 2 holds what a surface is like; its pixels have scales of their own.
String FaultOfLevel(const Metadata& metadata) {
  String level;
  if (!metadata.Get("/Product/Level/", level)) return {};
  const std::string text = level.ToUTF8();
  if (!text.starts_with("L2") && !text.starts_with("Level-2")) return {};
  return String(
      fmt::format("the scene is of level {}, whose pixels are of the surface and no "
                  "counts of the sensor",
                  text));
}

/// The number that all of `text` is.
bool ReadPart(const std::string& text, double& number) {
  std::istringstream in = MakeTextReader(String(text));
  const bool isDigit = !text.empty() && text[0] >= '0' && text[0] <= '9';
  return isDigit && ReadNumber(in, number) && in.peek() == std::istringstream::traits_type::eof();
}

/// Days since 2000-01-01 12:00 UTC.
std::optional<double> DaysSince2000(const std::string& text) {
  constexpr std::size_t kDateLength = 10, kTimeLength = 19;
  double year = 0, month = 0, day = 0, hours = 0, minutes = 0, seconds = 0;
  if (text.size() < kDateLength || text[4] != '-' || text[7] != '-') return {};
  if (!ReadPart(text.substr(0, 4), year) || !ReadPart(text.substr(5, 2), month) ||
      !ReadPart(text.substr(8, 2), day)) {
    return {};
  }
  if (text.size() > kDateLength) {
    if (text.size() < kTimeLength) return {};
    std::string rest = text.substr(17);
    if (rest.ends_with('Z')) rest.pop_back();
    if ((text[10] != 'T' && text[10] != ' ') || text[13] != ':' || text[16] != ':' ||
        !ReadPart(text.substr(11, 2), hours) || !ReadPart(text.substr(14, 2), minutes) ||
        !ReadPart(rest, seconds)) {
      return {};
    }
  }
  namespace ch = std::chrono;
  const ch::year_month_day date(ch::year(static_cast<int>(year)),
                                ch::month(static_cast<unsigned>(month)),
                                ch::day(static_cast<unsigned>(day)));
  if (!date.ok() || hours > 24.0 || minutes >= 60.0 || seconds > 61.0) return {};
  const auto days = ch::sys_days(date) - ch::sys_days(ch::year(2000) / 1 / 1);
  return static_cast<double>(days.count()) + (hours - 12.0) / 24.0 + minutes / 1440.0 +
         seconds / 86400.0;
}

}  // namespace

std::optional<double> EarthSunDistance(const String& time) {
  const std::optional<double> days = DaysSince2000(time.ToUTF8());
  if (!days) return {};
  const double anomaly = (357.529 + 0.98560028 * *days) * kDegree;
  return 1.00014 - 0.01671 * std::cos(anomaly) - 0.00014 * std::cos(2.0 * anomaly);
}

SceneCalibration ReadSceneCalibration(const Metadata& metadata) {
  SceneCalibration scene;
  if (TakeRescaling(metadata, scene)) {
    metadata.Get("/Sensor/Instrument/", scene.instrument);
  } else if (!TakeQuantification(metadata, scene)) {
    TakeGains(metadata, scene);
    TakeIrradiances(metadata, scene);
  }
  scene.fault = FaultOfLevel(metadata);
  TakeSun(metadata, scene);
  return scene;
}

void DeriveRadiances(SceneCalibration& scene) {
  const std::size_t bands = scene.reflectanceGains.size();
  if (!scene.gains.empty() || !scene.isSunIn || scene.irradiances.size() != bands ||
      scene.reflectanceOffsets.size() != bands || !scene.sunElevation || !scene.earthSunDistance) {
    return;
  }
  const double distance = *scene.earthSunDistance;
  for (std::size_t i = 0; i < bands; ++i) {
    const double whole = scene.irradiances[i] * std::sin(*scene.sunElevation * kDegree) /
                         (std::numbers::pi * distance * distance);
    scene.gains.push_back(scene.reflectanceGains[i] * whole);
    scene.offsets.push_back(scene.reflectanceOffsets[i] * whole);
  }
}

}  // namespace lumo
