#include "rasters/raster_verb.h"

#include <filesystem>

#include <fmt/format.h>

#include "output/stac_item.h"
#include "pictures/palette_reading.h"
#include "rasters/raster_target.h"
#include "rasters/value_names.h"

namespace lumo::host {

void RasterVerb::AddFilesTo(OptionSet& line, const std::string& meaning, bool isRequired) {
  GetSource().AddTo(line);
  target_.isRequired = isRequired;
  AddOutputTo(line, meaning);
}

void RasterVerb::AddOutputTo(OptionSet& line, const std::string& meaning) {
  target_.AddTo(line, meaning);
  AddStacTo(line);
  AddOverwriteTo(line, "files that are there");
}

void RasterVerb::AddFormatTo(OptionSet& line) {
  target_.AddFormatTo(line);
  AddStacTo(line);
  AddOverwriteTo(line, "files that are there");
}

void RasterVerb::AddStacTo(OptionSet& line) {
  line.Add("--stac", stac_,
           "Also make a STAC item, which describes the raster, beside it: NAME.stac.json");
}

void RasterVerb::AddSource(RasterChain& chain) const {
  AddOpen(chain.GetDraft(), "source", GetSource());
  chain.Take("source");
}

void RasterVerb::AddMaking(JobDraft& draft, const Making& making) const {
  JobWriterCommand& copy = draft.Step(kMakeStep, "CopyRasterCommand");
  copy.AddVariableInput("SrcURI", making.shown);
  copy.AddVariableInput("DstURI", "$target");
  copy.AddInput("Invalid", String(FillsNoData(making.noData) ? "NoData" : "Told"));
  copy.AddInput("Blocks", String(CopiesBlocksOfSource() ? "Stream" : "Target"));
}

RasterContents RasterVerb::ReadWanted(const JobResults& results) const {
  RasterContents wanted = ReadContents(results, kShown);
  wanted.valid = ReadValidPixels(results, kMakeStep);
  return wanted;
}

void RasterVerb::CheckOptions() {
  format_ = ChooseFormat(target_);
  CheckCreation(target_, format_);
}

void RasterVerb::AddOpening(JobDraft& draft) const {
  RasterChain chain(draft);
  AddSource(chain);
  AddQuery(draft, kShown, chain.GetTop());
  AddQuestions(draft);
}

void RasterVerb::Plan(JobSession& session, const JobResults& opened) {
  RasterInfo source = ReadInfo(opened, kShown);
  if (GetArea().IsGiven()) {
    JobDraft draft;
    RasterChain chain(draft);
    AddSource(chain);
    source = PlanArea(session, {URIOf(opened, chain.GetTop()), source});
  }
  planned_ = PlanRaster(session, opened, source);
  creation_ = ChooseCreation(target_, format_, planned_, GetOverviewMethod());
}

std::vector<std::string> RasterVerb::GetOutputs() const {
  std::vector<std::string> outputs{target_.output};
  for (const std::string& file : GetFurtherOutputs()) outputs.push_back(file);
  if (stac_) outputs.push_back(StacNameOf(target_.output));
  return outputs;
}

std::uint64_t RasterVerb::GetBytes(std::size_t output) const {
  return output == 0 ? BytesInFile(format_, planned_) : 0;
}

/// The making as a whole: opens the source, stands views on it, makes the file and closes all.
JobDraft RasterVerb::MakeDraft(const std::string& file, const FillValues& noData) const {
  JobDraft draft;
  RasterChain chain(draft);
  AddSource(chain);
  GetArea().AddViews(chain);
  AddViews(chain);
  const String shown = chain.GetTop();
  AddQuery(draft, kShown, shown);
  AddDetailsQuery(draft, kShown, shown);
  AddToCreate(draft, AddCreate(draft, PlaceAt(file), shown, GetKeptDetails(), GetNoData(noData)));
  if (KeepsPalettes()) {
    JobWriterCommand& palettes = draft.Step("palettes", "CopyRasterPalettesCommand");
    palettes.AddInput("SrcURI", shown);
    palettes.AddInput("DstURI", String("$target"));
  }
  AddMaking(draft, {shown, file, noData});
  AddCloseTarget(draft);
  AddLastQuestions(draft, shown);
  chain.Close();
  return draft;
}

JobDraft RasterVerb::GetJob(const Outputs& outputs) const {
  const std::string made = outputs.Get(0).GetName();
  JobDraft draft = MakeDraft(made, {});
  std::vector<std::string> further;
  for (std::size_t i = 0; i < GetFurtherOutputs().size(); ++i) {
    further.push_back(outputs.Get(i + 1).GetName());
  }
  if (!further.empty()) AddFurther(draft, {made, format_}, further);
  return draft;
}

void RasterVerb::MakeFurther(JobSession& session, const Outputs& outputs) {
  std::vector<std::string> further;
  for (std::size_t i = 0; i < GetFurtherOutputs().size(); ++i) {
    further.push_back(outputs.Get(i + 1).GetWorkName());
  }
  if (further.empty()) return;
  JobDraft draft;
  AddFurther(draft, {outputs.Get(0).GetWorkName(), format_}, further);
  if (draft.GetSteps().empty()) return;
  const ProgressView view(session.GetProgress(), GetProgressStyle());
  session.Run(draft);
}

/// Writes the STAC item, the last of the outputs.
void RasterVerb::MakeStac(JobSession& session, const Outputs& outputs,
                          const RasterContents& made) const {
  const OutputFile& output = outputs.Get(0);
  StacRaster raster{std::filesystem::path(output.GetName()).filename().string(),
                    creation_.count("Layout") != 0, made, std::vector<Palette>(made.info.bands),
                    std::vector<std::vector<std::string>>(made.info.bands)};
  raster.contents.info.format = String(format_);
  JobDraft open;
  AddOpen(open, "made", {output.GetWorkName(), format_});
  for (unsigned band = 0; band < made.info.bands; ++band) {
    JobWriterCommand& ask =
        open.Step(fmt::format("categories{}", band), "GetRasterCategoriesCommand");
    ask.AddInput("URI", String("$made"));
    ask.AddInput("Band", band);
  }
  const JobResults opened = session.Run(open);
  const String uri = opened.Find("made").returns.Find("URI");
  for (unsigned band = 0; band < made.info.bands; ++band) {
    const String step(fmt::format("categories{}", band));
    raster.categories[band] = ReadValueNames(opened.Find(step).returns.Find("Categories"));
    if (made.info.hasPalette[band]) raster.palettes[band] = ReadPalette(session, uri, band);
  }
  JobDraft close;
  close.Close("close", uri);
  session.Run(close);
  const std::string text = StacItemOf(raster).dump(2) + "\n";
  FileWriter writer(outputs.Get(GetOutputs().size() - 1));
  writer.Write(text.data(), text.size());
  writer.Close();
}

void RasterVerb::Make(JobSession& session, const Outputs& outputs) {
  const OutputFile& output = outputs.Get(0);
  Losses losses(output.GetShownName(), format_, target_.strict);
  MadeRaster raster = MakeKept(session, PlaceAt(output.GetWorkName()), losses, MayChooseNoData(),
                               [&](const FillValues& noData) {
                                 const JobDraft draft = MakeDraft(output.GetWorkName(), noData);
                                 JobResults results;
                                 {
                                   const ProgressView view(
                                       ProgressOfSteps(session, draft, GetFirstStep(), kMakeStep),
                                       GetProgressStyle());
                                   results = session.Run(draft);
                                 }
                                 CheckClosed(results);
                                 return ReadWanted(results);
                               });
  Compare(raster, losses);
  const RasterInfo& put = raster.put.info;
  for (unsigned band = 0; KeepsPalettes() && band < put.bands; ++band) {
    if (!put.hasPalette[band] || raster.made.info.hasPalette[band]) continue;
    losses.Add(fmt::format("the palette of band {}", band));
  }
  if (PlaceAt({}).LosesValues()) losses.Add("the values of pixels exactly");
  session.CheckInterrupt();
  losses.Settle();
  MakeFurther(session, outputs);
  if (stac_) MakeStac(session, outputs, raster.made);
  for (const std::string& ending : GetLeftovers()) {
    std::error_code fault;  // what stays there would take its place with the raster
    std::filesystem::remove(output.GetWorkName() + ending, fault);
    if (!fault) continue;
    throw HostError(kExitFailed, output.GetShownName() + ": can't be written: " + fault.message());
  }
}

}  // namespace lumo::host
