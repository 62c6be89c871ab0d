#include "rasters/tree_steps.h"

#include <algorithm>
#include <cmath>
#include <filesystem>

#include <fmt/format.h>

#include "foundation/array.h"
#include "foundation/near_name.h"
#include "options/option_values.h"
#include "output/json_number.h"
#include "pictures/plot.h"
#include "rasters/raster_source.h"
#include "rasters/raster_target.h"
#include "verb.h"

namespace lumo::host {
namespace {

std::string StageOf(std::size_t level) {
  return fmt::format("level{}", level + 1);
}

}  // namespace

void AddTreeLabels(JobDraft& draft, const std::string& name, const TreeCutRequest& request) {
  JobWriterCommand& labels = draft.Open(name, "CreateTreeLabelsRasterCommand");
  labels.AddInput("Tree", String(AbsoluteName(request.tree)));
  if (request.mergeValue) labels.AddInput("MergeValue", *request.mergeValue);
  if (request.mergePercent) labels.AddInput("MergePercent", *request.mergePercent);
}

std::vector<std::string> TreeLevels::FilesOf(const std::string& name) const {
  std::filesystem::path stem(name);
  std::string ending = stem.extension().string();
  if (ending.empty()) {
    ending = ".tif";
  } else {
    stem.replace_extension();
  }
  std::vector<std::string> files;
  for (std::size_t level = 0; level < mergeValues.size(); ++level) {
    files.push_back(fmt::format("{}.{}{}", stem.string(), level + 1, ending));
  }
  files.push_back(stem.string() + ".csv");
  return files;
}

void TreeLevels::AddMaking(JobDraft& draft, const std::vector<std::string>& files,
                           const std::string& format) const {
  for (std::size_t level = 0; level < mergeValues.size(); ++level) {
    draft.SetStage(StageOf(level));
    AddTreeLabels(draft, "labels", {tree, mergeValues[level], {}});
    AddCreate(draft, {files[level], format}, "$labels", "Told", {0.0});
    JobWriterCommand& copy = draft.Step("copy", "CopyRasterCommand");
    copy.AddVariableInput("SrcURI", "$labels");
    copy.AddVariableInput("DstURI", "$target");
    AddCloseTarget(draft);
    draft.Close("close.labels", "$labels");
  }
  draft.SetStage("table");
  JobWriterCommand& table = draft.Step("parents", "CreateTreeLevelsTableCommand");
  table.AddInput("Tree", String(AbsoluteName(tree)));
  Array<double> values{ArrayDims(static_cast<unsigned>(mergeValues.size()))};
  std::copy(mergeValues.begin(), mergeValues.end(), values.begin());
  table.AddInput("MergeValues", values);
  table.AddInput("Table", String(AbsoluteName(files.back())));
}

void TreeLevels::CheckMade(const JobResults& results) const {
  for (std::size_t level = 0; level < mergeValues.size(); ++level) {
    CheckClosed(results, (StageOf(level) + "." + kCloseTargetStep).c_str());
  }
}

void AddSuggest(JobDraft& draft, const std::string& tree) {
  draft.Step(kSuggestStep, "SuggestSegmentScalesCommand")
      .AddInput("Tree", String(AbsoluteName(tree)));
}

ScaleCurve ScaleCurve::Read(const JobResults& results) {
  const auto& returns = results.Find(kSuggestStep).returns;
  const auto read = [&](const char* name) {
    const auto numbers = ParseValue<Array<double>>(returns.Find(name));
    return std::vector<double>(numbers.begin(), numbers.end());
  };
  return {read("MergeValues"), read("Segments"), read("LocalVariance"), read("Rates"),
          read("Peaks"),       read("Onsets"),   read("Prominences")};
}

std::string ScaleCurve::AsText() const {
  std::string text =
      "  merge cost     segments  local variance  rate (%)  prominence        onset\n";
  for (std::size_t i = 0; i < peaks.size(); ++i) {
    const auto found = std::find(mergeValues.begin(), mergeValues.end(), peaks[i]);
    if (found == mergeValues.end()) continue;
    const auto level = static_cast<std::size_t>(found - mergeValues.begin());
    text +=
        fmt::format("{:>12.6g} {:>12.0f} {:>15.6g} {:>9.3f} {:>11.3f} {:>12.6g}\n", peaks[i],
                    segments[level], localVariance[level], rates[level], prominences[i], onsets[i]);
  }
  return text;
}

std::string ScaleCurve::AsJson(const std::string& file) const {
  Json levels = Json::array(), suggested = Json::array();
  for (std::size_t i = 0; i < mergeValues.size(); ++i) {
    levels.push_back({{"mergeValue", mergeValues[i]},
                      {"segments", segments[i]},
                      {"localVariance", NumberAsJson(localVariance[i])},
                      {"rate", NumberAsJson(rates[i])}});
  }
  for (std::size_t i = 0; i < peaks.size(); ++i) {
    suggested.push_back({{"mergeValue", peaks[i]},
                         {"onset", onsets[i]},
                         {"prominence", NumberAsJson(prominences[i])}});
  }
  return Json{{"file", file}, {"suggested", suggested}, {"levels", levels}}.dump(2) + "\n";
}

void ScaleCurve::Draw(const OutputFile& output) const {
  const auto panel = [this](const char* title, const char* up, const std::vector<double>& values) {
    PlotPanel drawn{title, "cost of merging two segments", up, 0, 1, {}};
    if (!mergeValues.empty()) drawn.lower = std::log2(mergeValues.front());
    if (mergeValues.size() > 1) drawn.step = std::log2(mergeValues[1] / mergeValues[0]);
    drawn.form = PlotPanel::Form::kCurve;
    drawn.axis = PlotPanel::Axis::kPowersOfTwo;
    for (const double peak : peaks) drawn.places.push_back(std::log2(peak));
    constexpr double kFewest = 10;  // segments; with fewer chance rules
    for (std::size_t i = 0; i < values.size() && segments[i] >= kFewest; ++i) {
      drawn.values.push_back(std::isfinite(values[i]) ? std::max(values[i], 0.0) : 0);
    }
    if (drawn.values.empty()) drawn.values.push_back(0);
    return drawn;
  };
  DrawPlot({panel("Growth of local variance, with the suggested costs", "growth (%)", rates),
            panel("Local variance: mean deviation inside segments", "deviation", localVariance)})
      .Write(output);
}

std::vector<double> ReadMergeValues(const std::string& list) {
  std::vector<double> values;
  for (std::size_t at = 0; at <= list.size();) {
    const std::size_t end = std::min(list.find(',', at), list.size());
    const std::string word = list.substr(at, end - at);
    char* rest = nullptr;
    const double value = std::strtod(word.c_str(), &rest);
    if (word.empty() || *rest != '\0' || !std::isfinite(value)) {
      throw HostError(kExitUsage, "--values: \"" + Printable(word) + "\" is no cost");
    }
    values.push_back(value);
    at = end + 1;
  }
  std::sort(values.begin(), values.end());
  const auto twice = std::adjacent_find(values.begin(), values.end());
  if (twice != values.end()) {
    throw HostError(kExitUsage, fmt::format("--values: {:g} comes twice", *twice));
  }
  return values;
}

}  // namespace lumo::host
