#include <algorithm>
#include <bit>
#include <charconv>
#include <iostream>

#include <fmt/format.h>

#include "data/format_table.h"
#include "options/option_values.h"
#include "output/json_number.h"
#include "rasters/band_notes.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo::host {
namespace {

struct PyramidOptions {
  std::string action;
  std::string output;
  std::string levels;
  std::string type;
  std::string method;
  std::string resampling;
  std::string compression;
  unsigned side = 128;
  bool json = false;

  bool IsDriver() const { return type == "DRIVER"; }
};

struct Levels {
  unsigned first = 1;
  unsigned last = 1;
};

/// "1-6" or "3"; without a text down to the level that is smaller than 512 pixels.
Levels ChooseLevels(const std::string& text, const RasterInfo& info) {
  Levels levels;
  if (text.empty()) {
    constexpr unsigned kSmallBits = 9;
    const auto bits = static_cast<unsigned>(std::bit_width(std::max(info.samples, info.lines)));
    levels.last = std::max(bits, kSmallBits + 1) - kSmallBits;
    return levels;
  }
  const char* const end = text.data() + text.size();
  auto [at, fault] = std::from_chars(text.data(), end, levels.first);
  levels.last = levels.first;
  bool isGood = fault == std::errc();
  if (isGood && at != end && *at == '-') {
    const auto [behind, lastFault] = std::from_chars(at + 1, end, levels.last);
    isGood = lastFault == std::errc();
    at = behind;
  }
  constexpr unsigned kMost = 31;
  if (isGood && at == end && levels.first <= levels.last && levels.last <= kMost) return levels;
  throw HostError(kExitUsage,
                  "--levels: \"" + text + "\" is not a range such as 1-6, of levels 0 to 31");
}

/// Asks for the size of each level.
JobDraft LevelsDraft(const String& raster, const RasterInfo& info) {
  JobDraft draft;
  for (unsigned level = info.levelMin; level <= info.levelMax; ++level) {
    // A level without a pixel can't be shown.
    if ((std::min(info.samples, info.lines) >> level) == 0) continue;
    const std::string name = "level" + std::to_string(level);
    AddLevel(draft, name, raster, level);
    draft.Step(name + ".query", "QueryRasterCommand").AddInput("URI", String("$" + name));
    draft.Close(name + ".close", String("$" + name));
  }
  return draft;
}

Json LevelsAsJson(const JobResults& results, const RasterInfo& info) {
  Json list = Json::array();
  for (unsigned level = info.levelMin; level <= info.levelMax; ++level) {
    const String step("level" + std::to_string(level) + ".query");
    unsigned samples = 0, lines = 0;
    if (results.HasKey(step)) {
      const Map<String, String>& query = results.Find(step).returns;
      samples = ParseValue<unsigned>(query.Find("Samples"));
      lines = ParseValue<unsigned>(query.Find("Lines"));
    }
    list.push_back({{"level", level}, {"samples", samples}, {"lines", lines}});
  }
  return list;
}

std::string AsText(const Json& all) {
  std::string text = fmt::format("{}\n  type    {}\n", all["file"].get<std::string>(),
                                 all["type"].get<std::string>());
  if (all.contains("pyramid")) {
    text += fmt::format("  file    {}\n", all["pyramid"].get<std::string>());
  }
  text += fmt::format("  method  {}\n", all["method"].get<std::string>());
  for (const Json& level : all["levels"]) {
    text += fmt::format("  {:>5}   {} samples, {} lines\n", level["level"].get<unsigned>(),
                        level["samples"].get<unsigned>(), level["lines"].get<unsigned>());
  }
  return text;
}

class PyramidVerb final : public FileVerb {
 public:
  explicit PyramidVerb(OptionSet& line) {
    line.AddNote(
        "A pixel of level L is the mean of the valid ones among 2^L by 2^L of the raster, or as "
        "--resampling says. ORVA is a file of its own, FILE.pyr "
        "unless --output says otherwise; quicklook, read --level, info, stats and hist find it "
        "there, with the statistics of the raster in it. DRIVER leaves it to the driver of the "
        "format, which may put levels into the file itself, or beside it.");
    line.AddExample("vexg pyramid build scene.tif --levels 1-5");
    line.Add("action", options_.action, "build, info or delete")
        .Shows("ACTION")
        .Takes(OneOf({"build", "info", "delete"}))
        .Required();
    GetSource().AddTo(line);
    line.Add("--levels", options_.levels,
             "First and last level; by default from 1 to that smaller than 512 pixels")
        .Shows("A-B")
        .Example("1-6");
    line.Add("--type", options_.type, "Who keeps the pyramid; ORVA by default")
        .Takes(OneOf({"ORVA", "DRIVER"}));
    line.Add("--output", options_.output, "The pyramid file; FILE.pyr by default").IsFile("PATH");
    line.Add(
            "--resampling", options_.resampling,
            "How pixels are reduced: average; nearest, every 2^L-th of every 2^L-th line; or mode, "
            "the most frequent of four, level by level; by default average, and nearest of codes: "
            "of bands with a palette, and of whole numbers of 32 bits")
        .Takes(OneOf({"average", "nearest", "mode"}));
    line.Add("--method", options_.method, "With DRIVER, in place of --resampling: as it names them")
        .Takes(OneOf({"Nearest", "Linear", "Cubic", "Majority"}));
    line.Add("--tile", options_.side, "Side of the squares that levels are stored in")
        .Within(1, 2048)
        .ShowsDefault();
    line.Add("--compression", options_.compression, "Of a pyramid file; LZ4 by default")
        .Takes(OneOf({"LZ4", "NONE"}));
    line.Add("--json", options_.json, "info as JSON");
  }

