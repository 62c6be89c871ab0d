#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "file_verb.h"
#include "foundation/fault.h"
#include "option_values.h"
#include "raster_target.h"
#include "regions/zonal_figures.h"
#include "shape_options.h"

namespace lumo::host {
namespace {

constexpr const char* kMakeStep = "make";

class ZonalVerb final : public FileVerb {
 public:
  explicit ZonalVerb(CLI::App& app) : FileVerb(app) {
    app.footer(
        "Each shape is a zone, whose row has the fields of the shape and, for each band, the "
        "figures of the valid pixels inside: a column mean, or b0_mean, b1_mean where there are "
        "several bands. The raster is read once, however the zones lie. With coverage a pixel "
        "weighs as much as the share of it that lies inside its polygon.\n"
        "The ending of the table chooses its format: .csv, .gpkg, .fgb, .geojson, .shp.\n"
        "Example: vexg zonal scene.tif parcels.gpkg -o parcels.csv --stats mean,std,p10,p90\n");
    shapes_.AddTo(app);
    app.add_option("-o,--output", output_, "The table")->type_name("OUT")->required();
    app.add_option("--stats", stats_,
                   "Figures: count, min, max, mean, std, sum, median, majority, minority, variety, "
                   "p10 and so on; the first six by default")
        ->type_name("F,F…");
    app.add_option("--weights", weights_, "How pixels weigh")
        ->transform(OneOf({"none", "coverage"}))
        ->capture_default_str();
    app.add_option("--bands", bandsText_, "Bands, from 0; all by default")->type_name("B,B…");
    AddOverwriteTo(app, "a file that is there");
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

const VerbRegistration registration("zonal", "Makes a table of the pixels inside each shape",
                                    &SetUp<ZonalVerb>);

}  // namespace
}  // namespace lumo::host
