#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "foundation/color.h"
#include "keeping.h"
#include "option_values.h"
#include "palette_reading.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  SourceOptions source;
  TargetOptions target;
  RasterJobOptions job;
  std::string rect;
  std::string bands;
  std::string interleave;
  std::string type;
  unsigned level = 0;  ///< of the source's pyramid; 0: the source itself
};

/// A colour table of the copy.
struct BandPalette {
  unsigned band;
  Palette palette;
};

/// What is copied.
struct Plan {
  std::string format;
  SubRect rect;
  Array<unsigned> bands;
  bool isPart = false;  ///< the rectangle isn't the whole raster
  bool choosesBands = false;
  std::vector<BandPalette> palettes;
};

/// The palettes of the bands that are copied, by their place in the copy.
std::vector<BandPalette> ReadPalettes(JobSession& session, const String& raster,
                                      const RasterInfo& info, const Array<unsigned>& bands) {
  std::vector<BandPalette> palettes;
  for (unsigned i = 0; i < bands.GetCount(); ++i) {
    if (!info.hasPalette[bands[i]]) continue;
    palettes.push_back({i, ReadPalette(session, raster, bands[i])});
  }
  return palettes;
}

constexpr const char* kCopyStep = "copy";

/// Opens the source, and the level that is copied, and gives the variables of what is open.
std::vector<String> AddSource(JobDraft& draft, const Options& options) {
  if (options.level == 0) {
    AddOpen(draft, "source", options.source);
    return {"$source"};
  }
  AddOpenWithPyramid(draft, "source", options.source);
  AddLevel(draft, "level", "$source", options.level);
  return {"$source", "$level"};
}

/// The copying as a whole: opens the source, stands views on it, makes the copy and closes all.
/// @param target  the file to make.
/// @param noData  of bands, in the place of pixels that are not valid.
JobDraft MakeDraft(const Options& options, const Plan& plan, const std::string& target,
                   const FillValues& noData) {
  JobDraft draft;
  std::vector<String> opened = AddSource(draft, options);
  if (plan.isPart) {
    JobWriterCommand& view = draft.Open("part", "CreateSpatialSubsetRasterCommand");
    view.AddVariableInput("SrcURI", opened.back());
    view.AddInput("SubRect", plan.rect);
    view.AddInput("Placing", Form::kExact);
    opened.emplace_back("$part");
  }
  if (plan.choosesBands) {
    AddBandView(draft, "bands", opened.back(), plan.bands);
    opened.emplace_back("$bands");
  }
  const String shown = opened.back();
  AddQuery(draft, "shown", shown);
  AddDetailsQuery(draft, "shown", shown);
  JobWriterCommand& create = AddCreate(draft, {target, plan.format}, shown, "All", noData);
  if (!options.interleave.empty()) {
    create.AddInput("Interleave", ParseInterleave(options.interleave));
  }
  for (const BandPalette& entry : plan.palettes) {
    JobWriterCommand& set =
        draft.Step("palette" + std::to_string(entry.band), "SetRasterPaletteCommand");
    set.AddInput("URI", String("$target"));
    set.AddInput("Band", entry.band);
    set.AddInput("Palette", entry.palette);
  }
  JobWriterCommand& copy = draft.Step(kCopyStep, "CopyRasterCommand");
  copy.AddVariableInput("SrcURI", shown);
  copy.AddVariableInput("DstURI", "$target");
  copy.AddInput("Invalid", String(noData.empty() ? "Told" : "NoData"));
  AddCloseTarget(draft);
  for (auto raster = opened.rbegin(); raster != opened.rend(); ++raster) {
    draft.Close("close." + raster->ToUTF8().substr(1), *raster);
  }
  return draft;
}

/// Adds what the format did not keep to the losses.
void CompareCopy(const Options& options, const Plan& plan, const MadeRaster& raster,
                 Losses& losses) {
  CompareKept(raster, losses);
  const RasterInfo& made = raster.made.info;
  for (const BandPalette& entry : plan.palettes) {
    if (!made.hasPalette[entry.band]) {
      losses.Add("the palette of band " + std::to_string(entry.band));
    }
  }
  const bool ordered = !options.interleave.empty() && made.bands > 1;
  if (ordered && made.interleave != ParseInterleave(options.interleave)) {
    losses.Add("the order " + options.interleave);
  }
  if (plan.format == "JPEG") losses.Add("the values of pixels exactly");
}

