#include <algorithm>
#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "data/format_table.h"
#include "foundation/color.h"
#include "output_file.h"
#include "palette_reading.h"
#include "raster/pixel_types.h"
#include "raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  SourceOptions source;
  RasterJobOptions job;
  std::string output;
  std::string format;
  std::string rect;
  std::string bands;
  std::string interleave;
  std::string type;
  bool overwrite = false;
};

/// The format that the ending of a name stands for; empty for none.
std::string FormatOfName(const std::string& name) {
  static const std::pair<const char*, const char*> kEndings[] = {
      {".tif", "TIFF"},  {".tiff", "TIFF"}, {".png", "PNG"},      {".jpg", "JPEG"},
      {".jpeg", "JPEG"}, {".bmp", "BMP"},   {".gif", "GIF"},      {".img", "Erdas"},
      {".ntf", "NITF"},  {".nitf", "NITF"}, {".jp2", "JPEG2000"}, {".dat", "ORVA"},
      {".bin", "ORVA"},  {".orva", "ORVA"}};
  const std::string ending =
      CLI::detail::to_lower(std::filesystem::path(name).extension().string());
  for (const auto& [known, format] : kEndings) {
    if (ending == known) return format;
  }
  return {};
}

std::string ChooseFormat(const Options& options) {
  if (options.format.empty()) {
    const std::string format = FormatOfName(options.output);
    if (!format.empty()) return format;
    throw HostError(kExitUsage, options.output +
                                    ": the name's ending tells no format; give --format, one "
                                    "of vexg formats");
  }
  if (FindFormat(String(options.format)) != nullptr) return options.format;
  throw HostError(kExitUsage,
                  "--format: there is no format \"" + options.format + "\"; see vexg formats");
}

/// Formats whose files are smaller than their pixels by nobody knows how much.
bool Compresses(const std::string& format) {
  static const char* const kFormats[] = {"JPEG", "PNG", "GIF", "JPEG2000", "MrSID"};
  return std::find(std::begin(kFormats), std::end(kFormats), format) != std::end(kFormats);
}

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
constexpr const char* kCloseStep = "close.target";

/// The copying as a whole: opens the source, stands views on it, makes the copy and closes all.
/// @param target  the file to make.
JobDraft MakeDraft(const Options& options, const Plan& plan, const std::string& target) {
  JobDraft draft;
  AddOpen(draft, "source", options.source);
  std::vector<String> opened{"$source"};
  if (plan.isPart) {
    JobWriterCommand& view = draft.Open("part", "CreateSpatialSubsetRasterCommand");
    view.AddVariableInput("SrcURI", opened.back());
    view.AddInput("SubRect", plan.rect);
    opened.emplace_back("$part");
  }
  if (plan.choosesBands) {
    JobWriterCommand& view = draft.Open("bands", "CreateSpectralSubsetRasterCommand");
    view.AddVariableInput("SrcURI", opened.back());
    view.AddInput("Bands", plan.bands);
    opened.emplace_back("$bands");
  }
  const String shown = opened.back();
  AddQuery(draft, "shown", shown);
  JobWriterCommand& create = draft.Open("target", "CreateRasterCommand");
  create.AddInput("ConnStr", ConnStrings({String(AbsoluteName(target))}));
  create.AddVariableInput("SrcURI", shown);
  create.AddInput("Format", String(plan.format));
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
  draft.Close(kCloseStep, "$target");
  for (auto raster = opened.rbegin(); raster != opened.rend(); ++raster) {
    draft.Close("close." + raster->ToUTF8().substr(1), *raster);
  }
  return draft;
}

ProgressReportPtr CopyProgress(const JobSession& session, const JobDraft& draft) {
  std::size_t step = 0;
  while (draft.GetSteps()[step].name != kCopyStep) ++step;
  return ProgressReportPtr(new StepProgress(session.GetProgress(), step, draft.GetSteps().size()));
}

bool SameNoData(const RasterInfo& a, const RasterInfo& b) {
  for (unsigned band = 0; band < a.bands; ++band) {
    if (a.hasNoData[band] != b.hasNoData[band]) return false;
  }
  const auto values = ParseValue<Array<double>>(a.noData);
  const auto others = ParseValue<Array<double>>(b.noData);
  for (unsigned band = 0; band < a.bands; ++band) {
    if (!a.hasNoData[band] || band >= values.GetCount() || band >= others.GetCount()) continue;
    const bool bothNaN = values[band] != values[band] && others[band] != others[band];
    if (values[band] != others[band] && !bothNaN) return false;
  }
  return true;
}

