#include <algorithm>

#include "rasters/accuracy_report.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"

namespace lumo::host {
namespace {

class AccuracyVerb final : public FileVerb {
 public:
  explicit AccuracyVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Each sample counts once: a point for its pixel, a shape for the class of most of its "
        "pixels. Rows are the known classes, columns those of the map in the same order; shares "
        "have their 95 % interval behind them.");
    line.AddExample("vexg accuracy classes.tif --reference samples.gpkg --class-field crop");
    line.Add("--reference", reference_, "The samples").IsFile("SAMPLES").Required();
    line.Add("--class-field", field_, "The field with the class of a sample")
        .Shows("FIELD")
        .Required();
    line.Add("--layer", layer_, "A layer of the samples, by name or number; the first by default")
        .Shows("NAME|N");
    line.Add("--where", where_, "Only samples whose field has this value").Shows("FIELD=VALUE");
    line.Add("--classes", classes_,
             "Names of the map's values from 1 on; without them the field holds values")
        .Shows("NAME,NAME...")
        .Example("water,forest,town");
    line.Add("--json", isJson_, "As JSON");
  }

 private:
  std::vector<std::string> GetFurtherInputs() const override { return {reference_}; }

  void AddOpening(JobDraft& draft) const override {
    AddOpen(draft, "map", GetSource());
    AddQuery(draft, "map", "$map");
  }
  void Plan(JobSession& /*session*/, const JobResults& opened) override { ReadInfo(opened, "map"); }

  JobDraft MakeDraft() const {
    JobDraft draft;
    AddOpen(draft, "map", GetSource());
    JobWriterCommand& compare = AddComparison(draft, "$map", {reference_, field_});
    if (!layer_.empty()) compare.AddInput("Layer", String(layer_));
    if (!where_.empty()) compare.AddInput("Where", String(where_));
    std::string names = classes_;
    std::replace(names.begin(), names.end(), ',', '|');
    if (!names.empty()) compare.AddInput("Classes", String(names));
    draft.Close("close", "$map");
    return draft;
  }

  JobDraft GetJob(const Outputs& /*outputs*/) const override { return MakeDraft(); }

  void Make(JobSession& session, const Outputs& /*outputs*/) override {
    const JobDraft draft = MakeDraft();
    const ProgressView view(ProgressOfStep(session, draft, kCompareStep), GetProgressStyle());
    const AccuracyReport report(session.Run(draft).Find(kCompareStep).returns);
    text_ = isJson_ ? report.AsJson().dump(2) + "\n" : report.AsText();
  }

  std::string Describe() const override { return text_; }

  std::string reference_, field_, layer_, where_, classes_, text_;
  bool isJson_ = false;
};

const VerbRegistration accuracyRegistration(
    "accuracy", "Compares a map of classes with samples of known classes", &SetUp<AccuracyVerb>);

}  // namespace
}  // namespace lumo::host
