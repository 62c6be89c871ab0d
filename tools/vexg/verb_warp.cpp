#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <map>
#include <memory>
#include <optional>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "georef/covering_grid.h"
#include "keeping.h"
#include "option_values.h"
#include "raster/pixel_value.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  SourceOptions source;
  TargetOptions target;
  RasterJobOptions job;
  std::string to;
  std::string pixelSize;  ///< with or without a unit
  std::string method = "polynomial";
  std::string resampling = "nearest";
  std::string bands;
  std::optional<double> noData;
};

/// What is made.
struct Plan {
  std::string format;
  Array<unsigned> bands;
  GeoRefPtr grid;
};

constexpr const char* kWarpStep = "warp";

/// A word of the command line as the commands have it.
std::string Capital(std::string word) {
  if (!word.empty() && word[0] >= 'a' && word[0] <= 'z') word[0] += 'A' - 'a';
  return word;
}

/// The warping as a whole: opens the source, stands views on it, makes the file and closes all.
/// @param noData  of bands, in the place of pixels that are not valid.
JobDraft MakeDraft(const Options& options, const Plan& plan, const std::string& target,
                   const FillValues& noData) {
  JobDraft draft;
  AddOpen(draft, "source", options.source);
  std::vector<String> opened{"$source"};
  if (!options.bands.empty()) {
    AddBandView(draft, "bands", opened.back(), plan.bands);
    opened.emplace_back("$bands");
  }
  JobWriterCommand& view = draft.Open("warped", "CreateProjectedRasterCommand");
  view.AddVariableInput("SrcURI", opened.back());
  view.AddInput("GeoRef", plan.grid);
  view.AddInput("ReprojectionMethod", String(Capital(options.method)));
  view.AddInput("ResamplingMethod", String(Capital(options.resampling)));
  view.AddInput("Grid", String("Exact"));
  view.AddInput("Sampling", String("Centred"));
  if (options.noData) view.AddInput("NoData", *options.noData);
  opened.emplace_back("$warped");
  AddQuery(draft, "shown", opened.back());
  AddDetailsQuery(draft, "shown", opened.back());
  AddCreate(draft, {target, plan.format}, opened.back(), "Bands", noData);
  JobWriterCommand& copy = draft.Step(kWarpStep, "CopyRasterCommand");
  copy.AddVariableInput("SrcURI", opened.back());
  copy.AddVariableInput("DstURI", "$target");
  copy.AddInput("Invalid", String(noData.empty() && !options.noData ? "Told" : "NoData"));
  AddCloseTarget(draft);
  for (auto raster = opened.rbegin(); raster != opened.rend(); ++raster) {
    draft.Close("close." + raster->ToUTF8().substr(1), *raster);
  }
  return draft;
}

bool IsFile(const std::string& name) {
  std::error_code ignored;
  return std::filesystem::is_regular_file(name, ignored);
}

/// The grid of another raster file. Throws HostError when it has none.
GeoRefPtr GridOfFile(JobSession& session, const std::string& file) {
  JobDraft draft;
  AddOpen(draft, "like", {file, ""});
  AddQuery(draft, "like", "$like");
  draft.Close("close.like", "$like");
  const RasterInfo like = ReadInfo(session.Run(draft), "like");
  if (like.geoRef.IsNull() || like.geoRef->GetType() != GeoRef::kStd) {
    throw HostError(kExitFailed, file + ": the raster has no plain grid to be taken over");
  }
  return like.geoRef;
}

/// The complaint of an option's check; no text for a size.
std::string CheckPixelSize(const std::string& text) {
  Quantity size;
  const bool isSize = ReadQuantity(text, size) && std::isfinite(size.value) && size.value > 0;
  return isSize ? "" : fmt::format("\"{}\" is no size above 0", text);
}

/// The unit that a person writes behind a number; null for none that is known.
const MapUnit* FindUnit(const std::string& typed) {
  static const std::map<std::string, std::int32_t> kShort{
      {"m", 9001},      {"metre", 9001},   {"metres", 9001}, {"meter", 9001}, {"meters", 9001},
      {"km", 9036},     {"ft", 9002},      {"feet", 9002},   {"foot", 9002},  {"deg", 9102},
      {"degree", 9102}, {"degrees", 9102}, {"\u00b0", 9102}};
  const auto at = kShort.find(typed);
  return at != kShort.end() ? FindMapUnit(at->second) : nullptr;
}

