#include "rasters/segment_steps.h"

#include <fmt/format.h>

#include "foundation/array.h"
#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "raster/raster_enums.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

int NumberOf(const std::string& algorithm) {
  return algorithm == "sobel" ? 1 : 2;
}

}  // namespace

void SegmentRequest::Check() const {
  const auto refuse = [](const std::string& line) { throw HostError(kExitUsage, line); };
  if (segmentValue && segmentPercent) {
    refuse("--segment-value and --segment-percent exclude each other");
  }
  if (mergeValue && mergePercent) refuse("--merge-value and --merge-percent exclude each other");
  if (tileBorder && !isTiled) refuse("--tile-border goes with --tiled");
  if (memory != 0 && isTiled) refuse("--memory goes without --tiled");
  if ((minSize || maxSize || compactness) && (isTiled || mergeAlgorithm != "schedule")) {
    refuse(
        "--min-size, --max-size and --compactness go with --merge-algorithm schedule, without "
        "--tiled");
  }
  const bool isLocal = order == "local";
  if (isLocal && (isTiled || isEstimate || mergeAlgorithm != "schedule")) {
    refuse("--order local goes with --merge-algorithm schedule, without --tiled and --estimate");
  }
  if (rounds && !isLocal) refuse("--rounds goes with --order local");
  if (!tree.empty() && (isTiled || isEstimate || mergeAlgorithm != "schedule" || minSize)) {
    refuse(
        "--tree goes with --merge-algorithm schedule, without --tiled, --estimate and --min-size");
  }
  for (const auto& [name, percent] :
       {std::pair("--segment-percent", segmentPercent), {"--merge-percent", mergePercent}}) {
    if (percent && !(*percent >= 0 && *percent <= 100)) {
      refuse(fmt::format("{}: 0 to 100 percent", name));
    }
  }
}

bool SegmentRequest::IsSegmenting() const {
  const SegmentRequest none;
  return algorithm != none.algorithm || mergeAlgorithm != none.mergeAlgorithm || segmentValue ||
         segmentPercent || tileMemory || tileBorder || memory != 0 || minSize || maxSize ||
         compactness || order != none.order || rounds || isTiled || isBorders || isEstimate;
}

void AddFit(JobDraft& draft, const SegmentRequest& request, const SegmentSources& sources) {
  JobWriterCommand& fit = draft.Step(kFitStep, "FitSegmentationCommand");
  fit.AddVariableInput("SegmentURI", sources.shown);
  fit.AddInput("SegmentAlgorithm", NumberOf(request.algorithm));
  if (request.segmentValue) fit.AddInput("SegmentValue", *request.segmentValue);
  if (request.segmentPercent) fit.AddInput("SegmentPercent", *request.segmentPercent);
  fit.AddVariableInput("MergeURI", sources.merge);
  if (request.mergePercent && !request.isEstimate && request.tree.empty()) {
    fit.AddInput("MergePercent", *request.mergePercent);
  }
  fit.AddOutput("MinGradient", "$least");
  fit.AddOutput("MaxGradient", "$most");
  fit.AddOutput("StretchValue", "$levels");
  fit.AddOutput("SegmentValue", "$flat");
  fit.AddOutput("MergeValue", "$cost");
}

void AddSegment(JobDraft& draft, const char* step, const SegmentRequest& request,
                const SegmentSources& sources) {
  JobWriterCommand& segment = draft.Step(step, "FxTileSegmentMergeCommand");
  segment.AddVariableInput("SegmentURI", sources.shown);
  segment.AddInput("SegmentAlgorithm", NumberOf(request.algorithm));
  segment.AddVariableInput("SegmentValue", "$flat");
  segment.AddVariableInput("MinGradient", "$least");
  segment.AddVariableInput("MaxGradient", "$most");
  segment.AddVariableInput("MergeURI", sources.merge);
  segment.AddVariableInput("StretchValue", "$levels");
  segment.AddInput("LambdaEstimate", request.isEstimate);
  if (request.isEstimate) return;
  segment.AddVariableInput("LabelURI", "$target");
  segment.AddInput("MergeAlgorithm", request.mergeAlgorithm == "rigorous" ? 2 : 1);
  if (!request.tree.empty()) segment.AddInput("Tree", String(AbsoluteName(request.tree)));
  if (request.mergeValue) {
    segment.AddInput("MergeValue", *request.mergeValue);
  } else if (request.mergePercent && !request.tree.empty()) {
    segment.AddInput("MergePercent", *request.mergePercent);
  } else {
    segment.AddVariableInput("MergeValue", "$cost");
  }
  if (request.tileMemory) segment.AddInput("TileMemorySize", *request.tileMemory);
  if (request.isTiled) {
    constexpr unsigned kBorder = 10;
    segment.AddInput("TileBorderSize", request.tileBorder.value_or(kBorder));
  } else {
    segment.AddInput("Seamless", true);
    if (request.order == "local") segment.AddInput("Order", String("Local"));
    if (request.rounds) segment.AddInput("Rounds", *request.rounds);
    if (request.minSize) segment.AddInput("MinSize", *request.minSize);
    if (request.maxSize) segment.AddInput("MaxSize", *request.maxSize);
    if (request.compactness) segment.AddInput("Compactness", *request.compactness);
    if (request.memory != 0) segment.AddInput("Memory", request.memory);
  }
  if (request.isBorders) segment.AddInput("SegmentBorder", 1);
  segment.AddInput("Sums", Form::kExact);
}

void AddLabels(JobWriterCommand& create, const SegmentRequest& request) {
  create.AddInput("DataType", DataTypeName(kDataTypeOf<std::int32_t>));
  create.AddInput("Bands", 1U);
  if (!request.isBorders) return;
  Array<bool> none{ArrayDims(1)};  // 0 is as good a pixel as 1
  none[0] = false;
  create.AddInput("HasNoDataValue", none);
}

}  // namespace lumo::host
