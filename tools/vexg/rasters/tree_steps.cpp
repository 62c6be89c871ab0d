#include "rasters/tree_steps.h"

#include <algorithm>
#include <cmath>
#include <filesystem>

#include <fmt/format.h>

#include "foundation/array.h"
#include "foundation/near_name.h"
#include "options/option_values.h"
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
