#include "rasters/raster_target.h"

#include <algorithm>

#include <fmt/format.h>

#include "data/format_table.h"
#include "foundation/text_case.h"
#include "options/option_values.h"
#include "raster/creation_options.h"
#include "raster/pixel_types.h"
#include "raster/raster_def.h"
#include "verb.h"

namespace lumo::host {
namespace {

bool takesVrtNames = false;

/// The format that the ending of a name stands for; empty for none.
std::string FormatOfName(const std::string& name) {
  static const std::pair<const char*, const char*> kEndings[] = {
      {".tif", "TIFF"},  {".tiff", "TIFF"}, {".png", "PNG"},      {".jpg", "JPEG"},
      {".jpeg", "JPEG"}, {".bmp", "BMP"},   {".gif", "GIF"},      {".img", "Erdas"},
      {".ntf", "NITF"},  {".nitf", "NITF"}, {".jp2", "JPEG2000"}, {".dat", "ORVA"},
      {".bin", "ORVA"},  {".orva", "ORVA"}};
  const std::string ending = LowerCase(std::filesystem::path(name).extension().string());
  for (const auto& [known, format] : kEndings) {
    if (ending == known) return format;
  }
  return takesVrtNames && ending == ".vrt" ? "TIFF" : "";
}

/// Formats whose files hold every pixel as it is. Not TIFF: blocks of zeros take no room there.
bool HoldsAllPixels(const std::string& format) {
  static const char* const kFormats[] = {"ORVA", "BMP", "NITF"};
  return std::find(std::begin(kFormats), std::end(kFormats), format) != std::end(kFormats);
}

/// The words that a user types for a value of the creation options: all but the told one.
std::vector<std::string> WordsOfOption(const CreationValue& value) {
  std::vector<std::string> words;
  for (const char* const word : value.words()) {
    if (std::string(word) != "Told") words.push_back(LowerCase(word));
  }
  return words;
}

/// True for an option of a verb that is there or not.
bool IsFlag(const CreationValue& value) {
  return value.kind == ValueKind::kBoolean || std::string(value.input) == "Layout";
}

/// Says how a verb goes on without an option.
std::string DefaultTextOf(const CreationValue& value) {
  static const std::map<std::string, std::string> kTexts = {
      {"Compress", "zstd"}, {"Predictor", "auto"}, {"Tile", "512"}, {"BigTIFF", "auto"}};
  const auto found = kTexts.find(value.input);
  if (found != kTexts.end()) return fmt::format("; {} by default", found->second);
  const bool isOverviews = std::string(value.input) == "Overviews";
  return isOverviews ? "; average by default, nearest for classes and labels" : "";
}

/// The help of an option: the meaning of the input without the words that verbs don't take.
std::string HelpOf(const CreationValue& value) {
  std::string_view meaning = value.meaning;
  for (const std::string_view inInputs : {"; Auto: ", "; Told: "}) {
    meaning = meaning.substr(0, meaning.find(inInputs));
  }
  const int first = std::toupper(static_cast<unsigned char>(meaning.front()));
  return fmt::format("{}{}{}", static_cast<char>(first), meaning.substr(1), DefaultTextOf(value));
}

/// The word of an input that a user means.
std::string WordOfInput(const CreationValue& value, const std::string& text) {
  if (value.words == nullptr) return text;
  for (const char* const word : value.words()) {
    if (LowerCase(word) == LowerCase(text)) return word;
  }
  return text;
}

/// The options of a file that the user says nothing of.
CreationTexts DefaultsOf(const TargetOptions& target, const RasterInfo& raster) {
  constexpr std::uint64_t kMostTileBytes = 16 << 20;
  constexpr unsigned kUsualTile = 512, kLeastTile = 64;
  const bool isByPixel =
      raster.interleave == Interleave::BIP || raster.interleave == Interleave::BIL;
  const std::uint64_t pixel =
      std::uint64_t{DataTypeBytes(raster.dataType)} * (isByPixel ? raster.bands : 1);
  unsigned side = kUsualTile;
  while (side > kLeastTile && side * side * pixel > kMostTileBytes) side /= 2;
  return {{"Compress", target.compatible ? "DEFLATE" : "ZSTD"},
          {"Predictor", "Auto"},
          {"Tile", std::to_string(side)},
          {"BigTIFF", "Auto"}};
}

bool IsCog(const TargetOptions& target) {
  return target.cog || LowerCase(target.format) == "cog";
}

CreationOptions ReadOptions(const CreationTexts& texts) {
  CreationOptions options;
  std::string fault;
  const auto textOf = [&](const char* input) {
    const auto found = texts.find(input);
    return found != texts.end() ? found->second : std::string();
  };
  if (ReadCreationOptions(textOf, options, fault)) return options;
  throw HostError(kExitUsage, fault);
}

}  // namespace

void TargetOptions::AddTo(OptionSet& line, const std::string& meaning) {
  Option option = line.Add("output", output, meaning).IsFile("OUT");
  if (isRequired) option.Required();
  AddFormatTo(line);
}

void TargetOptions::AddFormatTo(OptionSet& line) {
  line.Add("--format", format,
           "Key of its format, see vexg formats; by default from its name's ending")
      .Shows("KEY");
  line.Add("--strict", strict,
           "Fail, and make nothing, where the format does not keep all that is put in");
  line.Add(
      "--cog", cog,
      "Make a cloud-optimised GeoTIFF, with its reduced levels inside; --format COG is the same");
  line.Add("--compatible", compatible,
           "Pack a TIFF file so that all programs can read it: by DEFLATE, not ZSTD");
  line.Add("--world-file", worldFile,
           "Also make a world file with the grid beside it: .tfw, .pgw ...");
  creation.resize(CreationValues().size());
  for (std::size_t i = 0; i < creation.size(); ++i) {
    const CreationValue& value = CreationValues()[i];
    if (IsFlag(value)) continue;
    Option option = line.Add(value.option, creation[i], HelpOf(value));
    if (value.words != nullptr) option.Takes(OneOf(WordsOfOption(value)));
    if (value.words == nullptr) option.Shows(value.shown);
  }
}

void TakeVrtNames() {
  takesVrtNames = true;
}

std::string ChooseFormat(const TargetOptions& target) {
  if (target.format.empty()) {
    const std::string format = FormatOfName(target.output);
    if (!format.empty()) return format;
    throw HostError(kExitUsage, target.output +
                                    ": the name's ending tells no format; give --format, one "
                                    "of vexg formats");
  }
  if (IsCog(target) && LowerCase(target.format) == "cog") return "TIFF";
  return FormatKey("--format", target.format);
}

void CheckCreation(const TargetOptions& target, const std::string& format) {
  if (format == "ORVA" && target.worldFile) {
    throw HostError(kExitUsage, "--world-file: the format ORVA takes no world file");
  }
  if (format == "TIFF") return;
  if (IsCog(target)) {
    throw HostError(
        kExitUsage,
        fmt::format("--cog: a cloud-optimised file is a TIFF file, and the format is {}", format));
  }
  for (std::size_t i = 0; i < target.creation.size(); ++i) {
    if (target.creation[i].empty()) continue;
    throw HostError(kExitUsage, fmt::format("{}: is of TIFF files, and the format is {}",
                                            CreationValues()[i].option, format));
  }
  if (target.compatible) {
    throw HostError(kExitUsage,
                    fmt::format("--compatible: is of TIFF files, and the format is {}", format));
  }
}

CreationTexts ChooseCreation(const TargetOptions& target, const std::string& format,
                             const RasterInfo& raster, const std::string& overviews) {
  CheckCreation(target, format);
  CreationTexts texts;
  if (format == "TIFF") texts = DefaultsOf(target, raster);
  if (target.worldFile) texts.emplace("WorldFile", "1");
  if (format != "TIFF") return texts;
  const bool isCog = IsCog(target);
  if (isCog) {
    texts.emplace("Layout", "COG");
    texts.emplace("Overviews", overviews);
  }
  for (std::size_t i = 0; i < target.creation.size(); ++i) {
    const CreationValue& value = CreationValues()[i];
    if (!target.creation[i].empty()) texts[value.input] = WordOfInput(value, target.creation[i]);
  }
  RasterDef def;
  def.format = String(format);
  def.bands = raster.bands;
  def.dataType = raster.dataType;
  def.interleave = raster.interleave;
  def.creation = ReadOptions(texts);
  const std::string misfit = FindCreationMisfit(def);
  if (!misfit.empty()) throw HostError(kExitUsage, fmt::format("{}: {}", target.output, misfit));
  return texts;
}

bool TargetPlace::LosesValues() const {
  return format == "JPEG" || ReadOptions(creation).LosesValues();
}

std::uint64_t BytesInFile(const std::string& format, const RasterInfo& raster) {
  const std::uint64_t pixels = std::uint64_t{raster.samples} * raster.lines;
  return HoldsAllPixels(format) ? pixels * raster.bands * DataTypeBytes(raster.dataType) : 0;
}

JobWriterCommand& AddCreate(JobDraft& draft, const TargetPlace& place, const String& like,
                            const char* details, const std::vector<double>& noData) {
  JobWriterCommand& create = draft.Open("target", "CreateRasterCommand");
  create.AddInput("ConnStr", ConnStrings({String(AbsoluteName(place.file))}));
  create.AddVariableInput("SrcURI", like);
  create.AddInput("Format", String(place.format));
  create.AddInput("Details", String(details));
  for (const auto& [input, text] : place.creation) create.AddInput(input.c_str(), String(text));
  if (!noData.empty()) {
    Array<double> values{ArrayDims(static_cast<unsigned>(noData.size()))};
    std::copy(noData.begin(), noData.end(), values.begin());
    create.AddInput("NoDataValue", values);
  }
  return create;
}

void AddCloseTarget(JobDraft& draft) {
  draft.Close(kCloseTargetStep, "$target");
}

void CheckClosed(const JobResults& results, const char* step) {
  const String fault = results.Find(String(step)).returns.Find("Fault");
  if (fault.GetLength() != 0) throw HostError(kExitFailed, fault.ToUTF8());
}

void CheckSame(const RasterInfo& made, const RasterInfo& wanted, const std::string& format,
               const std::string& shown) {
  if (made.samples != wanted.samples || made.lines != wanted.lines || made.bands != wanted.bands ||
      made.dataType != wanted.dataType) {
    throw HostError(kExitFailed, shown + ": the format " + format +
                                     " did not keep the raster's size, bands or pixel type");
  }
}

ProgressReportPtr ProgressOfSteps(const JobSession& session, const JobDraft& draft,
                                  const std::string& first, const std::string& last) {
  const auto& steps = draft.GetSteps();
  const auto find = [&](const std::string& name) {
    std::size_t step = 0;
    while (steps[step].name != String(name)) ++step;
    return step;
  };
  return ProgressReportPtr(
      new StepProgress(session.GetProgress(), find(first), find(last), steps.size()));
}

ProgressReportPtr ProgressOfStep(const JobSession& session, const JobDraft& draft,
                                 const std::string& name) {
  return ProgressOfSteps(session, draft, name, name);
}

}  // namespace lumo::host