std::uint64_t PixelBytes(const Plan& plan, const RasterInfo& info) {
  return std::uint64_t{plan.rect.Width()} * plan.rect.Height() * plan.bands.GetCount() *
         DataTypeBytes(info.dataType);
}

/// Opens the copy and looks at it: throws when it is another raster, and says what the format did
/// not keep.
void CheckCopy(JobSession& session, const Options& options, const Plan& plan,
               const OutputFile& output, const RasterInfo& wanted) {
  JobDraft draft;
  AddOpen(draft, "copy", {output.GetWorkName(), plan.format});
  AddQuery(draft, "copy", "$copy");
  draft.Close("close", "$copy");
  const RasterInfo made = ReadInfo(session.Run(draft), "copy");
  if (made.samples != wanted.samples || made.lines != wanted.lines || made.bands != wanted.bands ||
      made.dataType != wanted.dataType) {
    throw HostError(kExitFailed, options.output + ": the format " + plan.format +
                                     " did not keep the raster's size, bands or pixel type");
  }
  const auto note = [&](const std::string& what) {
    Say(options.output + ": note: the format " + plan.format + " does not keep " + what);
  };
  if (!SameNoData(wanted, made)) note("the no-data values as they are");
  if (wanted.geoRef && !wanted.geoRef->IsEqual(made.geoRef)) note("the geo-reference as it is");
  for (const BandPalette& entry : plan.palettes) {
    if (!made.hasPalette[entry.band]) note("the palette of band " + std::to_string(entry.band));
  }
  const bool ordered = !options.interleave.empty() && made.bands > 1;
  if (ordered && made.interleave != ParseInterleave(options.interleave)) {
    note("the order " + options.interleave);
  }
}

Plan MakePlan(JobSession& session, const Options& options, const String& raster,
              const RasterInfo& info) {
  if (!options.type.empty() && DataTypeName(info.dataType) != String(options.type)) {
    throw HostError(kExitUsage, fmt::format("--type: the pixels are {}, and a copy does not "
                                            "change their type to {}",
                                            DataTypeName(info.dataType).ToUTF8(), options.type));
  }
  Plan plan;
  plan.format = ChooseFormat(options);
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
  const JobDraft draft = MakeDraft(options, plan, output.GetWorkName());
  JobResults results;
  {
    const ProgressView view(CopyProgress(session, draft), options.job.GetProgressStyle());
    results = session.Run(draft);
  }
  const String fault = results.Find(kCloseStep).returns.Find("Fault");
  if (fault.GetLength() != 0) throw HostError(kExitFailed, fault.ToUTF8());
  CheckCopy(session, options, plan, output, ReadInfo(results, "shown"));
  session.CheckInterrupt();
}

int Copy(const Options& options) {
  ChooseFormat(options);
  OutputFile output(options.output, options.overwrite, {options.source.file});
  JobSession session(options.job);
  JobDraft opening;
  AddOpen(opening, "source", options.source);
  AddQuery(opening, "source", "$source");
  const JobResults opened = session.Run(opening);
  const String raster = opened.Find("source").returns.Find("URI");
  output.RefuseInput(PathOf(raster));
  const RasterInfo info = ReadInfo(opened, "source");
  const Plan plan = MakePlan(session, options, raster, info);
  if (options.job.printJob) {
    std::cout << MakeDraft(options, plan, output.GetName()).Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  output.Begin(Compresses(plan.format) ? 0 : PixelBytes(plan, info));
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
          "The copy keeps pixel type, no-data values, geo-reference and palettes, as far as its "
          "format can; what it can't is said.\n"
          "Example: vexg copy scene.tif part.dat --format ORVA --rect 0,0,99,49 --bands 2,1,0\n");
      options->source.AddTo(app);
      app.add_option("output", options->output, "The copy")->type_name("OUT")->required();
      app.add_option(
             "--format", options->format,
             "Key of the copy's format, see vexg formats; by default from its name's ending")
          ->type_name("KEY");
      app.add_option("--rect", options->rect,
                     "Pixels: left,top,right,bottom, from 0, inclusive; all by default")
          ->type_name("L,T,R,B");
      app.add_option("--bands", options->bands, "Bands in the order wanted, from 0; all by default")
          ->type_name("B,B…");
      app.add_option("--interleave", options->interleave, "Order of the pixels in the copy")
          ->check(CLI::IsMember({"bip", "bil", "bsq"}));
      app.add_option("--type", options->type, "Pixel type that the source has to have")
          ->type_name("TYPE");
      app.add_flag("--overwrite", options->overwrite, "Replace files that are there");
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Copy(*options); });
    });

}  // namespace
}  // namespace lumo::host
