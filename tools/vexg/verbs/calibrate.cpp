#include <cmath>
#include <limits>
#include <optional>
#include <set>

#include <fmt/format.h>

#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "rasters/metadata_source.h"
#include "rasters/raster_verb.h"

namespace lumo::host {
namespace {

struct Options {
  std::string quantity;
  std::vector<double> gain, offset, irradiance, k1, k2;
  std::optional<double> sunElevation, distance;
  std::string metadata;         ///< FILE or FORMAT:FILE; empty: all constants are on the line
  std::set<std::string> taken;  ///< the options whose values the metadata gave
  double scale = 1.0;
  std::string type = "Single";
};

constexpr const char* kMetadataStep = "metadata";
constexpr const char* kConstantsStep = "constants";

/// One of the constants of a calibration that are not of the whole scene.
struct BandConstant {
  const char* option;
  const char* input;  ///< of the commands that calibrate; also what metadata call it
  std::vector<double> Options::*values;
};

/// The constants that a quantity needs for each band.
std::vector<BandConstant> BandConstants(const std::string& quantity) {
  std::vector<BandConstant> all{{"--gain", "Gain", &Options::gain},
                                {"--offset", "Offset", &Options::offset}};
  if (quantity == "reflectance") {
    all.push_back({"--irradiance", "SolarIrradiance", &Options::irradiance});
  } else if (quantity == "temperature") {
    all.push_back({"--k1", "K1", &Options::k1});
    all.push_back({"--k2", "K2", &Options::k2});
  }
  return all;
}

/// A constant of the whole scene.
struct SceneConstant {
  const char* option;
  const char* input;
  std::optional<double> Options::*value;
};

/// The constants that a quantity needs of the scene.
std::vector<SceneConstant> SceneConstants(const std::string& quantity) {
  if (quantity != "reflectance") return {};
  return {{"--sun-elevation", "SunElevation", &Options::sunElevation},
          {"--distance", "EarthSunDistance", &Options::distance}};
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
std::string NameOf(const Options& options, const char* option) {
  return options.taken.count(option) != 0 ? options.metadata + ": " + option : option;
}

/// Refuses constants that the quantity has no use for.
void RefuseUseless(const Options& options) {
  const bool isReflectance = options.quantity == "reflectance";
  const bool isTemperature = options.quantity == "temperature";
  const std::pair<const char*, bool> useless[] = {
      {"--irradiance", !isReflectance && !options.irradiance.empty()},
      {"--sun-elevation", !isReflectance && options.sunElevation.has_value()},
      {"--distance", !isReflectance && options.distance.has_value()},
      {"--k1", !isTemperature && !options.k1.empty()},
      {"--k2", !isTemperature && !options.k2.empty()}};
  for (const auto& [option, given] : useless) {
    if (given) Refuse(fmt::format("{}: {} has no use for it", option, options.quantity));
  }
}

/// Refuses constants that are missing.
void RefuseMissing(const Options& options) {
  const auto need = [&](const char* option, bool given) {
    if (given) return;
    Refuse(options.metadata.empty() ? fmt::format("{}: {} needs it", option, options.quantity)
                                    : fmt::format("{}: it doesn't tell {}, which {} needs",
                                                  options.metadata, option, options.quantity));
  };
  for (const BandConstant& constant : BandConstants(options.quantity)) {
    need(constant.option, !(options.*constant.values).empty());
  }
  for (const SceneConstant& constant : SceneConstants(options.quantity)) {
    need(constant.option, (options.*constant.value).has_value());
  }
}

/// Questions constants that can hardly be meant.
void QuestionOdd(const Options& options) {
  if (options.quantity != "reflectance") return;
  constexpr double kLeast = 0.9, kMost = 1.1;  // the earth keeps within 0.983 and 1.017
  if (*options.distance < kLeast || *options.distance > kMost) {
    Say(
        fmt::format("note: {}: {} astronomical units; the earth is 0.983 to 1.017 of them from the "
                    "sun",
                    NameOf(options, "--distance"), *options.distance));
  }
}

/// Refuses constants that give no image.
void RefuseImpossible(const Options& options) {
  if (options.quantity != "reflectance") return;
  const auto refuse = [&](const char* option, const char* why) {
    Refuse(NameOf(options, option) + ": " + why);
  };
  if (!(*options.sunElevation > 0 && *options.sunElevation <= 90)) {
    refuse("--sun-elevation", "the sun stands 0 to 90 degrees above the horizon, and not on it");
  }
  if (!(*options.distance > 0)) refuse("--distance", "it is above 0");
  for (const double irradiance : options.irradiance) {
    if (!(irradiance > 0)) refuse("--irradiance", "it is above 0");
  }
}

/// Adds the commands that read the constants of the metadata.
void AddConstants(JobDraft& draft, const MetadataSource& source) {
  draft.Open(kMetadataStep, "CreateMetadataCommand").AddInput("ConnStr", ConnStringsOf(source));
  draft.Step(kConstantsStep, "GetMetadataCalibrationCommand").AddInput("URI", String("$metadata"));
}

/// Takes what the line doesn't give from what the commands of AddConstants said.
/// @return a line for the user that says so.
std::string TakeConstants(Options& options, const JobResults& results) {
  const Map<String, String>& told = results.Find(kConstantsStep).returns;
  std::string line;
  for (const BandConstant& constant : BandConstants(options.quantity)) {
    std::vector<double>& values = options.*constant.values;
    if (!values.empty() || !told.HasKey(constant.input)) continue;
    const auto array = ParseValue<Array<double>>(told.Find(constant.input));
    values.assign(array.begin(), array.end());
    options.taken.insert(constant.option);
    line += fmt::format(" {} {}", constant.option, fmt::join(values, ","));
  }
  for (const SceneConstant& constant : SceneConstants(options.quantity)) {
    std::optional<double>& value = options.*constant.value;
    if (value.has_value() || !told.HasKey(constant.input)) continue;
    value = ParseValue<double>(told.Find(constant.input));
    options.taken.insert(constant.option);
    line += fmt::format(" {} {}", constant.option, *value);
  }
  std::string bands;
  if (told.HasKey("BandNames")) {
    for (const String& band : ParseValue<Array<String>>(told.Find("BandNames"))) {
      bands.append(bands.empty() ? " of the bands " : ", ").append(band.ToUTF8());
    }
  }
  return options.metadata +
         (line.empty() ? ": nothing was taken from it" : ": taken" + line + bands);
}

/// A value for each band; one value counts for all.
Array<double> ForBands(const Options& options, const BandConstant& constant, unsigned bands) {
  const std::vector<double>& values = options.*constant.values;
  if (values.size() != 1 && values.size() != bands) {
    Refuse(fmt::format("{}: there are {} values for {} bands", NameOf(options, constant.option),
                       values.size(), bands));
  }
  Array<double> all{ArrayDims(bands)};
  for (unsigned band = 0; band < bands; ++band) all[band] = values[values.size() == 1 ? 0 : band];
  return all;
}

unsigned TypeCode(const Options& options) {
  return ParseDataType(String(options.type));
}

bool IsReal(unsigned type) {
  return type == kDataTypeOf<float> || type == kDataTypeOf<double>;
}

/// Refuses a scale that the result's type would cut.
void CheckScale(const Options& options) {
  if (IsReal(TypeCode(options)) || options.quantity == "reflectance" ||
      std::trunc(options.scale) == options.scale) {
    return;
  }
  throw HostError(kExitUsage, fmt::format("--scale: {} would be cut to {}, as the result is of {}",
                                          options.scale, std::trunc(options.scale), options.type));
}

void AddConstant(OptionSet& line, const char* name, std::vector<double>& values,
                 const char* meaning) {
  line.Add(name, values, meaning).Shows("V[,V...]");
}

class CalibrateVerb final : public RasterVerb {
 public:
  explicit CalibrateVerb(OptionSet& line) {
    line.Add("quantity", options_.quantity, "radiance, reflectance or temperature")
        .Takes(OneOf({"radiance", "reflectance", "temperature"}))
        .Required();
    AddFilesTo(line, "The calibrated raster");
    line.AddNote(
        "Constants are one value for each band, or one for all. Radiance is DN * gain + offset, 0 "
        "where that is below 0; reflectance is that at the top of the atmosphere; temperature is "
        "that of a black body, in the unit of K2. The result is --scale times as large. Pixels "
        "that are not valid stay so; in a result of Single or Double they are NaN.");
    line.AddExample(
        "vexg calibrate reflectance scene.tif reflectance.tif --gain 0.76,0.8,0.62 --offset "
        "-1.5,-2.8,-1.2 --irradiance 1970,1843,1555 --sun-elevation 49.6 --distance 1.012");
    AddAreaTo(line);
    line.Add("--from-metadata", options_.metadata,
             "Takes what isn't given here from the metadata of this file, and says what it "
             "took")
        .Shows("FILE|FORMAT:FILE");
    AddConstant(line, "--gain", options_.gain, "Factor on the digital numbers");
    AddConstant(line, "--offset", options_.offset, "Added to them then");
    AddConstant(line, "--irradiance", options_.irradiance,
                "Solar irradiance outside the atmosphere, in the unit of radiance (reflectance)");
    line.Add("--sun-elevation", options_.sunElevation,
             "Of the sun above the horizon, in degrees (reflectance)")
        .Shows("DEG")
        .Takes(NumberWithUnit({"degrees", "degree", "deg", "\u00b0"}));
    line.Add("--distance", options_.distance,
             "From the earth to the sun, in astronomical units (reflectance)")
        .Shows("AU")
        .Takes(NumberWithUnit({"astronomical units", "au", "ua"}));
    AddConstant(line, "--k1", options_.k1, "First thermal constant (temperature)");
    AddConstant(line, "--k2", options_.k2, "Second thermal constant, in kelvins (temperature)");
    line.Add("--scale", options_.scale, "Factor on the result").ShowsDefault();
    line.Add("--type", options_.type, "Pixel type of the result")
        .Takes(EightTypeName())
        .ShowsDefault();
  }

 private:
  bool HasMetadata() const { return !options_.metadata.empty(); }

  void CheckOptions() override {
    RefuseUseless(options_);
    if (HasMetadata()) {
      metadata_ = ParseMetadataSource(options_.metadata);
    } else {
      CheckConstants();
    }
    RasterVerb::CheckOptions();
  }

  void CheckConstants() const {
    RefuseMissing(options_);
    RefuseImpossible(options_);
    QuestionOdd(options_);
  }

  std::vector<std::string> GetFurtherInputs() const override {
    return HasMetadata() ? std::vector{metadata_.file} : std::vector<std::string>();
  }

  void AddQuestions(JobDraft& draft) const override {
    if (HasMetadata()) AddConstants(draft, metadata_);
  }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& opened,
                        const RasterInfo& source) override {
    if (HasMetadata()) {
      const std::string taken = TakeConstants(options_, opened);
      CheckConstants();
      Say(taken);
    }
    CheckScale(options_);
    RasterInfo planned = source;
    planned.dataType = TypeCode(options_);
    bands_ = planned.bands;
    return planned;
  }

  const char* GetKeptDetails() const override { return "Names"; }

  void AddToCreate(JobDraft& /*draft*/, JobWriterCommand& create) const override {
    create.AddInput("DataType", DataTypeName(TypeCode(options_)));
  }

  void AddMaking(JobDraft& draft, const Making& making) const override {
    JobWriterCommand& calibrate = draft.Step(kMakeStep, CommandOf(options_.quantity));
    calibrate.AddInput("SourceURI", making.shown);
    calibrate.AddInput("CalibratedURI", String("$target"));
    for (const BandConstant& constant : BandConstants(options_.quantity)) {
      calibrate.AddInput(constant.input, ForBands(options_, constant, bands_));
    }
    for (const SceneConstant& constant : SceneConstants(options_.quantity)) {
      calibrate.AddInput(constant.input, *(options_.*constant.value));
    }
    calibrate.AddInput("ScaleFactor", options_.scale);
  }

  /// The value is NaN for a floating-point type, which no result can be, else the source's unless
  /// another one is chosen.
  FillValues GetNoData(const FillValues& chosen) const override {
    if (!IsReal(TypeCode(options_))) return chosen;
    return FillValues(bands_, std::numeric_limits<double>::quiet_NaN());
  }

  void AddLastQuestions(JobDraft& draft, const String& shown) const override {
    if (!IsReal(TypeCode(options_))) AddValidityQuery(draft, kShown, shown);
  }

  /// No results that are pixels with data are NaN: of floating-point types nothing need be counted.
  RasterContents ReadWanted(const JobResults& results) const override {
    RasterContents wanted = ReadContents(results, kShown);
    wanted.info.dataType = TypeCode(options_);
    std::erase_if(wanted.details, [](const std::string& detail) {
      return detail.find("/Description=") == detail.npos;
    });
    if (!IsReal(wanted.info.dataType)) {
      wanted.valid = ReadValidPixels(results, std::string(kShown) + ".validity");
    }
    return wanted;
  }

  void Compare(MadeRaster& raster, Losses& losses) const override {
    // The source's are of another quantity.
    raster.put.info.hasNoData = raster.made.info.hasNoData;
    raster.isFilled = true;
    CompareKept(raster, losses);
  }

  Options options_;
  MetadataSource metadata_;
  unsigned bands_ = 0;
};

const VerbRegistration registration(
    "calibrate", "Turns digital numbers into radiance, reflectance or temperature",
    &SetUp<CalibrateVerb>);

}  // namespace
}  // namespace lumo::host
