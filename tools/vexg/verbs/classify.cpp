#include <algorithm>
#include <filesystem>
#include <optional>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "fx/attribute_names.h"
#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "rasters/raster_target.h"
#include "rasters/raster_verb.h"
#include "rasters/rule_file.h"
#include "rasters/shape_options.h"

namespace lumo::host {
namespace {

constexpr const char* kExampleStep = "examples";
constexpr const char* kScoreStep = "score";
constexpr std::size_t kMostClasses = 254;

std::vector<std::string> SplitAtCommas(const std::string& text) {
  std::vector<std::string> parts;
  for (std::size_t at = 0; !text.empty() && at <= text.size();) {
    const std::size_t end = std::min(text.find(',', at), text.size());
    parts.push_back(text.substr(at, end - at));
    at = end + 1;
  }
  return parts;
}

class ClassifyVerb final : public RasterVerb {
 public:
  explicit ClassifyVerb(OptionSet& line) : RasterVerb(line, "The map of classes") {
    line.AddNote(
        "Each region of the labels gets the class of its best score: by rules on its attributes, "
        "or "
        "by the votes of the nearest of the regions that samples of known classes hit. The map has "
        "the number of the class, from 1 in the order of the names, with colours and names; 0 "
        "where "
        "a region is of no class, and no data where there is none.");
    line.AddNote(
        "Attributes are called as in the tables of vexg attributes: mean_b0, std_b0, area and so "
        "on. docs/classification.md shows a file of rules.");
    line.AddExample(
        "vexg classify segments.tif crops.tif --attributes fields --training samples.gpkg "
        "--class-field crop");
    line.Add("--attributes", attributes_,
             "A file of attributes, or the NAME that vexg attributes was given for all of them")
        .IsFile("NAME|FILE.fxa")
        .Required();
    line.Add("--rules", rules_, "Rules of the classes, as JSON").IsFile("RULES.json");
    line.Add("--training", training_, "Samples of known classes, points or shapes")
        .Shows("SAMPLES[:LAYER]");
    line.Add("--class-field", field_, "The field with the class of a sample").Shows("FIELD");
    line.Add("--neighbors", neighbors_, "How many examples vote").Within(1, 1000000).ShowsDefault();
    line.Add("--use", use_, "The attributes that examples are compared by; all by default")
        .Shows("NAME,NAME...")
        .Example("mean_b0,area");
    line.Add("--polygons", polygons_, "Make polygons of the classes as well, in this vector file")
        .IsFile("OUT");
    line.Add("--scores", scores_, "Keep the scores of the regions, in this file").IsFile("OUT.fxa");
  }

 private:
  void CheckOptions() override {
    const auto refuse = [](const std::string& line) { throw HostError(kExitUsage, line); };
    if (rules_.empty() == training_.empty()) refuse("either --rules or --training is wanted");
    if (training_.empty() != field_.empty()) refuse("--training and --class-field go together");
    if (!rules_.empty() && !use_.empty()) refuse("--use goes with --training");
    FindFiles();
    RasterVerb::CheckOptions();
  }

  /// Finds the files behind the names that --attributes gives.
  void FindFiles() {
    std::error_code ignored;
    for (const std::string& name : attributes_) {
      if (std::filesystem::is_regular_file(name, ignored)) {
        files_.push_back(name);
        continue;
      }
      const std::size_t before = files_.size();
      for (const char* const kind : {"spectral", "texture", "shape"}) {
        const std::string file = name + "." + kind + ".fxa";
        if (std::filesystem::is_regular_file(file, ignored)) files_.push_back(file);
      }
      if (files_.size() == before) {
        throw HostError(kExitFailed, name + ": there are no attributes of this name");
      }
    }
  }

  std::vector<std::string> GetFurtherInputs() const override {
    std::vector<std::string> inputs = files_;
    if (!rules_.empty()) inputs.push_back(rules_);
    if (!training_.empty()) inputs.push_back(SplitLayer(training_).file);
    return inputs;
  }
  std::vector<std::string> GetFurtherOutputs() const override {
    std::vector<std::string> outputs;
    if (!polygons_.empty()) outputs.push_back(polygons_);
    if (!scores_.empty()) outputs.push_back(scores_);
    return outputs;
  }

  void AddQuestions(JobDraft& draft) const override {
    for (std::size_t i = 0; i < files_.size(); ++i) {
      draft.Step(fmt::format("file{}", i), "QueryAttributesCommand")
          .AddInput("AttributeFXA", String(AbsoluteName(files_[i])));
    }
  }

