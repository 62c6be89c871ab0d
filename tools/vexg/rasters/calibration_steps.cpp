#include "rasters/calibration_steps.h"

#include <cmath>

#include <fmt/format.h>

#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kMetadataStep = "metadata";
constexpr const char* kConstantsStep = "constants";

/// One of the constants of a calibration that are not of the whole scene.
struct BandConstant {
  const char* option;
  const char* input;  ///< of the commands that calibrate; also what metadata call it
  std::vector<double> CalibrationRequest::*values;
};

/// The constants that a quantity needs for each band.
std::vector<BandConstant> BandConstants(const std::string& quantity) {
  std::vector<BandConstant> all{{"--gain", "Gain", &CalibrationRequest::gain},
                                {"--offset", "Offset", &CalibrationRequest::offset}};
  if (quantity == "reflectance") {
    all.push_back({"--irradiance", "SolarIrradiance", &CalibrationRequest::irradiance});
  } else if (quantity == "temperature") {
    all.push_back({"--k1", "K1", &CalibrationRequest::k1});
    all.push_back({"--k2", "K2", &CalibrationRequest::k2});
  }
  return all;
}

/// A constant of the whole scene.
struct SceneConstant {
  const char* option;
  const char* input;
  std::optional<double> CalibrationRequest::*value;
};

/// The constants that a quantity needs of the scene.
std::vector<SceneConstant> SceneConstants(const std::string& quantity) {
  if (quantity != "reflectance") return {};
  return {{"--sun-elevation", "SunElevation", &CalibrationRequest::sunElevation},
          {"--distance", "EarthSunDistance", &CalibrationRequest::distance}};
}

const char* CommandOf(const std::string& quantity) {
  return quantity == "radiance"      ? "CalibrateRasterRadianceCommand"
         : quantity == "reflectance" ? "CalibrateRasterTOAReflectanceCommand"
                                     : "CalibrateRasterBrightnessTemperatureCommand";
}

[[noreturn]] void Refuse(const std::string& line) {
  throw HostError(kExitUsage, line);
}

/// An option as a complaint names it: with the file behind its values.
std::string NameOf(const CalibrationRequest& request, const char* option) {
  return request.taken.count(option) != 0 ? request.metadata + ": " + option : option;
}

/// Refuses constants that are missing.
void RefuseMissing(const CalibrationRequest& request) {
  const auto need = [&](const char* option, bool given) {
    if (given) return;
    Refuse(request.metadata.empty() ? fmt::format("{}: {} needs it", option, request.quantity)
                                    : fmt::format("{}: it doesn't tell {}, which {} needs",
                                                  request.metadata, option, request.quantity));
  };
  for (const BandConstant& constant : BandConstants(request.quantity)) {
    need(constant.option, !(request.*constant.values).empty());
  }
  for (const SceneConstant& constant : SceneConstants(request.quantity)) {
    need(constant.option, (request.*constant.value).has_value());
  }
}

/// Questions constants that can hardly be meant.
void QuestionOdd(const CalibrationRequest& request) {
  if (request.quantity != "reflectance") return;
  constexpr double kLeast = 0.9, kMost = 1.1;  // the earth keeps within 0.983 and 1.017
  if (*request.distance < kLeast || *request.distance > kMost) {
    Say(
        fmt::format("note: {}: {} astronomical units; the earth is 0.983 to 1.017 of them from the "
                    "sun",
                    NameOf(request, "--distance"), *request.distance));
  }
}

/// Refuses constants that give no image.
void RefuseImpossible(const CalibrationRequest& request) {
  if (request.quantity != "reflectance") return;
  const auto refuse = [&](const char* option, const char* why) {
    Refuse(NameOf(request, option) + ": " + why);
  };
  if (!(*request.sunElevation > 0 && *request.sunElevation <= 90)) {
    refuse("--sun-elevation", "the sun stands 0 to 90 degrees above the horizon, and not on it");
  }
  if (!(*request.distance > 0)) refuse("--distance", "it is above 0");
  for (const double irradiance : request.irradiance) {
    if (!(irradiance > 0)) refuse("--irradiance", "it is above 0");
  }
}