/// The side of a pixel in units of the system; 0 for no text. Throws HostError for one that can't
/// be, and questions one that can hardly be meant.
double ReadPixelSize(const std::string& text, const CoordSys& system) {
  Quantity size;
  if (text.empty() || !ReadQuantity(text, size)) return 0;
  const CoordSysInfo& info = *system.Info();
  if (!size.unit.empty()) {
    const MapUnit* const unit = FindUnit(size.unit);
    if (unit == nullptr || unit->kind != info.unitKind) {
      throw HostError(kExitUsage, "--pixel-size: " + text + ": the unit of the system is " +
                                      info.unitName.ToUTF8());
    }
    size.value *= unit->factor / info.unitFactor;
  }
  const double plain = size.value * info.unitFactor;  // metres or degrees
  if (info.unitKind == 1 && plain > 360) {
    throw HostError(kExitUsage, "--pixel-size: " + text + ": no pixel is that many degrees wide");
  }
  if (info.unitKind == 1 && plain >= 1) {
    Say(fmt::format(
        "note: --pixel-size: a pixel is {} degrees wide; that is the unit of the system", plain));
  } else if (info.unitKind == 0 && plain < 0.01) {
    Say(fmt::format("note: --pixel-size: a pixel is {} m wide; that is the unit of the system",
                    plain));
  }
  return size.value;
}

/// Questions a zone of the Universal Transverse Mercator grid that is far from the raster.
void QuestionZone(const std::string& named, const CoordSys& system, const GeoRef& source) {
  std::string name = system.Info()->name.ToUTF8();
  std::replace(name.begin(), name.end(), '_', ' ');
  const std::size_t at = CLI::detail::to_lower(name).find("utm zone ");
  if (at == std::string::npos) return;
  const int zone = std::atoi(name.c_str() + at + 9);
  if (zone < 1 || zone > 60) return;
  Array<double> centre{ArrayDims(1, 2)};
  centre[0] = source.Samples() / 2.0;
  centre[1] = source.Lines() / 2.0;
  source.PixelToMap(centre);
  double longitude = 0, latitude = 0;
  source.CoordinateSystem().MapToGeo(centre[0], centre[1], longitude, latitude);
  if (!std::isfinite(longitude)) return;
  constexpr double kFar = 9;  // degrees: the zone's half, and a zone between
  const double off = std::abs(std::remainder(longitude - (zone * 6 - 183), 360.0));
  if (off <= kFar) return;
  const int nearest = static_cast<int>(std::floor((std::remainder(longitude, 360.0) + 180) / 6));
  Say(
      fmt::format("note: --to: the raster lies {:.0f} degrees from the middle of zone {} ({}); its "
                  "own is zone {}",
                  off, zone, named, nearest % 60 + 1));
}

/// The grid that was asked for. Throws HostError for one that can't be.
GeoRefPtr FindGrid(JobSession& session, const Options& options, const RasterInfo& info) {
  if (info.geoRef.IsNull()) {
    throw HostError(kExitFailed, options.source.file + ": the raster has no geo-reference");
  }
  if (IsFile(options.to)) {
    if (!options.pixelSize.empty()) {
      throw HostError(kExitUsage, "--pixel-size: the grid of " + options.to + " has its own");
    }
    return GridOfFile(session, options.to);
  }
  CoordSys system;
  if (!system.SetFromString(String(options.to))) {
    throw HostError(kExitUsage, "--to: neither a file nor a coordinate system: " + options.to);
  }
  if (info.geoRef->CoordinateSystem().IsEmpty()) {
    throw HostError(kExitFailed, options.source.file + ": the raster has no coordinate system");
  }
  QuestionZone(options.to, system, *info.geoRef);
  const GeoRefPtr grid =
      CoveringGrid(*info.geoRef, system, ReadPixelSize(options.pixelSize, system));
  if (grid.IsNull()) {
    throw HostError(kExitFailed, options.source.file +
                                     ": the raster can't be carried to that system with pixels "
                                     "of that size");
  }
  return grid;
}