  int Run() override {
    if (options_.action == "build") return FileVerb::Run();
    return options_.action == "info" ? Info() : Delete();
  }

 private:
  std::string PyramidPath() const {
    return options_.output.empty() ? PyramidPathOf(FileOf(GetSource()))
                                   : AbsoluteName(options_.output);
  }

  Array<String> PyramidStrings() const {
    if (options_.IsDriver()) return ConnStringsOf(GetSource());
    const String path(PyramidPath());
    if (options_.compression.empty()) return ConnStrings({"Pyramid", path});
    return ConnStrings({"Pyramid", path, String("COMPRESSION=" + options_.compression)});
  }

  // Building.

  void CheckOptions() override {
    if (!options_.method.empty() && !options_.resampling.empty()) {
      throw HostError(kExitUsage, "--method and --resampling exclude each other");
    }
    if (options_.IsDriver() || options_.method.empty() || options_.method == "Nearest") return;
    throw HostError(kExitUsage, "--method: goes with --type DRIVER; a file takes --resampling");
  }

  std::vector<std::string> GetChangedFiles() const override {
    if (!options_.IsDriver()) return {PyramidPath()};
    const std::string file = FileOf(GetSource());
    return {file, file + ".ovr", file + ".aux.xml"};
  }

  /// Opens the raster with the pyramid that is to be built, whatever lies there now.
  void AddOpenToBuild(JobDraft& draft) const {
    JobWriterCommand& open = draft.Open("raster", "OpenRasterCommand");
    open.AddInput("CheckSource", SourceCheck::kCompared);
    open.AddInput("ConnStr", ConnStringsOf(GetSource()));
    open.AddInput("PyramidConnStr", PyramidStrings());
    if (!options_.IsDriver()) open.AddInput("PyramidNew", true);
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpenToBuild(draft);
    AddQuery(draft, "raster", "$raster");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    raster_ = opened.Find("raster").returns.Find("URI");
    const RasterInfo info = ReadInfo(opened, "raster");
    levels_ = ChooseLevels(options_.levels, info);
    reduction_ = ChooseReduction(info);
    if (!options_.IsDriver()) session.GetInterruption().AddTemporariesOf(PyramidPath());
  }

  /// The word of the input Reduction.
  const char* ChooseReduction(const RasterInfo& info) const {
    std::string word = options_.resampling;
    if (!options_.method.empty()) word = "nearest";  // or as the method says
    const Array<unsigned> bands = ParseBands("", info);
    if (word.empty()) word = HoldsCodes(info, bands) ? "nearest" : "average";
    return word == "average" ? "Average" : word == "mode" ? "Mode" : "Told";
  }

  /// @param raster  a variable or URI.
  void AddBuild(JobDraft& draft, const String& raster) const {
    JobWriterCommand& build = draft.Step(kBuildStep, "BuildRasterPyramidCommand");
    build.AddInput("URI", raster);
    build.AddInput("PyramidType", String(options_.IsDriver() ? "DRIVER" : "ORVA"));
    build.AddInput("PyramidResamplingMethod",
                   String(options_.method.empty() ? "Nearest" : options_.method));
    build.AddInput("Reduction", String(reduction_));
    build.AddInput("PyramidLevelMin", levels_.first);
    build.AddInput("PyramidLevelMax", levels_.last);
    build.AddInput("PyramidCanBuild", true);
    build.AddInput("TileDimensions", TileDimensions{options_.side, options_.side});
    build.AddInput("Bins", Form::kExact);
  }