Plan MakePlan(JobSession& session, const Options& options, const String& raster,
              const RasterInfo& info) {
  if (!options.type.empty() && DataTypeName(info.dataType) != String(options.type)) {
    throw HostError(kExitUsage, fmt::format("--type: the pixels are {}, and a copy does not "
                                            "change their type to {}",
                                            DataTypeName(info.dataType).ToUTF8(), options.type));
  }
  Plan plan;
  plan.format = ChooseFormat(options.target);
  plan.rect = ParseRect(options.rect, info);
  plan.isPart = !(plan.rect == info.GetRect());
  plan.bands = ParseBands(options.bands, info);
  plan.choosesBands = !options.bands.empty();
  plan.palettes = ReadPalettes(session, raster, info, plan.bands);
  return plan;
}

/// Makes the copy in the output's folder. Throws what went wrong.
void MakeCopy(JobSession& session, const Options& options, const Plan& plan,
              const OutputFile& output) {
  Losses losses(output.GetShownName(), plan.format, options.target.strict);
  const MadeRaster raster = MakeKept(
      session, {output.GetWorkName(), plan.format}, losses, true, [&](const FillValues& noData) {
        const JobDraft draft = MakeDraft(options, plan, output.GetWorkName(), noData);
        JobResults results;
        {
          const ProgressView view(ProgressOfStep(session, draft, kCopyStep),
                                  options.job.GetProgressStyle());
          results = session.Run(draft);
        }
        CheckClosed(results);
        RasterContents put = ReadContents(results, "shown");
        put.valid = ReadValidPixels(results, kCopyStep);
        return put;
      });
  CompareCopy(options, plan, raster, losses);
  session.CheckInterrupt();
  losses.Settle();
}

int Copy(const Options& options) {
  ChooseFormat(options.target);
  OutputFile output(options.target.output, options.target.overwrite, {options.source.file});
  JobSession session(options.job);
  JobDraft opening;
  AddQuery(opening, "shown", AddSource(opening, options).back());
  const JobResults opened = session.Run(opening);
  const String source = opened.Find("source").returns.Find("URI");
  output.RefuseInput(PathOf(source));
  const String raster =
      options.level == 0 ? source : opened.Find("level").returns.Find("PyramidURI");
  const RasterInfo info = ReadInfo(opened, "shown");
  const Plan plan = MakePlan(session, options, raster, info);
  if (options.job.printJob) {
    std::cout << MakeDraft(options, plan, output.GetName(), {}).Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  output.Begin(BytesInFile(plan.format, info.dataType, plan.rect.Width(), plan.rect.Height(),
                           plan.bands.GetCount()));
  try {
    MakeCopy(session, options, plan, output);
  } catch (const HostError& error) {
    throw HostError(error.code, output.InUsersWords(error.what()));
  }
  output.Commit();
  return kExitSuccess;
}

const VerbRegistration registration(
    "copy", "Copies a raster into a new file, of the same or another format", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "The copy keeps which pixels are valid, pixel type, no-data values, geo-reference, "
          "palettes, names, units and scales of bands and metadata items, as far as its format "
          "can; "
          "what it can't is said, and with --strict a failure.\n"
          "Example: vexg copy scene.tif part.dat --format ORVA --rect 0,0,99,49 --bands 2,1,0\n");
      options->source.AddTo(app);
      options->target.AddTo(app, "The copy");
      app.add_option("--rect", options->rect,
                     "Pixels: left,top,right,bottom, from 0, inclusive; all by default")
          ->type_name("L,T,R,B");
      app.add_option("--bands", options->bands, "Bands in the order wanted, from 0; all by default")
          ->type_name("B,B…");
      app.add_option("--level", options->level,
                     "Level of its pyramid: 0 the raster itself, each further one half the size")
          ->check(CLI::Range(0U, 31U))
          ->capture_default_str();
      app.add_option("--interleave", options->interleave, "Order of the pixels in the copy")
          ->transform(OneOf({"bip", "bil", "bsq"}));
      app.add_option("--type", options->type, "Pixel type that the source has to have")
          ->type_name("TYPE")
          ->transform(PixelTypeName());
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Copy(*options); });
    });

}  // namespace
}  // namespace lumo::host
