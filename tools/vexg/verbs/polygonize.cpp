#include <fmt/format.h>

#include "rasters/file_verb.h"
#include "rasters/raster_target.h"

namespace lumo::host {
namespace {

constexpr const char* kMakeStep = "make";

class PolygonizeVerb final : public FileVerb {
 public:
  explicit PolygonizeVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Pixels of equal value that share a side are one polygon. The ending of the output chooses "
        "its format: .gpkg, .fgb, .geojson, .geojsons, .shp, .csv, or .fxv, the file of this "
        "library's own steps, which is in pixels.");
    line.AddExample("vexg polygonize classes.tif classes.gpkg --min-size 9");
    line.Add("output", output_, "The polygons").IsFile("OUT").Required();
    line.Add("--band", band_, "Band of the values, from 0").ShowsDefault();
    line.Add("--mask", mask_,
             "A raster of the same size: where its first band is 0, pixels do not count")
        .IsFile();
    AddAreaTo(line);
    line.Add("--min-size", leastPixels_,
             "Leave out polygons of fewer pixels; their places stay empty")
        .Shows("PIXELS");
    line.Add("--layer", layer_, "Name of the layer; by default that of the file").Shows("NAME");
    line.Add("--field", field_, "Name of the column of values; label by default").Shows("NAME");
    AddOverwriteTo(line, "a file that is there");
  }

 private:
  std::vector<std::string> GetOutputs() const override { return {output_}; }

  std::vector<std::string> GetFurtherInputs() const override {
    return mask_.empty() ? std::vector<std::string>() : std::vector<std::string>{mask_};
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpen(draft, "source", GetSource());
    AddQuery(draft, "source", "$source");
    if (mask_.empty() || !GetArea().IsGiven()) return;
    AddOpen(draft, "by", {mask_, ""});
    AddQuery(draft, "by", "$by");
    draft.Close("close.by", "$by");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    const RasterInfo info = ReadInfo(opened, "source");
    if (band_ >= info.bands) {
      throw HostError(kExitUsage, fmt::format("--band: the raster has {} bands", info.bands));
    }
    if (GetArea().IsGiven()) {
      CheckMask(opened, info);
      PlanArea(session, {URIOf(opened, "$source"), info});
    }
  }

  /// Refuses a mask of another size, which a part would not show.
  void CheckMask(const JobResults& opened, const RasterInfo& info) const {
    if (mask_.empty()) return;
    const RasterInfo mask = ReadInfo(opened, "by");
    if (mask.samples == info.samples && mask.lines == info.lines) return;
    throw HostError(kExitFailed, mask_ + ": --mask: the mask has another size than the raster");
  }

  JobDraft MakeDraft(const std::string& file) const {
    JobDraft draft;
    RasterChain chain(draft), masks(draft);
    AddOpen(draft, "source", GetSource());
    chain.Take("source");
    GetArea().AddViews(chain);
    if (!mask_.empty()) {
      AddOpen(draft, "by", {mask_, ""});
      masks.Take("by");
      if (GetArea().IsPart()) {
        masks.AddView("bypart", "CreateSpatialSubsetRasterCommand")
            .AddInput("SubRect", GetArea().GetRect());
      }
    }
    JobWriterCommand& make = draft.Step(kMakeStep, "PolygonizeCommand");
    make.AddVariableInput("URI", chain.GetTop());
    make.AddInput("Vectors", String(file));
    if (band_ != 0) make.AddInput("Band", band_);
    if (!mask_.empty()) make.AddVariableInput("MaskURI", masks.GetTop());
    if (leastPixels_ > 0) make.AddInput("MinSize", leastPixels_);
    if (!layer_.empty()) make.AddInput("Layer", String(layer_));
    if (!field_.empty()) make.AddInput("Field", String(field_));
    masks.Close();
    chain.Close();
    return draft;
  }

  JobDraft GetJob(const Outputs& outputs) const override {
    return MakeDraft(outputs.Get(0).GetName());
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    const JobDraft draft = MakeDraft(outputs.Get(0).GetWorkName());
    const ProgressView view(ProgressOfStep(session, draft, kMakeStep), GetProgressStyle());
    session.Run(draft);
  }

  std::string output_, mask_, layer_, field_;
  unsigned band_ = 0;
  double leastPixels_ = 0;
};

const VerbRegistration polygonizeRegistration(
    "polygonize", "Makes polygons of areas of equal value, in a vector file",
    &SetUp<PolygonizeVerb>);

}  // namespace
}  // namespace lumo::host