/// Makes the file in the output's folder. Throws what went wrong.
void MakeFile(JobSession& session, const Options& options, const Plan& plan,
              const OutputFile& output) {
  Losses losses(output.GetShownName(), plan.format, options.target.strict);
  const MadeRaster raster =
      MakeKept(session, {output.GetWorkName(), plan.format}, losses, !options.noData,
               [&](const FillValues& noData) {
                 const JobDraft draft = MakeDraft(options, plan, output.GetWorkName(), noData);
                 JobResults results;
                 {
                   const ProgressView view(ProgressOfStep(session, draft, kWarpStep),
                                           options.job.GetProgressStyle());
                   results = session.Run(draft);
                 }
                 CheckClosed(results);
                 RasterContents put = ReadContents(results, "shown");
                 put.valid = ReadValidPixels(results, kWarpStep);
                 return put;
               });
  CompareKept(raster, losses);
  session.CheckInterrupt();
  losses.Settle();
}

/// Refuses a no-data value that no pixel can have.
void CheckNoData(const Options& options, const RasterInfo& info) {
  if (!options.noData || FitsPixel(info.dataType, *options.noData)) return;
  throw HostError(kExitUsage, fmt::format("--no-data: a pixel of type {} can't be {}",
                                          DataTypeName(info.dataType).ToUTF8(), *options.noData));
}

int Warp(const Options& options) {
  Plan plan;
  plan.format = ChooseFormat(options.target);
  OutputFile output(options.target.output, options.target.overwrite, {options.source.file});
  JobSession session(options.job);
  JobDraft opening;
  AddOpen(opening, "source", options.source);
  AddQuery(opening, "source", "$source");
  const JobResults opened = session.Run(opening);
  output.RefuseInput(PathOf(opened.Find("source").returns.Find("URI")));
  const RasterInfo info = ReadInfo(opened, "source");
  CheckNoData(options, info);
  plan.bands = ParseBands(options.bands, info);
  plan.grid = FindGrid(session, options, info);
  if (options.job.printJob) {
    std::cout << MakeDraft(options, plan, output.GetName(), {}).Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  output.Begin(BytesInFile(plan.format, info.dataType, plan.grid->Samples(), plan.grid->Lines(),
                           plan.bands.GetCount()));
  try {
    MakeFile(session, options, plan, output);
  } catch (const HostError& error) {
    throw HostError(error.code, output.InUsersWords(error.what()));
  }
  output.Commit();
  return kExitSuccess;
}

const VerbRegistration registration(
    "warp", "Carries a raster to another coordinate system or grid", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "The polynomial method is within an eighth of a pixel; rigorous transforms every pixel. "
          "Linear and cubic leave out pixels that aren't valid; cubic has the parameter -1. Pixels "
          "outside the source are not valid: they have the no-data value, or 0 under a mask.\n"
          "Example: vexg warp scene.tif geographic.tif --to EPSG:4326 --resampling linear\n");
      options->source.AddTo(app);
      options->target.AddTo(app, "The warped raster");
      app.add_option("--to", options->to,
                     "Coordinate system (EPSG:n, WKT, PROJ text), or a raster file whose grid is "
                     "taken over")
          ->type_name("CS|FILE")
          ->transform(CoordSysName())
          ->required();
      app.add_option("--pixel-size", options->pixelSize,
                     "Side of a pixel in units of the system, or with its unit; by default about "
                     "as many pixels as "
                     "the source has")
          ->type_name("SIZE")
          ->check(CheckPixelSize);
      app.add_option("--method", options->method, "How positions are found")
          ->transform(OneOf({"polynomial", "rigorous"}))
          ->capture_default_str();
      app.add_option("--resampling", options->resampling, "How pixels are made")
          ->transform(OneOf({"nearest", "linear", "cubic"}))
          ->capture_default_str();
      app.add_option("--bands", options->bands, "Bands in the order wanted, from 0; all by default")
          ->type_name("B,B…");
      app.add_option("--no-data", options->noData,
                     "No-data value of the result; by default the source's")
          ->type_name("VALUE");
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Warp(*options); });
    });

}  // namespace
}  // namespace lumo::host
