#include <algorithm>
#include <filesystem>
#include <iostream>
#include <limits>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "fx/attribute_names.h"
#include "fx/region_kinds.h"
#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "rasters/accuracy_report.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"
#include "rasters/recipe.h"
#include "rasters/shape_options.h"
#include "rasters/stages.h"

namespace lumo::host {
namespace {

constexpr const char* kMakeStep = "make";

/// The columns of a file of attributes.
struct Columns {
  std::vector<std::string> names;
  unsigned attributes = 0;
};

Columns ColumnsOf(const AttributeFile& file, const AttributeRequest& request) {
  const std::string input = file.input;
  if (input == "SpatialFXA") {
    Columns columns{{}, SpatialRegionAttributes::kAttributes};
    for (const AttributeName& name : NamesOf(AttributeKind::kShape)) {
      columns.names.emplace_back(name.name);
    }
    columns.names.resize(columns.attributes);  // the mark of presence has no name
    return columns;
  }
  const AttributeKind kind = input == "TextureFXA"   ? AttributeKind::kTexture
                             : input == "EntropyFXA" ? AttributeKind::kEntropy
                                                     : AttributeKind::kSpectral;
  Columns columns{{}, static_cast<unsigned>(NamesOf(kind).size())};
  if (input == "IndexFXA") {
    for (const std::string& index : request.indices) {
      for (const AttributeName& name : NamesOf(kind)) {
        columns.names.push_back(fmt::format("{}_{}", name.name, IndexName(index)));
      }
    }
    return columns;
  }
  for (const unsigned band : request.bands) {
    for (const AttributeName& name : NamesOf(kind)) {
      columns.names.push_back(ColumnName(kind, name, band));
    }
  }
  return columns;
}

class AnalyzeVerb final {
 public:
  explicit AnalyzeVerb(OptionSet& line) {
    scene_.AddTo(line);
    line.AddNote(
        "A scene becomes a map of classes by a recipe: calibrated.tif where the recipe calibrates, "
        "segments.tif, segments.tree where the recipe keeps it, the files attributes.*, "
        "classes.tif, polygons, and accuracy.json, each when "
        "it is whole. A run that broke goes on from the files that are there; what a changed "
        "recipe "
        "makes anew is replaced with --overwrite. --print-job shows all as one document.");
    line.AddNote(
        "--init prints a recipe to start from: with samples when --training names them, else with "
        "rules. docs/classification.md tells what a recipe may hold.");
    line.AddExample("vexg analyze --init scene.tif --training fields.gpkg --class-field crop");
    line.AddExample("vexg analyze scene.tif --recipe recipe.json -o results");
    line.Add("--recipe", recipeFile_, "How the scene is analyzed, as JSON").IsFile("RECIPE.json");
    line.Add("--output,-o", folder_, "The folder of the results; made when it isn't there")
        .Shows("DIR");
    line.Add("--init", isInit_, "Print a recipe to start from");
    line.Add("--training", training_, "With --init: samples of known classes")
        .Shows("SAMPLES[:LAYER]");
    line.Add("--class-field", field_, "With --init: the field with the class of a sample")
        .Shows("FIELD");
    line.Add("--reference", reference_,
             "With --init: samples to compare the map with, of the same field; those of --training "
             "by default")
        .Shows("SAMPLES[:LAYER]");
    line.Add("--overwrite", overwrite_, "Replace results of other settings");
  }

  void AddLastOptions(OptionSet& line) {
    AddDurableTo(line, isDurable_);
    job_.AddTo(line);
    job_.AddProgressTo(line);
  }

