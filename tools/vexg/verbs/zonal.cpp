#include <fmt/format.h>

#include "foundation/fault.h"
#include "options/option_values.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"
#include "rasters/shape_options.h"
#include "regions/zonal_figures.h"

namespace lumo::host {
namespace {

constexpr const char* kMakeStep = "make";

class ZonalVerb final : public FileVerb {
 public:
  explicit ZonalVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Each shape is a zone, whose row has the fields of the shape and, for each band, the "
        "figures of the valid pixels inside: a column mean, or b0_mean, b1_mean where there are "
        "several bands. The raster is read once, however the zones lie. With coverage a pixel "
        "weighs as much as the share of it that lies inside its polygon.");
    line.AddNote("The ending of the table chooses its format: .csv, .gpkg, .fgb, .geojson, .shp.");
    line.AddExample("vexg zonal scene.tif parcels.gpkg -o parcels.csv --stats mean,std,p10,p90");
    shapes_.AddTo(line);
    line.Add("--output,-o", output_, "The table").IsFile("OUT").Required();
    line.Add("--stats", stats_,
             "Figures: count, min, max, mean, std, sum, median, majority, minority, variety, "
             "p10 and so on; the first six by default")
        .Shows("F,F...")
        .Example("mean,p90");
    line.Add("--weights", weights_, "How pixels weigh")
        .Takes(OneOf({"none", "coverage"}))
        .ShowsDefault();
    line.Add("--bands", bandsText_, "Bands, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    AddOverwriteTo(line, "a file that is there");
  }

 private:
  std::vector<std::string> GetOutputs() const override { return {output_}; }
  std::vector<std::string> GetFurtherInputs() const override { return {shapes_.file}; }

  void CheckOptions() override {
    for (std::size_t at = 0; !stats_.empty() && at <= stats_.size();) {
      const std::size_t end = std::min(stats_.find(',', at), stats_.size());
      const std::string name = stats_.substr(at, end - at);
      ZonalRequest request;
      if (!ParseZonalRequest(name, request)) {
        throw HostError(kExitUsage, "--stats: " + TakeFault().ToUTF8());
      }
      figures_ += (figures_.empty() ? "" : "|") + name;
      at = end + 1;
    }
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpen(draft, "source", GetSource());
    AddQuery(draft, "source", "$source");
  }

  void Plan(JobSession& /*session*/, const JobResults& opened) override {
    bands_ = ParseBands(bandsText_, ReadInfo(opened, "source"));
  }

  JobDraft MakeDraft(const std::string& file) const {
    JobDraft draft;
    AddOpen(draft, "source", GetSource());
    JobWriterCommand& make = draft.Step(kMakeStep, "ZonalStatisticsCommand");
    make.AddVariableInput("URI", "$source");
    shapes_.AddInputs(make);
    make.AddInput("Table", String(file));
    if (!bandsText_.empty()) make.AddInput("Bands", bands_);
    if (!figures_.empty()) make.AddInput("Figures", String(figures_));
    if (weights_ == "coverage") make.AddInput("Weights", String("Coverage"));
    draft.Close("close", "$source");
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

  ShapeOptions shapes_;
  std::string output_, stats_, bandsText_;
  std::string weights_ = "none";
  std::string figures_;
  Array<unsigned> bands_;
};

const VerbRegistration zonalRegistration("zonal", "Makes a table of the pixels inside each shape",
                                         &SetUp<ZonalVerb>);

}  // namespace
}  // namespace lumo::host
