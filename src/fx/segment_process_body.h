#pragma once

#include <algorithm>
#include <cmath>
#include <limits>

#include "fx/gradient_stages.h"
#include "fx/lambda_tasks.h"
#include "fx/segment_process.h"
#include "fx/stitch_tasks.h"
#include "fx/task_setup.h"
#include "fx/watershed_task.h"
#include "stats/raster_histogram_process.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace detail {

template <typename T>
RasterIteratorPtr<T> SquaresOf(const RasterPtr<T>& raster, const SegmentGrid& grid,
                               unsigned border) {
  return RasterIteratorPtr<T>(new RasterIterator<T>(raster, grid.Tiles(border)));
}

}  // namespace detail

template <typename T>
WatershedProcess<T>::WatershedProcess(const char* name, const RasterPtr<T>& segment,
                                      const RasterPtr<T>& merge, const SegmentRequest& request,
                                      const IPC& ipc)
    : SomeTilesProcess(name, ipc),
      grid_(*segment, sizeof(T), request.tileBytes, request.tileBorder),
      segmentTiles_(detail::SquaresOf(segment, grid_,
                                      detail::GradientBorder(request.algorithm, grid_.border))),
      labelCounts_(new Array<unsigned>(ArrayDims(grid_.columns * grid_.rows))) {
  std::fill(labelCounts_->begin(), labelCounts_->end(), 0U);
  if (merge.Get() != segment.Get()) mergeTiles_ = detail::SquaresOf(merge, grid_, grid_.border);
  // While each thread works on a tile, one is read or written.
  this->GetPipeline().SetTokenLimit(ThreadLimit::GetCurrent() + 1);
}

template <typename T>
template <typename ClipTask>
void WatershedProcess<T>::AddWatershed(const SegmentRequest& request, const TileRange& tiles) {
  const ArgID segment = this->ReadSome(segmentTiles_, tiles).id;
  const bool isShared = mergeTiles_.IsNull();
  merge_ = isShared ? segment : this->ReadSome(mergeTiles_, tiles).id;
  // Tiles that only the gradients need give their slot to them.
  labels_ = isShared ? this->GetPipeline().TakeTokenArg() : segment;
  detail::AddGradient<T>(*this, request.algorithm, segment, labels_, grid_.border);
  const Array<ArgID> inPlace = ArgIDs({labels_, labels_});
  this->template AddTask<RasterLinearStretchTask<double, std::int32_t>>(inPlace,
                                                                        MakeSetup(request.stretch));
  this->template AddTask<ClipTask>(inPlace, MakeSetup(request.limits));
  this->template AddTask<RasterTileWatershedTask<std::int32_t>>(inPlace, labelCounts_,
                                                                MakeSetup(grid_.columns));
}

template <typename T>
void WatershedProcess<T>::AddOutput(const SegmentRequest& request,
                                    const RasterPtr<std::int32_t>& labels) {
  const Array<ArgID> inPlace = ArgIDs({labels_, labels_});
  if (!grid_.IsOneTile()) {
    this->template AddTask<RasterTileSegmentStitchTask<std::int32_t>>(
        inPlace, MakeSetup(grid_.columns), MakeSetup(grid_.side), MakeSetup(grid_.side));
  }
  if (request.bordersOnly) {
    this->template AddTask<RasterSegmentBorderTask<std::int32_t>>(inPlace);
  }
  this->Write(TileSlot<std::int32_t>{labels_},
              RasterIteratorPtr<std::int32_t>(
                  new RasterIteratorFromTemplateSpatial<std::int32_t>(labels, *segmentTiles_)));
  this->Close();
}

template <typename T>
RasterTileWatershedSegmentFLSEstimateProcess<T>::RasterTileWatershedSegmentFLSEstimateProcess(
    const RasterPtr<T>& segment, const RasterPtr<T>& merge, const SegmentRequest& request,
    const Pointer<Array<unsigned>>& histogram, const ScalarPtr<double>& binSize, const IPC& ipc,
    const TileRange& tiles, std::vector<double>* lambdas)
    : WatershedProcess<T>(
          "RasterTileWatershedSegmentFLSEstimateProcess", segment, merge,
          [&] {
            SegmentRequest byDefault = request;
            byDefault.tileBytes = kTileBudget;
            byDefault.tileBorder = 1;
            return byDefault;
          }(),
          ipc) {
  this->template AddWatershed<RasterClipInPlaceTask<std::int32_t>>(request, tiles);
  this->template AddTask<RasterFullLambdaScheduleEstimateTask<T, std::int32_t>>(
      ArgIDs({this->merge_, this->labels_}), this->labelCounts_, MakeSetup(this->grid_.columns),
      MakeSetup(this->grid_.border), histogram, binSize, MakeSetup(lambdas));
  this->Close();
}