  int Run() {
    const auto refuse = [](const std::string& line) { throw HostError(kExitUsage, line); };
    if (training_.empty() != field_.empty()) refuse("--training and --class-field go together");
    if (!reference_.empty() && training_.empty()) refuse("--reference goes with --training");
    if (isInit_) {
      if (!recipeFile_.empty() || !folder_.empty()) refuse("--init goes with no --recipe and -o");
      return Init();
    }
    if (!training_.empty()) refuse("--training goes with --init; the recipe names samples");
    if (recipeFile_.empty()) refuse("--recipe is required");
    if (folder_.empty()) refuse("--output is required");
    recipe_ = ReadRecipe(recipeFile_);
    Plan();
    const std::vector<Stage> stages = MakeStages();
    if (job_.printJob) {
      std::cout << JoinStages(stages).Write().ToUTF8() << '\n';
      return kExitSuccess;
    }
    std::error_code fault;
    std::filesystem::create_directory(folder_, fault);
    if (fault) throw HostError(kExitFailed, folder_ + ": can't be made: " + fault.message());
    StageRunner runner({job_, overwrite_, isDurable_}, InFolder("analysis.json"));
    runner.Check(stages);
    for (const Stage& stage : stages) runner.Run(stage);
    if (!recipe_.check.file.empty()) ShowReport();
    return kExitSuccess;
  }

 private:
  std::string InFolder(const std::string& name) const {
    return (std::filesystem::path(folder_) / name).string();
  }

  // A recipe to start from.

  int Init() {
    JobDraft draft;
    AddOpen(draft, "source", scene_);
    AddQuery(draft, "source", "$source");
    if (training_.empty()) {
      draft.Step("stats", "GetBasicRasterStatsCommand").AddVariableInput("URI", "$source");
    } else {
      AddSampleQuery(draft, kSamples, {training_, field_});
    }
    JobSession session(job_);
    const JobResults results = session.Run(draft);
    Json recipe{{"segment", {{"segmentPercent", 20}, {"mergePercent", 85}}},
                {"attributes", {{"spectral", true}, {"shape", true}}}};
    if (training_.empty()) {
      const double mean = ParseValue<Array<double>>(results.Find("stats").returns.Find("Mean"))[0];
      const auto rule = [&](const char* name, const char* test) {
        return Json{{"class", name},
                    {"tests", Json::array({{{"attribute", "mean_b0"}, {test, mean}}})}};
      };
      recipe["classify"] = {
          {"rules",
           {{"classes", Json::array({{{"name", "dark"}, {"color", "#204060"}},
                                     {{"name", "bright"}, {"color", "#e0c080"}}})},
            {"rules", Json::array({rule("dark", "atMost"), rule("bright", "atLeast")})}}}};
    } else {
      Json colors = Json::object();
      unsigned index = 0;
      for (const String& name : SampleClasses(results, kSamples)) {
        const Color color = ColorOfClass(index++);
        colors[name.ToUTF8()] = fmt::format("#{:02x}{:02x}{:02x}", color.r, color.g, color.b);
      }
      Json means = Json::array();
      for (unsigned band = 0; band < ReadInfo(results, "source").bands; ++band) {
        means.push_back(fmt::format("mean_b{}", band));
      }
      recipe["classify"] = {{"samples", AbsoluteName(training_)},
                            {"field", field_},
                            {"method", "knn"},
                            {"neighbors", 3},
                            {"use", means},
                            {"colors", colors}};
      const std::string& check = reference_.empty() ? training_ : reference_;
      recipe["accuracy"] = {{"samples", AbsoluteName(check)}, {"field", field_}};
    }
    recipe["polygons"] = "classes.gpkg";
    std::cout << recipe.dump(2) << '\n';
    return kExitSuccess;
  }

  static constexpr const char* kSamples = "samples";
  static constexpr const char* kCheck = "check";
  static void AddSampleQuery(JobDraft& draft, const char* step, const SampleSet& samples) {
    AddSamples(draft.Step(step, "QueryClassSamplesCommand"), samples);
  }
  static Array<String> SampleClasses(const JobResults& results, const char* step) {
    return ParseValue<Array<String>>(results.Find(step).returns.Find("Classes"));
  }

  // The plan and its stages.

