#include <charconv>
#include <cmath>
#include <iostream>
#include <limits>
#include <memory>
#include <optional>
#include <set>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "keeping.h"
#include "metadata_source.h"
#include "option_values.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  std::string quantity;
  SourceOptions source;
  TargetOptions target;
  RasterJobOptions job;
  std::vector<double> gain, offset, irradiance, k1, k2;
  std::optional<double> sunElevation, distance;
  std::string metadata;         ///< FILE or FORMAT:FILE; empty: all constants are on the line
  std::set<std::string> taken;  ///< the options whose values the metadata gave
  double scale = 1.0;
  std::string type = "Single";
};

constexpr const char* kCalibrateStep = "calibrate";
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
/// @return a line that tells the user of it.
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
  const unsigned code = ParseDataType(String(options.type));
  const bool known = DispatchType(EightTypes{}, code, []<typename T>() { return true; });
  if (known) return code;
  throw HostError(kExitUsage, "--type: \"" + options.type +
                                  "\" is none of Byte, Char, Int16, UInt16, Int32, UInt32, "
                                  "Single, Double");
}

bool IsReal(unsigned type) {
  return type == kDataTypeOf<float> || type == kDataTypeOf<double>;
}

/// The whole of the work as one document.
/// @param file    to make.
/// @param noData  of bands, in the place of pixels that are not valid.
JobDraft MakeDraft(const Options& options, const TargetPlace& place, const RasterInfo& info,
                   const FillValues& noData) {
  JobDraft draft;
  AddOpen(draft, "source", options.source);
  AddQuery(draft, "source", "$source");
  AddDetailsQuery(draft, "source", "$source");
  const unsigned type = TypeCode(options);
  JobWriterCommand& create = AddCreate(draft, place, "$source", "Names", noData);
  create.AddInput("DataType", DataTypeName(type));
  JobWriterCommand& calibrate = draft.Step(kCalibrateStep, CommandOf(options.quantity));
  calibrate.AddInput("SourceURI", String("$source"));
  calibrate.AddInput("CalibratedURI", String("$target"));
  for (const BandConstant& constant : BandConstants(options.quantity)) {
    calibrate.AddInput(constant.input, ForBands(options, constant, info.bands));
  }
  for (const SceneConstant& constant : SceneConstants(options.quantity)) {
    calibrate.AddInput(constant.input, *(options.*constant.value));
  }
  calibrate.AddInput("ScaleFactor", options.scale);
  AddCloseTarget(draft);
  if (!IsReal(type)) AddValidityQuery(draft, "source", "$source");
  draft.Close("close.source", "$source");
  return draft;
}

/// The no-data value of a result: of a floating-point type NaN, which no result can be; of others
/// that of the source, unless another one is chosen.
FillValues NoDataOf(const Options& options, unsigned bands, const FillValues& chosen) {
  if (IsReal(TypeCode(options))) return FillValues(bands, std::numeric_limits<double>::quiet_NaN());
  return chosen;
}

/// The contents that the result shall have. No results that are pixels with data are NaN: of
/// floating-point types nothing need be counted.
RasterContents Wanted(const Options& options, const JobResults& results) {
  RasterContents put = ReadContents(results, "source");
  put.info.dataType = TypeCode(options);
  std::erase_if(put.details, [](const std::string& detail) {
    return detail.find("/Description=") == detail.npos;
  });
  if (!IsReal(put.info.dataType)) put.valid = ReadValidPixels(results, "source.validity");
  return put;
}

