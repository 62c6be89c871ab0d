#include <algorithm>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "options/option_values.h"
#include "output/json_number.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"

namespace lumo::host {
namespace {

constexpr const char* kCompareStep = "compare";

/// Holds what AccuracyCommand gives.
struct Report {
  std::vector<std::string> classes;
  Array<unsigned> matrix;
  Array<double> overall, producer, user, f1;
  double kappa = 0;
  unsigned outside = 0, noClass = 0;

  explicit Report(const Map<String, String>& returns) {
    for (const String& name : ParseValue<Array<String>>(returns.Find("Classes"))) {
      classes.push_back(name.ToUTF8());
    }
    matrix = ParseValue<Array<unsigned>>(returns.Find("Matrix"));
    overall = ParseValue<Array<double>>(returns.Find("Overall"));
    producer = ParseValue<Array<double>>(returns.Find("Producer"));
    user = ParseValue<Array<double>>(returns.Find("User"));
    f1 = ParseValue<Array<double>>(returns.Find("F1"));
    kappa = ParseValue<double>(returns.Find("Kappa"));
    outside = ParseValue<unsigned>(returns.Find("Outside"));
    noClass = ParseValue<unsigned>(returns.Find("NoClass"));
  }

  Json ShareAsJson(const Array<double>& shares, std::size_t at) const {
    return {{"share", NumberAsJson(shares[at * 3])},
            {"low", NumberAsJson(shares[at * 3 + 1])},
            {"high", NumberAsJson(shares[at * 3 + 2])}};
  }

  Json AsJson() const {
    Json list = Json::array(), rows = Json::array();
    for (std::size_t i = 0; i < classes.size(); ++i) {
      list.push_back({{"class", classes[i]},
                      {"producer", ShareAsJson(producer, i)},
                      {"user", ShareAsJson(user, i)},
                      {"f1", NumberAsJson(f1[i])}});
      Json row = Json::array();
      for (std::size_t j = 0; j < classes.size(); ++j)
        row.push_back(matrix[i * classes.size() + j]);
      rows.push_back(row);
    }
    return {{"overall", ShareAsJson(overall, 0)},
            {"kappa", NumberAsJson(kappa)},
            {"classes", list},
            {"matrix", rows},
            {"outside", outside},
            {"noClass", noClass}};
  }

  static std::string Percent(const Array<double>& shares, std::size_t at) {
    return fmt::format("{:5.1f} ({:.1f} to {:.1f})", 100 * shares[at * 3], 100 * shares[at * 3 + 1],
                       100 * shares[at * 3 + 2]);
  }

  std::string AsText() const {
    std::size_t widest = 5;
    for (const std::string& name : classes) widest = std::max(widest, Printable(name).size());
    std::string text = fmt::format("{:<{}}", "known", widest);
    for (std::size_t j = 0; j < classes.size(); ++j) text += fmt::format(" {:>6}", j + 1);
    text += fmt::format("  {:<22} {:<22} {}\n", "producer's %", "user's %", "F1");
    for (std::size_t i = 0; i < classes.size(); ++i) {
      text += fmt::format("{:<{}}", Printable(classes[i]), widest);
      for (std::size_t j = 0; j < classes.size(); ++j) {
        text += fmt::format(" {:>6}", matrix[i * classes.size() + j]);
      }
      text +=
          fmt::format("  {:<22} {:<22} {:.3f}\n", Percent(producer, i), Percent(user, i), f1[i]);
    }
    text += fmt::format("\noverall {} %, kappa {:.3f}\n", Percent(overall, 0), kappa);
    if (outside != 0) text += fmt::format("{} samples are on no pixel that counts\n", outside);
    if (noClass != 0) text += fmt::format("{} samples are on pixels of no class\n", noClass);
    return text;
  }
};

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
    JobWriterCommand& compare = draft.Step(kCompareStep, "AccuracyCommand");
    compare.AddVariableInput("MapURI", "$map");
    compare.AddInput("Vectors", String(AbsoluteName(reference_)));
    compare.AddInput("ClassField", String(field_));
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
    const Report report(session.Run(draft).Find(kCompareStep).returns);
    text_ = isJson_ ? report.AsJson().dump(2) + "\n" : report.AsText();
  }

  std::string Describe() const override { return text_; }

  std::string reference_, field_, layer_, where_, classes_, text_;
  bool isJson_ = false;
};

const VerbRegistration registration("accuracy",
                                    "Compares a map of classes with samples of known classes",
                                    &SetUp<AccuracyVerb>);

}  // namespace
}  // namespace lumo::host