  /// Looks at the scene, and at what the recipe names.
  void Plan() {
    JobDraft draft;
    AddOpen(draft, "source", scene_);
    AddQuery(draft, "source", "$source");
    if (recipe_.calibration && !recipe_.calibration->metadata.empty()) {
      const CalibrationRequest& calibration = *recipe_.calibration;
      AddConstants(draft, calibration, ParseMetadataSource(calibration.metadata), "$source");
    }
    const bool hasSamples = !recipe_.rules.has_value();
    if (hasSamples) AddSampleQuery(draft, kSamples, recipe_.classes.samples);
    const bool isChecked = !recipe_.check.file.empty();
    if (isChecked) AddSampleQuery(draft, kCheck, recipe_.check);
    JobSession session(job_);
    const JobResults results = session.Run(draft);
    info_ = ReadInfo(results, "source");
    if (recipe_.calibration) PlanCalibration(results);
    segmentBands_ = BandsOf(recipe_.segmentBands, info_.bands);
    AttributeRequest& attributes = recipe_.attributes;
    attributes.hasBands = recipe_.attributeBands.has_value();
    attributes.bands = BandsOf(recipe_.attributeBands, info_.bands);
    attributes.TakePixelSize(info_.geoRef);
    PlanClasses(hasSamples ? SampleClasses(results, kSamples) : Array<String>());
    if (isChecked) CheckKnown(SampleClasses(results, kCheck));
  }

  void PlanCalibration(const JobResults& results) {
    CalibrationRequest& calibration = *recipe_.calibration;
    try {
      calibration.RefuseUseless();
      if (!calibration.metadata.empty()) {
        for (const std::string& line : TakeConstants(calibration, results)) Say(line);
      }
      calibration.CheckConstants();
    } catch (const HostError& error) {
      throw HostError(error.code, recipe_.calibrationPlace + ": " + error.what());
    }
  }

  void PlanClasses(const Array<String>& names) {
    ClassRequest& request = recipe_.classes;
    AttributePlaces places;
    for (const AttributeFile& file : FilesOf(recipe_.attributes, InFolder("attributes"))) {
      const Columns columns = ColumnsOf(file, recipe_.attributes);
      places.AddFile(columns.names, columns.attributes);
      request.files.push_back(file.file);
    }
    if (recipe_.rules) {
      request.rules = ReadRules(*recipe_.rules, places);
      request.classes = request.rules.classes;
    } else {
      const std::string where = recipe_.use ? recipe_.use->Where() : recipeFile_;
      request.used = RowsOf(recipe_.used, where, places);
      for (unsigned i = 0; i < names.GetCount(); ++i) {
        request.classes.push_back({names[i].ToUTF8(), ColorOfClass(i), 0});
      }
      for (const auto& [name, color] : recipe_.colors) ColorClass(name, color);
    }
    if (request.classes.size() > kMostClasses) {
      throw HostError(kExitFailed, fmt::format("{}: there are {} classes; a map has {} at most",
                                               recipeFile_, request.classes.size(), kMostClasses));
    }
  }

  /// Refuses samples to compare with of classes that the map can't have.
  void CheckKnown(const Array<String>& names) const {
    const auto& classes = recipe_.classes.classes;
    for (const String& name : names) {
      const std::string text = name.ToUTF8();
      if (std::any_of(classes.begin(), classes.end(),
                      [&](const NamedClass& one) { return one.name == text; })) {
        continue;
      }
      throw HostError(kExitUsage,
                      fmt::format("{}: accuracy: a sample is of class \"{}\", which the map lacks",
                                  recipeFile_, Printable(text)));
    }
  }

  void ColorClass(const std::string& name, const JsonField& color) {
    for (NamedClass& one : recipe_.classes.classes) {
      if (one.name != name) continue;
      one.color = color.AsColor();
      return;
    }
    color.Refuse("no sample is of this class");
  }

  std::string Calibrated() const { return InFolder("calibrated.tif"); }
  std::string Segments() const { return InFolder("segments.tif"); }
  std::vector<std::string> SegmentFiles() const {
    if (!recipe_.keepsTree) return {Segments()};
    return {Segments(), InFolder("segments.tree")};
  }
  std::string Classes() const { return InFolder("classes.tif"); }

