#include "rasters/calibration_steps.h"

#include <algorithm>
#include <cmath>
#include <cstring>

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

/// The constants that a request needs for each band.
std::vector<BandConstant> BandConstants(const CalibrationRequest& request) {
  if (request.UsesReflectances()) {
    return {{"--reflectance-gain", "ReflectanceGain", &CalibrationRequest::reflectanceGain},
            {"--reflectance-offset", "ReflectanceOffset", &CalibrationRequest::reflectanceOffset}};
  }
  std::vector<BandConstant> all{{"--gain", "Gain", &CalibrationRequest::gain},
                                {"--offset", "Offset", &CalibrationRequest::offset}};
  if (request.quantity == "reflectance") {
    all.push_back({"--irradiance", "SolarIrradiance", &CalibrationRequest::irradiance});
  } else if (request.quantity == "temperature") {
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

/// The constants that a request needs of the scene.
std::vector<SceneConstant> SceneConstants(const CalibrationRequest& request) {
  if (request.quantity != "reflectance") return {};
  std::vector<SceneConstant> all{
      {"--sun-elevation", "SunElevation", &CalibrationRequest::sunElevation}};
  if (!request.UsesReflectances()) {
    all.push_back({"--distance", "EarthSunDistance", &CalibrationRequest::distance});
  }
  return all;
}

/// The word of a quantity or unit for the commands: with a capital letter.
String WordOf(std::string word) {
  word[0] = static_cast<char>(word[0] - 'a' + 'A');
  return String(word);
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
    if (!request.doubt.empty()) {
      // With names of bands it can be said which those of the raster are.
      const bool mayChoose = !request.takenBands.empty() && request.metadataBands.empty();
      Refuse(request.metadata + ": " + request.doubt +
             (mayChoose ? "; --metadata-bands says it" : ""));
    }
    Refuse(request.metadata.empty() ? fmt::format("{}: {} needs it", option, request.quantity)
                                    : fmt::format("{}: it doesn't tell {}, which {} needs",
                                                  request.metadata, option, request.quantity));
  };
  for (const BandConstant& constant : BandConstants(request)) {
    need(constant.option, !(request.*constant.values).empty());
  }
  for (const SceneConstant& constant : SceneConstants(request)) {
    need(constant.option, (request.*constant.value).has_value());
  }
}

/// Refuses constants that the metadata tell for some of the bands only.
void RefuseUntold(const CalibrationRequest& request) {
  for (const BandConstant& constant : BandConstants(request)) {
    const std::vector<double>& values = request.*constant.values;
    for (std::size_t band = 0; band < values.size(); ++band) {
      if (!std::isnan(values[band])) continue;
      const bool isNamed = band < request.takenBands.size();
      Refuse(fmt::format(
          "{} of band {}, which {} needs",
          request.taken.count(constant.option) != 0
              ? fmt::format("{}: it doesn't tell {}", request.metadata, constant.option)
              : fmt::format("{}: there is none", constant.option),
          isNamed ? request.takenBands[band] : fmt::format("{}", band), request.quantity));
    }
  }
}

/// Questions constants that can hardly be meant.
void QuestionOdd(const CalibrationRequest& request) {
  if (request.quantity != "reflectance" || request.UsesReflectances()) return;
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
  const auto refuse = [&](const char* option, const char* why) {
    Refuse(NameOf(request, option) + ": " + why);
  };
  if (request.sunElevation && !(*request.sunElevation > 0 && *request.sunElevation <= 90)) {
    refuse("--sun-elevation", "the sun stands 0 to 90 degrees above the horizon, and not on it");
  }
  if (request.quantity != "reflectance") return;
  if (request.UsesReflectances()) return;
  if (!(*request.distance > 0)) refuse("--distance", "it is above 0");
  for (const double irradiance : request.irradiance) {
    if (!(irradiance > 0)) refuse("--irradiance", "it is above 0");
  }
}

std::vector<double> ToVector(const Array<double>& values) {
  return {values.begin(), values.end()};
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
  // Metadata of reflectances give radiances for an elevation of the sun.
  const bool hasSun = isReflectance || (quantity == "radiance" && !metadata.empty());
  const std::pair<const char*, bool> useless[] = {
      {"--irradiance", !isReflectance && !irradiance.empty()},
      {"--reflectance-gain", !isReflectance && !reflectanceGain.empty()},
      {"--reflectance-offset", !isReflectance && !reflectanceOffset.empty()},
      {"--sun-elevation", !hasSun && sunElevation.has_value()},
      {"--unit", !isTemperature && unit != "kelvin"},
      {"--distance", !isReflectance && distance.has_value()},
      {"--k1", !isTemperature && !k1.empty()},
      {"--k2", !isTemperature && !k2.empty()}};
  for (const auto& [option, given] : useless) {
    if (given) Refuse(fmt::format("{}: {} has no use for it", option, quantity));
  }
  if (!metadataBands.empty() && metadata.empty()) {
    Refuse("--metadata-bands: it goes with --from-metadata");
  }
  if (!UsesReflectances()) return;
  const std::pair<const char*, bool> ofRadiance[] = {{"--gain", !gain.empty()},
                                                     {"--offset", !offset.empty()},
                                                     {"--irradiance", !irradiance.empty()},
                                                     {"--distance", distance.has_value()}};
  for (const auto& [option, given] : ofRadiance) {
    if (given) Refuse(fmt::format("{}: --reflectance-gain and -offset go without it", option));
  }
}

bool CalibrationRequest::UsesReflectances() const {
  return quantity == "reflectance" && (!reflectanceGain.empty() || !reflectanceOffset.empty());
}

void CalibrationRequest::CheckConstants() const {
  RefuseMissing(*this);
  RefuseUntold(*this);
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

void AddConstants(JobDraft& draft, const CalibrationRequest& request, const MetadataSource& source,
                  const String& raster) {
  draft.Open(kMetadataStep, "CreateMetadataCommand").AddInput("ConnStr", ConnStringsOf(source));
  JobWriterCommand& constants = draft.Step(kConstantsStep, "GetMetadataCalibrationCommand");
  constants.AddInput("URI", String("$metadata"));
  constants.AddInput("RasterURI", raster);
  constants.AddInput("Quantity", WordOf(request.quantity));
  if (request.quantity == "radiance" && request.sunElevation) {
    constants.AddInput("SunElevation", *request.sunElevation);
  }
  if (request.metadataBands.empty()) return;
  Array<String> bands{ArrayDims(static_cast<unsigned>(request.metadataBands.size()))};
  std::copy(request.metadataBands.begin(), request.metadataBands.end(), bands.begin());
  constants.AddInput("Bands", bands);
}

namespace {

/// Takes gains and offsets that make reflectance, where there are some and nothing is given that
/// goes with those that make radiance.
void ChooseReflectances(CalibrationRequest& request, const Map<String, String>& told) {
  if (!told.HasKey("ReflectanceGain")) return;
  const bool isSunIn = ParseValue<bool>(told.Find("ReflectanceSun"));
  if (request.quantity == "radiance" && request.sunElevation && !isSunIn) {
    Refuse("--sun-elevation: radiance has no use for it");
  }
  if (request.quantity == "radiance" && !told.HasKey("Gain") && request.gain.empty()) {
    Refuse(request.metadata +
           ": it tells reflectance; radiance follows from it with --sun-elevation");
  }
  if (request.quantity != "reflectance" || !request.gain.empty() || !request.offset.empty() ||
      !request.irradiance.empty() || request.distance) {
    return;
  }
  if (isSunIn && request.sunElevation) {
    Refuse("--sun-elevation: it is in the reflectances of " + request.metadata);
  }
  if (request.reflectanceGain.empty()) {
    request.reflectanceGain = ToVector(ParseValue<Array<double>>(told.Find("ReflectanceGain")));
    request.taken.insert("--reflectance-gain");
  }
  if (isSunIn) request.sunElevation = 90.0;
}

}  // namespace

std::vector<std::string> TakeConstants(CalibrationRequest& request, const JobResults& results) {
  const Map<String, String>& told = results.Find(kConstantsStep).returns;
  const auto textOf = [&](const char* name) {
    return told.HasKey(name) ? told.Find(name).ToUTF8() : std::string();
  };
  if (told.HasKey("BandNames")) {
    for (const String& band : ParseValue<Array<String>>(told.Find("BandNames"))) {
      request.takenBands.push_back(band.ToUTF8());
    }
  }
  request.doubt = textOf("Doubt");
  ChooseReflectances(request, told);
  std::string line;
  for (const BandConstant& constant : BandConstants(request)) {
    std::vector<double>& values = request.*constant.values;
    const bool isTaken = values.empty() && told.HasKey(constant.input);
    if (isTaken) {
      values = ToVector(ParseValue<Array<double>>(told.Find(constant.input)));
      request.taken.insert(constant.option);
    }
    if (request.taken.count(constant.option) == 0) continue;
    line += fmt::format(" {} {}", constant.option, fmt::join(values, ","));
  }
  const bool hasBands = !line.empty();
  const bool isSunIn = textOf("ReflectanceSun") == "1" && request.UsesReflectances();
  for (const SceneConstant& constant : SceneConstants(request)) {
    std::optional<double>& value = request.*constant.value;
    if (!value.has_value() && told.HasKey(constant.input)) {
      value = ParseValue<double>(told.Find(constant.input));
      request.taken.insert(constant.option);
    } else if (!isSunIn) {
      continue;
    }
    line += fmt::format(" {} {}", constant.option, *value);
  }
  std::string bands;
  for (const std::string& band : request.takenBands) {
    bands.append(bands.empty() ? " of the bands " : ", ").append(band);
  }
  const std::string from = textOf("BandsFrom");
  if (!from.empty()) bands.append(", ").append(from);
  if (!hasBands) bands.clear();
  std::vector<std::string> said;
  if (hasBands && !textOf("Warning").empty()) {
    said.push_back("note: " + request.metadata + ": " + textOf("Warning"));
  }
  said.push_back(request.metadata +
                 (line.empty() ? ": nothing was taken from it" : ": taken" + line + bands));
  return said;
}

void AddCalibration(JobDraft& draft, const char* step, const CalibrationRequest& request,
                    const String& shown, unsigned bands) {
  constexpr const char* kView = "calibrated";
  JobWriterCommand& view = draft.Open(kView, "CreateCalibratedRasterCommand");
  view.AddInput("SrcURI", shown);
  view.AddInput("Quantity", WordOf(request.quantity));
  for (const BandConstant& constant : BandConstants(request)) {
    const std::string input = constant.input;
    // Without irradiances gains and offsets make reflectance.
    const bool isReflectance = input.starts_with("Reflectance");
    view.AddInput(isReflectance ? input.substr(std::strlen("Reflectance")).c_str() : constant.input,
                  ForBands(request, constant, bands));
  }
  for (const SceneConstant& constant : SceneConstants(request)) {
    view.AddInput(constant.input, *(request.*constant.value));
  }
  if (request.quantity == "temperature") view.AddInput("Unit", WordOf(request.unit));
  view.AddInput("ScaleFactor", request.scale);
  view.AddInput("DataType", DataTypeName(request.TypeCode()));
  const String variable = String("$") + kView;
  JobWriterCommand& copy = draft.Step(step, "CopyRasterCommand");
  copy.AddInput("SrcURI", variable);
  copy.AddInput("DstURI", String("$target"));
  copy.AddInput("Invalid", String("NoData"));
  copy.AddInput("Blocks", String("Stream"));
  draft.Close("close.calibrated", variable);
}

}  // namespace lumo::host
