#include "rasters/class_steps.h"

#include <algorithm>
#include <filesystem>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "fx/attribute_names.h"
#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "rasters/raster_source.h"
#include "rasters/shape_options.h"
#include "verb.h"

namespace lumo::host {
namespace {

String ListOf(const std::vector<std::string>& files) {
  std::string list;
  for (const std::string& file : files) {
    if (!list.empty()) list += '|';
    list += AbsoluteName(file);
  }
  return String(list);
}

/// The names of classes as a list, behind that of pixels without one.
String NameList(const std::vector<NamedClass>& classes) {
  std::string names = "unclassified";
  for (const NamedClass& one : classes) {
    std::string name = one.name;
    std::replace(name.begin(), name.end(), '|', '/');  // which parts texts of a list
    names += "|" + name;
  }
  return String(names);
}

Palette PaletteOf(const std::vector<NamedClass>& classes) {
  Palette palette;
  palette.Append(Color(String("none"), 0, 0, 0));
  for (const NamedClass& one : classes) palette.Append(one.color);
  return palette;
}

void AddRuleScores(JobDraft& draft, const ClassRequest& request, const String& scores) {
  JobWriterCommand& score = draft.Step(kScoreStep, "FxComputeFuzzyClassificationCommand");
  score.AddInput("ClassDefinition", request.rules.classRows);
  score.AddInput("RuleDefinition", request.rules.ruleRows);
  score.AddInput("AttributesFXA", ListOf(request.files));
  score.AddInput("AttributeDefinition", request.rules.testRows);
  Array<unsigned> all{ArrayDims(1)};
  all[0] = 0xFFFFFFFF;
  score.AddInput("LabelValues", all);
  score.AddInput("ClassFXC", scores);
}

}  // namespace

void AddColumns(const std::string& file, unsigned bands, unsigned attributes,
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

Array<unsigned> RowsOf(const std::vector<std::string>& names, const std::string& where,
                       const AttributePlaces& places) {
  std::vector<AttributePlaces::Place> chosen;
  for (const std::string& name : names) chosen.push_back(places.Find(name, where));
  if (chosen.empty()) chosen = places.All();
  Array<unsigned> rows{ArrayDims(static_cast<unsigned>(chosen.size()), 3)};
  unsigned at = 0;
  for (const auto& place : chosen) {
    rows[at++] = place.file;
    rows[at++] = place.attribute;
    rows[at++] = place.band;
  }
  return rows;
}

void AddSamples(JobWriterCommand& command, const SampleSet& samples) {
  const LayerName name = SplitLayer(samples.file);
  command.AddInput("Vectors", String(AbsoluteName(name.file)));
  command.AddInput("ClassField", String(samples.field));
  if (!name.layer.empty()) command.AddInput("Layer", String(name.layer));
}

void AddExamples(JobDraft& draft, const SampleSet& samples, const String& labels) {
  JobWriterCommand& find = draft.Step(kExampleStep, "FindClassExamplesCommand");
  find.AddVariableInput("LabelURI", labels);
  AddSamples(find, samples);
  find.AddOutput("ExampleDefinition", "$examples");
}

void AddScores(JobDraft& draft, const ClassRequest& request, const String& labels,
               const ScoreFiles& files) {
  const String scores(AbsoluteName(files.scores));
  if (request.HasRules()) return AddRuleScores(draft, request, scores);
  AddExamples(draft, request.samples, labels);
  for (std::size_t i = 0; i < request.files.size(); ++i) {
    JobWriterCommand& stats =
        draft.Step(fmt::format("stats{}", i), "FxComputeAttributesStatsCommand");
    stats.AddInput("AttributeFXA", String(AbsoluteName(request.files[i])));
    stats.AddInput("StatsFXAS", String(AbsoluteName(files.statistics[i])));
  }
  const auto addModel = [&](JobWriterCommand& step) {
    step.AddVariableInput("ExampleDefinition", "$examples");
    step.AddInput("AttributesFXA", ListOf(request.files));
    step.AddInput("StatsFXAS", ListOf(files.statistics));
    step.AddInput("AttributeDefinition", request.used);
  };
  if (request.method == "knn") {
    JobWriterCommand& score = draft.Step(kScoreStep, "FxComputeKNNClassificationCommand");
    addModel(score);
    score.AddInput("Neighbors", request.neighbors);
    score.AddInput("ClassFXC", scores);
    score.AddInput("Scores", String("Votes"));
    return;
  }
  constexpr std::pair<const char*, const char*> kModel[] = {
      {"PCACoefficients", "$coefficients"}, {"Weights", "$weights"}, {"Thresholds", "$thresholds"}};
  JobWriterCommand& fit = draft.Step("fit", "FitPCAModelCommand");
  addModel(fit);
  for (const auto& [part, variable] : kModel) fit.AddOutput(part, variable);
  JobWriterCommand& score = draft.Step(kScoreStep, "FxComputePCAClassificationCommand");
  addModel(score);
  for (const auto& [part, variable] : kModel) score.AddVariableInput(part, variable);
  score.AddInput("ClassFXC", scores);
}

void AddClasses(JobDraft& draft, JobWriterCommand& create, const std::vector<NamedClass>& classes) {
  create.AddInput("DataType", DataTypeName(kDataTypeOf<std::uint8_t>));
  create.AddInput("Bands", 1U);
  create.AddInput("Categories", NameList(classes));
  JobWriterCommand& set = draft.Step("palette", "SetRasterPaletteCommand");
  set.AddInput("URI", String("$target"));
  set.AddInput("Band", 0U);
  set.AddInput("Palette", PaletteOf(classes));
}

void AddPainting(JobDraft& draft, const char* step, const String& labels,
                 const std::string& scores) {
  JobWriterCommand& paint = draft.Step(step, "FxCreateRegionClassificationRasterCommand");
  paint.AddVariableInput("LabelURI", labels);
  paint.AddInput("ClassFXC", String(AbsoluteName(scores)));
  paint.AddVariableInput("OutURI", "$target");
}

void AddClassPolygons(JobDraft& draft, const String& map, const std::string& polygons,
                      const std::string& style, const std::vector<NamedClass>& classes) {
  JobWriterCommand& make = draft.Step("polygons", "PolygonizeCommand");
  make.AddVariableInput("URI", map);
  make.AddInput("Vectors", String(polygons));
  make.AddInput("Field", String("class"));
  JobWriterCommand& styling = draft.Step("style", "CreateClassStyleCommand");
  styling.AddInput("Style", String(style));
  styling.AddInput("Field", String("class"));
  styling.AddInput("Classes", NameList(classes));
  styling.AddInput("Palette", PaletteOf(classes));
}

std::string StyleNameOf(const std::string& polygons) {
  return std::filesystem::path(polygons).replace_extension(".qml").string();
}

std::vector<NamedClass> TakeClasses(const JobResults& results, const SampleSet& samples,
                                    std::vector<std::string>& said) {
  const std::string file = SplitLayer(samples.file).file;
  const auto& returns = results.Find(kExampleStep).returns;
  std::vector<NamedClass> classes;
  for (const String& name : ParseValue<Array<String>>(returns.Find("Classes"))) {
    const auto index = static_cast<unsigned>(classes.size());
    classes.push_back({name.ToUTF8(), ColorOfClass(index), 0});
  }
  const auto counts = ParseValue<Array<unsigned>>(returns.Find("Counts"));
  for (std::size_t i = 0; i < classes.size(); ++i) {
    if (counts[i] != 0) continue;
    throw HostError(kExitFailed, fmt::format("{}: class \"{}\" hits no region", file,
                                             Printable(classes[i].name)));
  }
  const auto outside = ParseValue<unsigned>(returns.Find("Outside"));
  const auto conflicts = ParseValue<unsigned>(returns.Find("Conflicts"));
  if (outside != 0) said.push_back(fmt::format("{}: {} samples hit no region", file, outside));
  if (conflicts != 0) {
    said.push_back(fmt::format(
        "{}: {} regions are hit by samples of several classes; each is taken for that of most "
        "pixels",
        file, conflicts));
  }
  return classes;
}

}  // namespace lumo::host