  /// The scene as it is analyzed.
  SourceOptions Source() const {
    if (!recipe_.calibration) return scene_;
    return {AbsoluteName(Calibrated()), format_};
  }
  std::string SourceFile() const { return recipe_.calibration ? Calibrated() : FileOf(scene_); }

  /// The part of the recipe of this name; null for none.
  static Json PartOf(const Json& recipe, const char* name) {
    return recipe.contains(name) ? recipe.at(name) : Json();
  }

  std::vector<Stage> MakeStages() {
    TargetOptions target;
    target.output = Classes();
    format_ = ChooseFormat(target);
    const Json recipe = JsonFile(recipeFile_).GetRoot().GetJson();
    std::vector<Stage> stages;
    if (recipe_.calibration) {
      stages.push_back({"calibrated",
                        {Calibrated()},
                        {FileOf(scene_)},
                        PartOf(recipe, "calibrate"),
                        [this](JobDraft& draft, const auto& files) { AddCalibrated(draft, files); },
                        CheckTarget});
      if (!recipe_.calibration->metadata.empty()) {
        stages.back().inputs.push_back(recipe_.calibration->metadata);
      }
    }
    stages.push_back({"segments",
                      SegmentFiles(),
                      {SourceFile()},
                      PartOf(recipe, "segment"),
                      [this](JobDraft& draft, const auto& files) { AddSegments(draft, files); },
                      CheckTarget});
    Stage attributes{"attributes",
                     recipe_.classes.files,
                     {SourceFile(), Segments()},
                     PartOf(recipe, "attributes"),
                     [this](JobDraft& draft, const auto& files) { AddRegions(draft, files); }};
    stages.push_back(attributes);
    stages.push_back(MakeClasses(PartOf(recipe, "classify")));
    if (!recipe_.polygons.empty()) {
      const std::string polygons = InFolder(recipe_.polygons);
      stages.push_back({"polygons",
                        {polygons, StyleNameOf(polygons)},
                        {Classes()},
                        PartOf(recipe, "classify"),
                        [this](JobDraft& draft, const auto& files) { AddPolygons(draft, files); }});
    }
    if (!recipe_.check.file.empty()) stages.push_back(MakeAccuracy(PartOf(recipe, "accuracy")));
    return stages;
  }

  static void CheckTarget(const JobResults& results, const Outputs& /*outputs*/) {
    CheckClosed(results);
  }

  /// Where a raster of so many bands is made.
  TargetPlace PlaceOf(const std::string& file, unsigned bands) const {
    RasterInfo made = info_;
    made.bands = bands;
    return {file, format_, ChooseCreation({}, format_, made, "Nearest")};
  }

  void AddCalibrated(JobDraft& draft, const std::vector<std::string>& files) const {
    AddOpen(draft, "source", scene_);
    const std::vector<double> none(info_.bands, std::numeric_limits<double>::quiet_NaN());
    JobWriterCommand& create =
        AddCreate(draft, PlaceOf(files[0], info_.bands), "$source", "Names", none);
    create.AddInput("DataType", DataTypeName(recipe_.calibration->TypeCode()));
    AddCalibration(draft, kMakeStep, *recipe_.calibration, "$source", info_.bands);
    AddCloseTarget(draft);
    draft.Close("close", "$source");
  }

  void AddSegments(JobDraft& draft, const std::vector<std::string>& files) const {
    AddOpen(draft, "source", Source());
    const bool hasSome = recipe_.segmentBands.has_value();
    if (hasSome) AddBandView(draft, "bands", "$source", segmentBands_);
    const String shown = hasSome ? "$bands" : "$source";
    AddLabels(AddCreate(draft, PlaceOf(files[0], 1), shown, "Told", {0.0}), recipe_.segments);
    SegmentRequest request = recipe_.segments;
    if (recipe_.keepsTree) request.tree = files[1];
    AddFit(draft, request, {shown, shown});
    AddSegment(draft, kMakeStep, request, {shown, shown});
    AddCloseTarget(draft);
    if (hasSome) draft.Close("close.bands", "$bands");
    draft.Close("close", "$source");
  }

