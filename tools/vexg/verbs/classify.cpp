#include <algorithm>
#include <filesystem>
#include <optional>

#include <fmt/format.h>

#include "options/option_values.h"
#include "platform/file_moves.h"
#include "raster/pixel_types.h"
#include "rasters/class_steps.h"
#include "rasters/raster_target.h"
#include "rasters/raster_verb.h"
#include "rasters/shape_options.h"

namespace lumo::host {
namespace {

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
    line.Add("--method", request_.method,
             "How samples make classes: knn, the votes of the nearest examples; pca, linear "
             "discriminants of the principal components of the attributes")
        .Takes(OneOf({"knn", "pca"}))
        .ShowsDefault();
    line.Add("--neighbors", neighbors_, "With knn, how many examples vote; 5 by default")
        .Within(1, 1000000);
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
    if (!rules_.empty() && request_.method != "knn") refuse("--method goes with --training");
    if (neighbors_ && (!rules_.empty() || request_.method != "knn")) {
      refuse("--neighbors goes with --training by knn");
    }
    request_.neighbors = neighbors_.value_or(request_.neighbors);
    request_.samples = {training_, field_};
    FindFiles();
    RasterVerb::CheckOptions();
  }

  /// Finds the files behind the names that --attributes gives.
  void FindFiles() {
    std::error_code ignored;
    for (const std::string& name : attributes_) {
      if (std::filesystem::is_regular_file(name, ignored)) {
        request_.files.push_back(name);
        continue;
      }
      const std::size_t before = request_.files.size();
      for (const char* const kind : {"spectral", "texture", "shape"}) {
        const std::string file = name + "." + kind + ".fxa";
        if (std::filesystem::is_regular_file(file, ignored)) request_.files.push_back(file);
      }
      if (request_.files.size() == before) {
        throw HostError(kExitFailed, name + ": there are no attributes of this name");
      }
    }
  }

  std::vector<std::string> GetFurtherInputs() const override {
    std::vector<std::string> inputs = request_.files;
    if (!rules_.empty()) inputs.push_back(rules_);
    if (!training_.empty()) inputs.push_back(SplitLayer(training_).file);
    return inputs;
  }
  std::vector<std::string> GetFurtherOutputs() const override {
    std::vector<std::string> outputs;
    if (!polygons_.empty()) {
      outputs.push_back(polygons_);
      outputs.push_back(StyleNameOf(polygons_));
    }
    if (!scores_.empty()) outputs.push_back(scores_);
    return outputs;
  }

  void AddQuestions(JobDraft& draft) const override {
    for (std::size_t i = 0; i < request_.files.size(); ++i) {
      draft.Step(fmt::format("file{}", i), "QueryAttributesCommand")
          .AddInput("AttributeFXA", String(AbsoluteName(request_.files[i])));
    }
  }

  std::string GetOverviewMethod() const override { return "Nearest"; }

  RasterInfo PlanRaster(JobSession& session, const JobResults& opened,
                        const RasterInfo& source) override {
    if (source.dataType != kDataTypeOf<std::int32_t>) {
      throw HostError(kExitFailed, GetSource().file + ": labels are of type Int32");
    }
    AttributePlaces places;
    std::uint64_t records = 0;
    for (std::size_t i = 0; i < request_.files.size(); ++i) {
      const auto& returns = opened.Find(String(fmt::format("file{}", i))).returns;
      const auto count = ParseValue<std::uint64_t>(returns.Find("Records"));
      if (i == 0) records = count;
      if (count != records) {
        throw HostError(
            kExitFailed,
            fmt::format("{}: it has {} regions, and {} has {}: they are of other labels",
                        request_.files[i], count, request_.files[0], records));
      }
      AddColumns(request_.files[i], ParseValue<unsigned>(returns.Find("Bands")),
                 ParseValue<unsigned>(returns.Find("Attributes")), places);
    }
    if (request_.HasRules()) {
      request_.rules = ReadRules(JsonFile(rules_).GetRoot(), places);
      request_.classes = request_.rules.classes;
    } else {
      request_.used = RowsOf(SplitAtCommas(use_), "--use", places);
      FindExamples(session, URIOf(opened, "$source"));
    }
    if (request_.classes.size() > kMostClasses) {
      throw HostError(kExitFailed, fmt::format("there are {} classes; a map has {} at most",
                                               request_.classes.size(), kMostClasses));
    }
    RasterInfo planned = source;
    planned.bands = 1;
    planned.dataType = kDataTypeOf<std::uint8_t>;
    return planned;
  }

  /// Finds the examples in advance, to know the classes.
  void FindExamples(JobSession& session, const String& labels) {
    JobDraft draft;
    AddExamples(draft, request_.samples, labels);
    std::vector<std::string> said;
    request_.classes = TakeClasses(session.Run(draft), request_.samples, said);
    for (const std::string& line : said) Say(line);
  }

  const char* GetKeptDetails() const override { return "Told"; }
  FillValues GetNoData(const FillValues& /*chosen*/) const override {
    return {static_cast<double>(request_.classes.size() + 1)};
  }
  bool MayChooseNoData() const override { return false; }
  const char* GetFirstStep() const override { return kScoreStep; }

  void AddToCreate(JobDraft& draft, JobWriterCommand& create) const override {
    AddClasses(draft, create, request_.classes);
  }

  std::vector<std::string> GetLeftovers() const override {
    std::vector<std::string> endings;
    if (scores_.empty()) endings.push_back(kScoresEnding);
    for (std::size_t i = 0; i < request_.files.size(); ++i) endings.push_back(StatisticsEnding(i));
    return endings;
  }
  static std::string StatisticsEnding(std::size_t file) { return fmt::format(".{}.fxas", file); }

  void AddMaking(JobDraft& draft, const Making& making) const override {
    ScoreFiles files{making.file + kScoresEnding, {}};
    for (std::size_t i = 0; i < request_.files.size(); ++i) {
      files.statistics.push_back(making.file + StatisticsEnding(i));
    }
    AddScores(draft, request_, making.shown, files);
    AddPainting(draft, kMakeStep, making.shown, files.scores);
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
    AddClassPolygons(draft, "$map", files[0], files[1], request_.classes);
    draft.Close("close.map", "$map");
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    RasterVerb::Make(session, outputs);
    if (scores_.empty()) return;
    const OutputFile& kept = outputs.Get(GetOutputs().size() - 1);
    std::string why;
    if (platform::RenameFile(outputs.Get(0).GetWorkName() + kScoresEnding, kept.GetWorkName(),
                             &why)) {
      return;
    }
    throw HostError(kExitFailed, kept.GetShownName() + ": can't be written: " + why);
  }

  static constexpr const char* kScoresEnding = ".fxc";

  std::vector<std::string> attributes_;
  std::string rules_, training_, field_, use_, polygons_, scores_;
  std::optional<unsigned> neighbors_;

  ClassRequest request_;
};

const VerbRegistration classifyRegistration("classify",
                                            "Gives the regions of a label raster classes",
                                            &SetUp<ClassifyVerb>);

}  // namespace
}  // namespace lumo::host