/// A value for each band; one value counts for all.
Array<double> ForBands(const CalibrationRequest& request, const BandConstant& constant,
                       unsigned bands) {
  const std::vector<double>& values = request.*constant.values;
  if (values.size() != 1 && values.size() != bands) {
    Refuse(fmt::format("{}: there are {} values for {} bands", NameOf(request, constant.option),
                       values.size(), bands));
  }
  Array<double> all{ArrayDims(bands)};
  for (unsigned band = 0; band < bands; ++band) all[band] = values[values.size() == 1 ? 0 : band];
  return all;
}

}  // namespace

void CalibrationRequest::RefuseUseless() const {
  const bool isReflectance = quantity == "reflectance";
  const bool isTemperature = quantity == "temperature";
  const std::pair<const char*, bool> useless[] = {
      {"--irradiance", !isReflectance && !irradiance.empty()},
      {"--sun-elevation", !isReflectance && sunElevation.has_value()},
      {"--distance", !isReflectance && distance.has_value()},
      {"--k1", !isTemperature && !k1.empty()},
      {"--k2", !isTemperature && !k2.empty()}};
  for (const auto& [option, given] : useless) {
    if (given) Refuse(fmt::format("{}: {} has no use for it", option, quantity));
  }
}

void CalibrationRequest::CheckConstants() const {
  RefuseMissing(*this);
  RefuseImpossible(*this);
  QuestionOdd(*this);
}

bool CalibrationRequest::IsReal() const {
  return TypeCode() == kDataTypeOf<float> || TypeCode() == kDataTypeOf<double>;
}

unsigned CalibrationRequest::TypeCode() const {
  return ParseDataType(String(type));
}

void CalibrationRequest::CheckScale() const {
  if (IsReal() || quantity == "reflectance" || std::trunc(scale) == scale) {
    return;
  }
  throw HostError(kExitUsage, fmt::format("--scale: {} would be cut to {}, as the result is of {}",
                                          scale, std::trunc(scale), type));
}

void AddConstants(JobDraft& draft, const MetadataSource& source) {
  draft.Open(kMetadataStep, "CreateMetadataCommand").AddInput("ConnStr", ConnStringsOf(source));
  draft.Step(kConstantsStep, "GetMetadataCalibrationCommand").AddInput("URI", String("$metadata"));
}

std::string TakeConstants(CalibrationRequest& request, const JobResults& results) {
  const Map<String, String>& told = results.Find(kConstantsStep).returns;
  std::string line;
  for (const BandConstant& constant : BandConstants(request.quantity)) {
    std::vector<double>& values = request.*constant.values;
    if (!values.empty() || !told.HasKey(constant.input)) continue;
    const auto array = ParseValue<Array<double>>(told.Find(constant.input));
    values.assign(array.begin(), array.end());
    request.taken.insert(constant.option);
    line += fmt::format(" {} {}", constant.option, fmt::join(values, ","));
  }
  for (const SceneConstant& constant : SceneConstants(request.quantity)) {
    std::optional<double>& value = request.*constant.value;
    if (value.has_value() || !told.HasKey(constant.input)) continue;
    value = ParseValue<double>(told.Find(constant.input));
    request.taken.insert(constant.option);
    line += fmt::format(" {} {}", constant.option, *value);
  }
  std::string bands;
  if (told.HasKey("BandNames")) {
    for (const String& band : ParseValue<Array<String>>(told.Find("BandNames"))) {
      bands.append(bands.empty() ? " of the bands " : ", ").append(band.ToUTF8());
    }
  }
  return request.metadata +
         (line.empty() ? ": nothing was taken from it" : ": taken" + line + bands);
}

void AddCalibration(JobDraft& draft, const char* step, const CalibrationRequest& request,
                    const String& shown, unsigned bands) {
  JobWriterCommand& calibrate = draft.Step(step, CommandOf(request.quantity));
  calibrate.AddInput("SourceURI", shown);
  calibrate.AddInput("CalibratedURI", String("$target"));
  for (const BandConstant& constant : BandConstants(request.quantity)) {
    calibrate.AddInput(constant.input, ForBands(request, constant, bands));
  }
  for (const SceneConstant& constant : SceneConstants(request.quantity)) {
    calibrate.AddInput(constant.input, *(request.*constant.value));
  }
  calibrate.AddInput("ScaleFactor", request.scale);
}

}  // namespace lumo::host