  JobDraft GetJob(const Outputs& /*outputs*/) const override {
    JobDraft draft;
    AddOpenToBuild(draft);
    AddBuild(draft, "$raster");
    draft.Close("close", "$raster");
    return draft;
  }

  /// The library makes the pyramid under a name of its own, and puts it in its place.
  void Make(JobSession& session, const Outputs& /*outputs*/) override {
    JobDraft draft;
    AddBuild(draft, raster_);
    const ProgressView view(ProgressOfStep(session, draft, kBuildStep), GetProgressStyle());
    session.Run(draft, Interrupts::kEndUnlessDone);
    session.GetInterruption().SetDone();
  }

  // Looking.

  /// Opens the raster with the pyramid that the options name, or that lies beside it.
  void AddOpenToLook(JobDraft& draft) const {
    if (options_.output.empty() && !options_.IsDriver()) {
      AddOpenWithPyramid(draft, "raster", GetSource(), "Told");
      return;
    }
    JobWriterCommand& open = draft.Open("raster", "OpenRasterCommand");
    open.AddInput("CheckSource", SourceCheck::kCompared);
    open.AddInput("ConnStr", ConnStringsOf(GetSource()));
    if (!options_.IsDriver()) open.AddInput("PyramidConnStr", PyramidStrings());
  }

  int Info() const {
    JobSession session(GetJobOptions());
    JobDraft opening;
    AddOpenToLook(opening);
    AddQuery(opening, "raster", "$raster");
    AddNotesQuery(opening, "$raster");
    if (GetJobOptions().printJob) {
      opening.Close("close", "$raster");
      std::cout << opening.Write().ToUTF8() << '\n';
      return kExitSuccess;
    }
    const JobResults opened = session.Run(opening);
    const RasterInfo info = ReadInfo(opened, "raster");
    if (!info.hasPyramid) {
      throw HostError(kExitFailed, GetSource().file + ": there is no pyramid");
    }
    const String raster = opened.Find("raster").returns.Find("URI");
    Json all{{"file", GetSource().file},
             {"type", info.pyramidType.ToUTF8()},
             {"method", ReadNotes(opened, info.bands).pyramidMethod}};
    if (info.pyramidType == "ORVA") all["pyramid"] = PyramidPath();
    const JobDraft asking = LevelsDraft(raster, info);
    all["levels"] =
        LevelsAsJson(asking.GetSteps().empty() ? JobResults() : session.Run(asking), info);
    std::cout << (options_.json ? all.dump(2) + "\n" : AsText(all));
    return kExitSuccess;
  }

  // Deleting.

  /// Opens what is to be deleted: a pyramid file for itself, since its raster need not be there.
  int Delete() const {
    const bool isFile = options_.type == "ORVA" || !options_.output.empty() ||
                        std::filesystem::exists(PyramidPath());
    JobDraft draft;
    JobWriterCommand& open = draft.Open("raster", "OpenRasterCommand");
    open.AddInput("CheckSource", SourceCheck::kCompared);
    if (isFile && !options_.IsDriver()) {
      open.AddInput("ConnStr", ConnStrings({"Pyramid", String(PyramidPath())}));
    } else {
      open.AddInput("ConnStr", ConnStringsOf(GetSource()));
      open.AddInput("PyramidConnStr", ConnStringsOf(GetSource()));
    }
    draft.Step("delete", "DeleteRasterPyramidCommand").AddInput("URI", String("$raster"));
    draft.Close("close", "$raster");
    if (GetJobOptions().printJob) {
      std::cout << draft.Write().ToUTF8() << '\n';
      return kExitSuccess;
    }
    JobSession session(GetJobOptions());
    for (const std::string& file : GetChangedFiles()) {
      session.GetInterruption().Watch(file, file);
    }
    const JobResults results = session.Run(draft, Interrupts::kEndUnlessDone);
    CheckReturn(results, "delete", GetSource().file + ": there is no pyramid to delete");
    return kExitSuccess;
  }

  static constexpr const char* kBuildStep = "build";

  PyramidOptions options_;
  String raster_;  // URI
  Levels levels_;
  const char* reduction_ = "Told";
};

const VerbRegistration pyramidRegistration(
    "pyramid", "Builds, tells of or deletes the reduced copies of a raster", &SetUp<PyramidVerb>);

}  // namespace
}  // namespace lumo::host