/// Makes the result in the output's folder. Throws what went wrong.
void MakeResult(JobSession& session, const Options& options, const TargetPlace& place,
                const OutputFile& output, const RasterInfo& info) {
  Losses losses(output.GetShownName(), place.format, options.target.strict);
  MadeRaster raster = MakeKept(session, place, losses, true, [&](const FillValues& noData) {
    const JobDraft draft = MakeDraft(options, place, info, NoDataOf(options, info.bands, noData));
    JobResults results;
    {
      const ProgressView view(ProgressOfStep(session, draft, kCalibrateStep),
                              options.job.GetProgressStyle());
      results = session.Run(draft);
    }
    CheckClosed(results);
    return Wanted(options, results);
  });
  raster.put.info.hasNoData = raster.made.info.hasNoData;  // the source's are of another quantity
  raster.isFilled = true;
  CompareKept(raster, losses);
  session.CheckInterrupt();
  losses.Settle();
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

int Calibrate(Options& options) {
  RefuseUseless(options);
  TypeCode(options);
  const bool hasMetadata = !options.metadata.empty();
  std::vector<std::string> inputs{options.source.file};
  JobDraft opening;
  AddOpen(opening, "source", options.source);
  AddQuery(opening, "source", "$source");
  if (hasMetadata) {
    const MetadataSource metadata = ParseMetadataSource(options.metadata);
    inputs.push_back(metadata.file);
    AddConstants(opening, metadata);
  } else {
    RefuseMissing(options);
    RefuseImpossible(options);
    QuestionOdd(options);
  }
  const std::string format = ChooseFormat(options.target);
  OutputFile output(options.target.output, options.target.overwrite, inputs);
  JobSession session(options.job);
  const JobResults opened = session.Run(opening);
  if (hasMetadata) {
    const std::string taken = TakeConstants(options, opened);
    RefuseMissing(options);
    RefuseImpossible(options);
    QuestionOdd(options);
    Say(taken);
  }
  output.RefuseInput(PathOf(opened.Find("source").returns.Find("URI")));
  const RasterInfo info = ReadInfo(opened, "source");
  CheckScale(options);
  if (options.job.printJob) {
    std::cout << MakeDraft(options, {output.GetName(), format}, info,
                           NoDataOf(options, info.bands, {}))
                     .Write()
                     .ToUTF8()
              << '\n';
    return kExitSuccess;
  }
  output.Begin(BytesInFile(format, TypeCode(options), info.samples, info.lines, info.bands));
  try {
    MakeResult(session, options, {output.GetWorkName(), format}, output, info);
  } catch (const HostError& error) {
    throw HostError(error.code, output.InUsersWords(error.what()));
  }
  output.Commit();
  return kExitSuccess;
}

void AddConstant(CLI::App& app, const char* name, std::vector<double>& values,
                 const char* meaning) {
  app.add_option(name, values, meaning)
      ->type_name("V[,V…]")
      ->delimiter(',')
      ->allow_extra_args(false);
}

const VerbRegistration registration(
    "calibrate", "Turns digital numbers into radiance, reflectance or temperature",
    [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "Constants are one value for each band, or one for all. Radiance is DN * gain + offset, "
          "0 where that is below 0; reflectance is that at the top of the atmosphere; temperature "
          "is that of a black body, in the unit of K2. The result is --scale times as large. "
          "Pixels that are not valid stay so; in a result of Single or Double they are NaN.\n"
          "Example: vexg calibrate reflectance scene.tif reflectance.tif --gain 0.76,0.8,0.62 "
          "--offset -1.5,-2.8,-1.2 --irradiance 1970,1843,1555 --sun-elevation 49.6 --distance "
          "1.012\n");
      app.add_option("quantity", options->quantity, "radiance, reflectance or temperature")
          ->transform(OneOf({"radiance", "reflectance", "temperature"}))
          ->required();
      options->source.AddTo(app);
      options->target.AddTo(app, "The calibrated raster");
      app.add_option("--from-metadata", options->metadata,
                     "Takes what isn't given here from the metadata of this file, and says what it "
                     "took")
          ->type_name("FILE|FORMAT:FILE");
      AddConstant(app, "--gain", options->gain, "Factor on the digital numbers");
      AddConstant(app, "--offset", options->offset, "Added to them then");
      AddConstant(app, "--irradiance", options->irradiance,
                  "Solar irradiance outside the atmosphere, in the unit of radiance (reflectance)");
      app.add_option("--sun-elevation", options->sunElevation,
                     "Of the sun above the horizon, in degrees (reflectance)")
          ->type_name("DEG")
          ->transform(NumberWithUnit({"degrees", "degree", "deg", "\u00b0"}));
      app.add_option("--distance", options->distance,
                     "From the earth to the sun, in astronomical units (reflectance)")
          ->type_name("AU")
          ->transform(NumberWithUnit({"astronomical units", "au", "ua"}));
      AddConstant(app, "--k1", options->k1, "First thermal constant (temperature)");
      AddConstant(app, "--k2", options->k2, "Second thermal constant, in kelvins (temperature)");
      app.add_option("--scale", options->scale, "Factor on the result")->capture_default_str();
      app.add_option("--type", options->type, "Pixel type of the result")
          ->transform(PixelTypeName())
          ->capture_default_str();
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Calibrate(*options); });
    });

}  // namespace
}  // namespace lumo::host
