#include <algorithm>
#include <bit>
#include <charconv>
#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "data/format_table.h"
#include "json_number.h"
#include "option_values.h"
#include "raster_target.h"
#include "verb.h"
#include "views/catalog_raster_ref.h"

namespace lumo::host {
namespace {

struct Options {
  std::string action;
  SourceOptions source;
  RasterJobOptions job;
  std::string output;
  std::string levels;
  std::string type;
  std::string method = "Nearest";
  std::string compression;
  unsigned side = 128;
  bool json = false;

  bool IsDriver() const { return type == "DRIVER"; }
  std::string PyramidPath() const {
    return output.empty() ? PyramidPathOf(FileOf(source)) : AbsoluteName(output);
  }
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

Array<String> PyramidStrings(const Options& options) {
  if (options.IsDriver()) return ConnStringsOf(options.source);
  const String path(options.PyramidPath());
  if (options.compression.empty()) return ConnStrings({"Pyramid", path});
  return ConnStrings({"Pyramid", path, String("COMPRESSION=" + options.compression)});
}

/// Opens the raster with the pyramid that is to be built, whatever lies there now.
JobDraft OpenToBuild(const Options& options) {
  JobDraft draft;
  JobWriterCommand& open = draft.Open("raster", "OpenRasterCommand");
  open.AddInput("CheckSource", SourceCheck::kCompared);
  open.AddInput("ConnStr", ConnStringsOf(options.source));
  open.AddInput("PyramidConnStr", PyramidStrings(options));
  if (!options.IsDriver()) open.AddInput("PyramidNew", true);
  return draft;
}

void AddBuild(JobDraft& draft, const Options& options, const String& raster, const Levels& levels) {
  JobWriterCommand& build = draft.Step("build", "BuildRasterPyramidCommand");
  build.AddInput("URI", raster);
  build.AddInput("PyramidType", String(options.IsDriver() ? "DRIVER" : "ORVA"));
  build.AddInput("PyramidResamplingMethod", String(options.method));
  build.AddInput("PyramidLevelMin", levels.first);
  build.AddInput("PyramidLevelMax", levels.last);
  build.AddInput("PyramidCanBuild", true);
  build.AddInput("TileDimensions", TileDimensions{options.side, options.side});
  build.AddInput("Bins", Form::kExact);
}

int Build(const Options& options) {
  if (!options.IsDriver() && options.method != "Nearest") {
    throw HostError(kExitUsage, "--method: a pyramid file takes every 2^level-th pixel: Nearest");
  }
  JobSession session(options.job);
  JobDraft opening = OpenToBuild(options);
  AddQuery(opening, "raster", "$raster");
  const JobResults opened = session.Run(opening);
  const Levels levels = ChooseLevels(options.levels, ReadInfo(opened, "raster"));
  if (options.job.printJob) {
    JobDraft whole = OpenToBuild(options);
    AddBuild(whole, options, "$raster", levels);
    whole.Close("close", "$raster");
    std::cout << whole.Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  JobDraft building;
  AddBuild(building, options, opened.Find("raster").returns.Find("URI"), levels);
  const ProgressView view(ProgressOfStep(session, building, "build"),
                          options.job.GetProgressStyle());
  session.Run(building);
  return kExitSuccess;
}

/// Opens the raster with the pyramid that the options name, or that lies beside it.
void AddOpenToLook(JobDraft& draft, const Options& options) {
  if (options.output.empty() && !options.IsDriver()) {
    AddOpenWithPyramid(draft, "raster", options.source, "Told");
    return;
  }
  JobWriterCommand& open = draft.Open("raster", "OpenRasterCommand");
  open.AddInput("CheckSource", SourceCheck::kCompared);
  open.AddInput("ConnStr", ConnStringsOf(options.source));
  if (!options.IsDriver()) open.AddInput("PyramidConnStr", PyramidStrings(options));
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

int Info(const Options& options) {
  JobSession session(options.job);
  JobDraft opening;
  AddOpenToLook(opening, options);
  AddQuery(opening, "raster", "$raster");
  if (options.job.printJob) {
    opening.Close("close", "$raster");
    std::cout << opening.Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  const JobResults opened = session.Run(opening);
  const RasterInfo info = ReadInfo(opened, "raster");
  if (!info.hasPyramid) {
    throw HostError(kExitFailed, options.source.file + ": there is no pyramid");
  }
  const String raster = opened.Find("raster").returns.Find("URI");
  const Map<String, String>& query = opened.Find("raster.query").returns;
  Json all{{"file", options.source.file},
           {"type", info.pyramidType.ToUTF8()},
           {"method", query.Find("PyramidResamplingMethod").ToUTF8()}};
  if (info.pyramidType == "ORVA") all["pyramid"] = options.PyramidPath();
  const JobDraft asking = LevelsDraft(raster, info);
  all["levels"] =
      LevelsAsJson(asking.GetSteps().empty() ? JobResults() : session.Run(asking), info);
  std::cout << (options.json ? all.dump(2) + "\n" : AsText(all));
  return kExitSuccess;
}

/// Opens what is to be deleted: a pyramid file for itself, since its raster need not be there.
int Delete(const Options& options) {
  const bool isFile = options.type == "ORVA" || !options.output.empty() ||
                      std::filesystem::exists(options.PyramidPath());
  JobDraft draft;
  JobWriterCommand& open = draft.Open("raster", "OpenRasterCommand");
  open.AddInput("CheckSource", SourceCheck::kCompared);
  if (isFile && !options.IsDriver()) {
    open.AddInput("ConnStr", ConnStrings({"Pyramid", String(options.PyramidPath())}));
  } else {
    open.AddInput("ConnStr", ConnStringsOf(options.source));
    open.AddInput("PyramidConnStr", ConnStringsOf(options.source));
  }
  draft.Step("delete", "DeleteRasterPyramidCommand").AddInput("URI", String("$raster"));
  draft.Close("close", "$raster");
  if (options.job.printJob) {
    std::cout << draft.Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  JobSession session(options.job);
  CheckReturn(session.Run(draft), "delete",
              options.source.file + ": there is no pyramid to delete");
  return kExitSuccess;
}

int Run(const Options& options) {
  if (options.action == "build") return Build(options);
  return options.action == "info" ? Info(options) : Delete(options);
}

const VerbRegistration registration(
    "pyramid", "Builds, tells of or deletes the reduced copies of a raster", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "Level L has every 2^L-th pixel of every 2^L-th line. ORVA is a file of its own, "
          "FILE.pyr unless --output says otherwise; quicklook, read --level, info, stats and hist "
          "find it there, with the statistics of the raster in it. DRIVER leaves it to the driver "
          "of the format, which may put levels into the file itself, or beside it.\n"
          "Example: vexg pyramid build scene.tif --levels 1-5\n");
      app.add_option("action", options->action, "build, info or delete")
          ->type_name("ACTION")
          ->transform(OneOf({"build", "info", "delete"}))
          ->required();
      options->source.AddTo(app);
      app.add_option("--levels", options->levels,
                     "First and last level; by default from 1 to that smaller than 512 pixels")
          ->type_name("A-B");
      app.add_option("--type", options->type, "Who keeps the pyramid; ORVA by default")
          ->transform(OneOf({"ORVA", "DRIVER"}));
      app.add_option("--output", options->output, "The pyramid file; FILE.pyr by default")
          ->type_name("PATH");
      app.add_option("--method", options->method, "How a driver reduces pixels")
          ->transform(OneOf({"Nearest", "Linear", "Cubic", "Majority"}))
          ->capture_default_str();
      app.add_option("--tile", options->side, "Side of the squares that levels are stored in")
          ->check(CLI::Range(1U, 2048U))
          ->capture_default_str();
      app.add_option("--compression", options->compression, "Of a pyramid file; LZ4 by default")
          ->transform(OneOf({"LZ4", "NONE"}));
      app.add_flag("--json", options->json, "info as JSON");
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Run(*options); });
    });

}  // namespace
}  // namespace lumo::host