  void AddRegions(JobDraft& draft, const std::vector<std::string>& names) const {
    AddOpen(draft, "source", Source());
    AddOpen(draft, "labels", {AbsoluteName(Segments()), format_});
    std::vector<AttributeFile> files = FilesOf(recipe_.attributes, "attributes");
    for (std::size_t i = 0; i < files.size(); ++i) files[i].file = names[i];
    AddAttributes(draft, recipe_.attributes, {"$source", "$labels"}, files, "");
    draft.Close("close.labels", "$labels");
    draft.Close("close", "$source");
  }

  Stage MakeClasses(const Json& settings) const {
    Stage stage{"classes",
                {Classes(), InFolder("scores.fxa")},
                {Segments()},
                settings,
                [this](JobDraft& draft, const auto& files) { AddMap(draft, files); },
                [this](const JobResults& results, const Outputs& /*outputs*/) {
                  CheckClosed(results);
                  if (recipe_.classes.HasRules()) return;
                  std::vector<std::string> said;
                  TakeClasses(results, recipe_.classes.samples, said);
                  for (const std::string& line : said) Say(line);
                }};
    for (const std::string& file : recipe_.classes.files) {
      stage.inputs.push_back(file);
      if (!recipe_.classes.HasRules()) stage.outputs.push_back(file + "s");
    }
    if (!recipe_.classFile.empty()) stage.inputs.push_back(recipe_.classFile);
    return stage;
  }

  /// @param files  the map, the scores, and the statistics of the files of attributes.
  void AddMap(JobDraft& draft, const std::vector<std::string>& files) const {
    const ClassRequest& request = recipe_.classes;
    AddOpen(draft, "labels", {AbsoluteName(Segments()), format_});
    const double noData = static_cast<double>(request.classes.size()) + 1;
    AddClasses(draft, AddCreate(draft, PlaceOf(files[0], 1), "$labels", "Told", {noData}),
               request.classes);
    AddScores(draft, request, "$labels", {files[1], {files.begin() + 2, files.end()}});
    AddPainting(draft, kMakeStep, "$labels", files[1]);
    AddCloseTarget(draft);
    draft.Close("close.labels", "$labels");
  }

  void AddPolygons(JobDraft& draft, const std::vector<std::string>& files) const {
    AddOpen(draft, "map", {AbsoluteName(Classes()), format_});
    AddClassPolygons(draft, "$map", files[0], files[1], recipe_.classes.classes);
    draft.Close("close.map", "$map");
  }

  Stage MakeAccuracy(const Json& settings) const {
    return {"accuracy",
            {InFolder("accuracy.json")},
            {Classes(), SplitLayer(recipe_.check.file).file},
            settings,
            [this](JobDraft& draft, const auto& /*files*/) {
              AddOpen(draft, "map", {AbsoluteName(Classes()), format_});
              AddComparison(draft, "$map", recipe_.check);
              draft.Close("close.map", "$map");
            },
            [](const JobResults& results, const Outputs& outputs) {
              const AccuracyReport report(results.Find(kCompareStep).returns);
              const std::string text = report.AsJson().dump(2) + "\n";
              FileWriter writer(outputs.Get(0));
              writer.Write(text.data(), text.size());
              writer.Close();
            }};
  }

  void ShowReport() const {
    const AccuracyReport report(JsonFile(InFolder("accuracy.json")).GetRoot().GetJson());
    std::cout << report.AsText();
  }

  SourceOptions scene_;
  RasterJobOptions job_;
  std::string recipeFile_, folder_, training_, reference_, field_;
  bool isInit_ = false, overwrite_ = false, isDurable_ = false;

  Recipe recipe_;
  RasterInfo info_;
  Array<unsigned> segmentBands_;
  std::string format_;
};

const VerbRegistration analyzeRegistration("analyze",
                                           "Makes a map of classes out of a scene by a recipe",
                                           &SetUp<AnalyzeVerb>);

}  // namespace
}  // namespace lumo::host