  RasterInfo PlanRaster(JobSession& session, const JobResults& opened,
                        const RasterInfo& source) override {
    if (source.dataType != kDataTypeOf<std::int32_t>) {
      throw HostError(kExitFailed, GetSource().file + ": labels are of type Int32");
    }
    AttributePlaces places;
    for (std::size_t i = 0; i < files_.size(); ++i) {
      const auto& returns = opened.Find(String(fmt::format("file{}", i))).returns;
      AddColumns(files_[i], ParseValue<unsigned>(returns.Find("Bands")),
                 ParseValue<unsigned>(returns.Find("Attributes")), places);
    }
    if (!rules_.empty()) {
      ruleFile_ = ReadRules(rules_, places);
      classes_ = ruleFile_.classes;
    } else {
      ChooseAttributes(places);
      FindExamples(session, URIOf(opened, "$source"));
    }
    if (classes_.size() > kMostClasses) {
      throw HostError(kExitFailed, fmt::format("there are {} classes; a map has {} at most",
                                               classes_.size(), kMostClasses));
    }
    RasterInfo planned = source;
    planned.bands = 1;
    planned.dataType = kDataTypeOf<std::uint8_t>;
    return planned;
  }

  static void AddColumns(const std::string& file, unsigned bands, unsigned attributes,
                         AttributePlaces& places) {
    AttributeKind kind{};
    std::vector<std::string> columns;
    if (!FindKind(file, attributes, kind)) {
      throw HostError(kExitFailed, file + ": its attributes have no names");
    }
    const auto names = NamesOf(kind);
    for (unsigned band = 0; band < bands; ++band) {
      for (unsigned i = 0; i < attributes; ++i) {
        columns.push_back(i < names.size() ? ColumnName(kind, names[i], band) : std::string());
      }
    }
    places.AddFile(columns, attributes);
  }

  void ChooseAttributes(const AttributePlaces& places) {
    std::vector<AttributePlaces::Place> chosen;
    for (const std::string& name : SplitAtCommas(use_)) {
      chosen.push_back(places.Find(name, "--use"));
    }
    if (chosen.empty()) chosen = places.All();
    used_.Resize(ArrayDims(static_cast<unsigned>(chosen.size()), 3));
    unsigned at = 0;
    for (const auto& place : chosen) {
      used_[at++] = place.file;
      used_[at++] = place.attribute;
      used_[at++] = place.band;
    }
  }

  void AddExampleStep(JobDraft& draft, const String& labels) const {
    const LayerName samples = SplitLayer(training_);
    JobWriterCommand& find = draft.Step(kExampleStep, "FindClassExamplesCommand");
    find.AddVariableInput("LabelURI", labels);
    find.AddInput("Vectors", String(AbsoluteName(samples.file)));
    find.AddInput("ClassField", String(field_));
    find.AddOutput("ExampleDefinition", "$examples");
    if (!samples.layer.empty()) find.AddInput("Layer", String(samples.layer));
  }

  /// Finds the examples in advance, to know the classes.
  void FindExamples(JobSession& session, const String& labels) {
    JobDraft draft;
    AddExampleStep(draft, labels);
    const JobResults results = session.Run(draft);
    const auto& returns = results.Find(kExampleStep).returns;
    for (const String& name : ParseValue<Array<String>>(returns.Find("Classes"))) {
      const auto index = static_cast<unsigned>(classes_.size());
      classes_.push_back({name.ToUTF8(), ColorOfClass(index), 0});
    }
    const auto counts = ParseValue<Array<unsigned>>(returns.Find("Counts"));
    for (std::size_t i = 0; i < classes_.size(); ++i) {
      if (counts[i] == 0) {
        throw HostError(kExitFailed, SplitLayer(training_).file + ": class \"" +
                                         Printable(classes_[i].name) + "\" hits no region");
      }
    }
    const auto outside = ParseValue<unsigned>(returns.Find("Outside"));
    const auto conflicts = ParseValue<unsigned>(returns.Find("Conflicts"));
    if (outside != 0) Say(fmt::format("{}: {} samples hit no region", training_, outside));
    if (conflicts != 0) {
      Say(fmt::format(
          "{}: {} regions are hit by samples of several classes; each is taken for that "
          "of most pixels",
          training_, conflicts));
    }
  }

  const char* GetKeptDetails() const override { return "Told"; }
  FillValues GetNoData(const FillValues& /*chosen*/) const override {
    return {static_cast<double>(classes_.size() + 1)};
  }
  bool MayChooseNoData() const override { return false; }
  const char* GetFirstStep() const override { return kScoreStep; }

  void AddToCreate(JobDraft& draft, JobWriterCommand& create) const override {
    create.AddInput("DataType", DataTypeName(kDataTypeOf<std::uint8_t>));
    create.AddInput("Bands", 1U);
    Palette palette;
    palette.Append(Color(String("none"), 0, 0, 0));
    std::string names = "unclassified";
    for (const NamedClass& one : classes_) {
      palette.Append(one.color);
      std::string name = one.name;
      std::replace(name.begin(), name.end(), '|', '/');  // which parts texts of a list
      names += "|" + name;
    }
    create.AddInput("Categories", String(names));
    JobWriterCommand& set = draft.Step("palette", "SetRasterPaletteCommand");
    set.AddInput("URI", String("$target"));
    set.AddInput("Band", 0U);
    set.AddInput("Palette", palette);
  }

  static std::string ListOf(const std::vector<std::string>& files) {
    std::string list;
    for (const std::string& file : files) {
      if (!list.empty()) list += '|';
      list += AbsoluteName(file);
    }
    return list;
  }

