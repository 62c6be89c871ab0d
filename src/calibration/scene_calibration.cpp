#include "calibration/scene_calibration.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <numbers>

#include "commands/command.h"

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

const CommandDeclaration kGetCalibration{
    "GetMetadataCalibrationCommand",
    "Metadata",
    "Gives what metadata say that calibration needs. What they do not say is absent.",
    {{"URI", Presence::kRequired, ValueKind::kURI, "the metadata"}},
    {{"BandNames", ValueKind::kTextList, "of the bands below, in their order"},
     {"Gain", ValueKind::kNumberArray, "radiance of one count of each band", "W/(m2 sr um)"},
     {"Offset", ValueKind::kNumberArray, "radiance of count 0 of each band", "W/(m2 sr um)"},
     {"SolarIrradiance", ValueKind::kNumberArray, "for each band", "W/(m2 um)"},
     {"SunElevation", ValueKind::kNumber, "above the horizon", "degrees"},
     {"EarthSunDistance", ValueKind::kNumber, "on the day", "astronomical units"}}};

class GetMetadataCalibrationCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata(CatalogFind(Read<URI>("URI")));
    if (!metadata) return Fail("URI: no such metadata is open");
    const SceneCalibration scene = ReadSceneCalibration(*metadata);
    WriteList("BandNames", scene.bandNames);
    WriteList("Gain", scene.gains);
    WriteList("Offset", scene.offsets);
    WriteList("SolarIrradiance", scene.irradiances);
    if (scene.sunElevation) Write("SunElevation", *scene.sunElevation);
    if (scene.earthSunDistance) Write("EarthSunDistance", *scene.earthSunDistance);
    return Succeed();
  }

  template <typename T>
  void WriteList(const char* name, const std::vector<T>& values) {
    if (values.empty()) return;
    Array<T> array{ArrayDims(static_cast<unsigned>(values.size()))};
    std::copy(values.begin(), values.end(), array.begin());
    Write(name, array);
  }
};

const CommandFactoryT<GetMetadataCalibrationCommand> factory(kGetCalibration);

}  // namespace

std::optional<double> EarthSunDistance(const String& time) {
  const std::optional<double> days = DaysSince2000(time.ToUTF8());
  if (!days) return {};
  const double anomaly = (357.529 + 0.98560028 * *days) * kDegree;
  return 1.00014 - 0.01671 * std::cos(anomaly) - 0.00014 * std::cos(2.0 * anomaly);
}

SceneCalibration ReadSceneCalibration(const Metadata& metadata) {
  SceneCalibration scene;
  TakeGains(metadata, scene);
  TakeIrradiances(metadata, scene);
  double elevation = 0.0;
  if (metadata.Get("/Acquisition/SunElevation/", elevation)) scene.sunElevation = elevation;
  String time;
  for (const char* const path : {"/Acquisition/Time/", "/Acquisition/Date/"}) {
    if (!scene.earthSunDistance && metadata.Get(path, time)) {
      scene.earthSunDistance = EarthSunDistance(time);
    }
  }
  return scene;
}

}  // namespace lumo