template <typename T>
RasterTileWatershedSegmentFLSMergeProcess<T>::RasterTileWatershedSegmentFLSMergeProcess(
    const RasterPtr<T>& segment, const RasterPtr<T>& merge, const RasterPtr<std::int32_t>& labels,
    const SegmentRequest& request, const IPC& ipc)
    : WatershedProcess<T>("RasterTileWatershedSegmentFLSMergeProcess", segment, merge, request,
                          ipc) {
  this->template AddWatershed<RasterClipInPlaceTask<std::int32_t>>(request);
  if (request.mergeValue > 0) {
    this->template AddTask<RasterFullLambdaScheduleTask<T, std::int32_t>>(
        ArgIDs({this->merge_, this->labels_}), this->labelCounts_, MakeSetup(this->grid_.columns),
        MakeSetup(this->grid_.border), MakeSetup(request.mergeValue));
  }
  this->AddOutput(request, labels);
}

template <typename T>
RasterTileWatershedSegmentLambdaMergeProcess<T>::RasterTileWatershedSegmentLambdaMergeProcess(
    const RasterPtr<T>& segment, const RasterPtr<T>& merge, const RasterPtr<std::int32_t>& labels,
    const SegmentRequest& request, const IPC& ipc)
    : WatershedProcess<T>("RasterTileWatershedSegmentLambdaMergeProcess", segment, merge, request,
                          ipc) {
  this->template AddWatershed<RasterClipTask<std::int32_t, std::int32_t>>(request);
  if (request.mergeValue > 0) {
    this->template AddTask<RasterTileRigorousLambdaMergeTask<T>>(
        ArgIDs({this->merge_, this->labels_}), this->labelCounts_, MakeSetup(this->grid_.columns),
        MakeSetup(this->grid_.border), MakeSetup(request.mergeValue), MakeSetup(request.sums));
  }
  this->AddOutput(request, labels);
}

template <typename T>
RasterSegmentHistogramProcess<T>::RasterSegmentHistogramProcess(const RasterPtr<T>& raster,
                                                                SegmentAlgorithm algorithm,
                                                                const ObjectPtr& histogram,
                                                                const IPC& ipc,
                                                                const TileRange& tiles)
    : SomeTilesProcess("RasterSegmentHistogramProcess", ipc) {
  const SegmentGrid grid = GradientGrid<T>(*raster);
  const unsigned border = detail::GradientBorder(algorithm, 1);
  const ArgID tile = this->ReadSome(detail::SquaresOf(raster, grid, border), tiles).id;
  detail::AddGradient<T>(*this, algorithm, tile, tile, 0);
  this->template AddTask<RasterHistogramAccumulateTask<double>>(ArgIDs({tile}), histogram);
  this->Close();
}

template <typename T>
RasterSegmentLimitsProcess<T>::RasterSegmentLimitsProcess(const RasterPtr<T>& raster,
                                                          SegmentAlgorithm algorithm,
                                                          const IPC& ipc, const TileRange& tiles)
    : SomeTilesProcess("RasterSegmentLimitsProcess", ipc),
      least_(std::numeric_limits<double>::infinity()),
      most_(-least_) {
  const SegmentGrid grid = GradientGrid<T>(*raster);
  const unsigned border = detail::GradientBorder(algorithm, 1);
  const ArgID slot = this->ReadSome(detail::SquaresOf(raster, grid, border), tiles).id;
  detail::AddGradient<T>(*this, algorithm, slot, slot, 0);
  this->Add("Limits", StageOrder::kOneByOne, [this, slot](ArgList& token, const AbortFlag*) {
    const TilePtr<double> tile = TileSlot<double>{slot}.In(token);
    if (!tile) return false;
    for (std::size_t i = 0; i < tile->PixelArray().GetCount(); ++i) {
      const double value = tile->PixelArray()[i];
      if (!IsValidState(std::as_const(*tile).StateArray()[i]) || !std::isfinite(value)) continue;
      least_ = std::min(least_, value);
      most_ = std::max(most_, value);
    }
    return true;
  });
  this->Close();
}

}  // namespace lumo