  std::vector<std::string> GetLeftovers() const override {
    std::vector<std::string> endings;
    if (scores_.empty()) endings.push_back(kScoresEnding);
    for (std::size_t i = 0; i < files_.size(); ++i) endings.push_back(StatisticsEnding(i));
    return endings;
  }
  static std::string StatisticsEnding(std::size_t file) { return fmt::format(".{}.fxas", file); }

  void AddMaking(JobDraft& draft, const Making& making) const override {
    const String scores(AbsoluteName(making.file + kScoresEnding));
    if (rules_.empty()) {
      AddNearest(draft, making, scores);
    } else {
      AddRules(draft, scores);
    }
    JobWriterCommand& paint = draft.Step(kMakeStep, "FxCreateRegionClassificationRasterCommand");
    paint.AddVariableInput("LabelURI", making.shown);
    paint.AddInput("ClassFXC", scores);
    paint.AddVariableInput("OutURI", "$target");
  }

  void AddRules(JobDraft& draft, const String& scores) const {
    JobWriterCommand& score = draft.Step(kScoreStep, "FxComputeFuzzyClassificationCommand");
    score.AddInput("ClassDefinition", ruleFile_.classRows);
    score.AddInput("RuleDefinition", ruleFile_.ruleRows);
    score.AddInput("AttributesFXA", String(ListOf(files_)));
    score.AddInput("AttributeDefinition", ruleFile_.testRows);
    Array<unsigned> all{ArrayDims(1)};
    all[0] = 0xFFFFFFFF;
    score.AddInput("LabelValues", all);
    score.AddInput("ClassFXC", scores);
  }

  void AddNearest(JobDraft& draft, const Making& making, const String& scores) const {
    AddExampleStep(draft, making.shown);
    std::vector<std::string> statistics;
    for (std::size_t i = 0; i < files_.size(); ++i) {
      statistics.push_back(AbsoluteName(making.file + StatisticsEnding(i)));
      JobWriterCommand& stats =
          draft.Step(fmt::format("stats{}", i), "FxComputeAttributesStatsCommand");
      stats.AddInput("AttributeFXA", String(AbsoluteName(files_[i])));
      stats.AddInput("StatsFXAS", String(statistics.back()));
    }
    JobWriterCommand& score = draft.Step(kScoreStep, "FxComputeKNNClassificationCommand");
    score.AddVariableInput("ExampleDefinition", "$examples");
    score.AddInput("Neighbors", neighbors_);
    score.AddInput("AttributesFXA", String(ListOf(files_)));
    score.AddInput("StatsFXAS", String(ListOf(statistics)));
    score.AddInput("AttributeDefinition", used_);
    score.AddInput("ClassFXC", scores);
    score.AddInput("Scores", String("Votes"));
  }

  RasterContents ReadWanted(const JobResults& results) const override {
    RasterContents wanted = ReadContents(results, kShown);
    wanted.info.dataType = kDataTypeOf<std::uint8_t>;
    wanted.info.bands = 1;
    wanted.details.clear();
    return wanted;
  }

  void Compare(MadeRaster& raster, Losses& losses) const override {
    raster.put.info.hasNoData = raster.made.info.hasNoData;
    raster.isFilled = true;
    CompareKept(raster, losses);
    const auto isNamed = [](const std::string& detail) {
      return detail.find("/Categories=") != detail.npos;
    };
    if (std::none_of(raster.made.details.begin(), raster.made.details.end(), isNamed)) {
      losses.Add("the names of the classes");
    }
    if (!raster.made.info.hasPalette[0]) losses.Add("the colours of the classes");
  }

  void AddFurther(JobDraft& draft, const TargetPlace& made,
                  const std::vector<std::string>& files) const override {
    if (polygons_.empty()) return;
    AddOpen(draft, "map", {made.file, made.format});
    JobWriterCommand& polygons = draft.Step("polygons", "PolygonizeCommand");
    polygons.AddVariableInput("URI", "$map");
    polygons.AddInput("Vectors", String(files.front()));
    polygons.AddInput("Field", String("class"));
    draft.Close("close.map", "$map");
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    RasterVerb::Make(session, outputs);
    if (scores_.empty()) return;
    const OutputFile& kept = outputs.Get(GetOutputs().size() - 1);
    std::filesystem::rename(outputs.Get(0).GetWorkName() + kScoresEnding, kept.GetWorkName());
  }

  static constexpr const char* kScoresEnding = ".fxc";

  std::vector<std::string> attributes_;
  std::string rules_, training_, field_, use_, polygons_, scores_;
  unsigned neighbors_ = 5;

  std::vector<std::string> files_;  // of attributes
  std::vector<NamedClass> classes_;
  RuleFile ruleFile_;
  Array<unsigned> used_;  // rows of file, attribute and band
};

const VerbRegistration registration("classify", "Gives the regions of a label raster classes",
                                    &SetUp<ClassifyVerb>);

}  // namespace
}  // namespace lumo::host
