#pragma once

#include <algorithm>
#include <numeric>

#include "fx/lambda_tasks.h"
#include "fx/task_setup.h"
#include "fx/usable_pixels.h"
#include "fx/watershed_task.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace detail {

/// The tiles that a stage of lambda_tasks.h works on.
template <typename T, typename L>
struct LambdaTiles {
  TilePtr<T> values;
  TilePtr<L> labels;

  bool Take(const ArgList& args) {
    values = TilePtr<T>(args.Get(0));
    labels = TilePtr<L>(args.Get(1));
    if (values.IsNull() || labels.IsNull() || !values->IsValid() || !labels->IsValid())
      return false;
    const BasicTile& v = *values;
    const BasicTile& l = *labels;
    return l.Bands() == 1 && l.Width() <= v.Width() && l.Height() <= v.Height() &&
           l.BorderLeft() <= v.BorderLeft() && l.BorderRight() <= v.BorderRight() &&
           l.BorderTop() <= v.BorderTop() && l.BorderBottom() <= v.BorderBottom();
  }
};

/// Calls `visit(label, values, states)` for each pixel that is not excluded, with the values and
/// states of its bands. False once the flag is set.
template <typename T, typename L, typename Visit>
bool ForEachLabel(const LambdaTiles<T, L>& tiles, const AbortFlag* abort, Visit&& visit) {
  const Tile<L>& labels = *tiles.labels;
  const Tile<T>& values = *tiles.values;
  const std::uint8_t* const excluded = FindExcluded(labels);
  const std::size_t bands = values.Bands(), columns = labels.FullWidth();
  std::size_t place = 0;
  for (std::size_t y = 0; y < labels.FullHeight(); ++y) {
    if (abort != nullptr && abort->IsSet()) return false;
    std::size_t at = values.Offset(-std::int64_t{labels.BorderLeft()},
                                   static_cast<std::int64_t>(y) - labels.BorderTop());
    for (std::size_t x = 0; x < columns; ++x, ++place, at += bands) {
      if (excluded != nullptr && excluded[place] != 0) continue;
      visit(static_cast<std::uint32_t>(labels.PixelArray()[place]),
            values.PixelArray().GetData() + at, values.StateArray().GetData() + at);
    }
  }
  return true;
}

/// Gathers the pairs of neighbours of a tile. @param withZero  the label 0 counts as a segment.
template <typename L>
void GatherPairs(const Tile<L>& labels, const EdgeScan& scan, unsigned labelCount, bool withZero,
                 LabelPairs& pairs) {
  pairs.Begin(labelCount);
  ForEachEdge(scan, labels.PixelArray().GetData(), FindExcluded(labels),
              [&](std::uint32_t a, std::uint32_t b) {
                if (withZero || (a != 0 && b != 0)) pairs.AddEdge(a, b);
              });
}

/// Builds the schedule of a tile. False when it was aborted.
template <typename T, typename L>
bool BuildSchedule(const LambdaTiles<T, L>& tiles, const LambdaSetup& setup, LabelPairs& pairs,
                   LambdaSchedule& schedule, const AbortFlag* abort) {
  const unsigned labelCount = setup.CountOf(*tiles.labels);
  schedule.Begin(labelCount, tiles.values->Bands());
  const bool added = ForEachLabel(
      tiles, abort, [&](std::uint32_t label, const T* values, const unsigned char* /*states*/) {
        if (label != 0) schedule.AddPixel(label, values, 1);
      });
  if (!added) return false;
  GatherPairs(*tiles.labels, setup.ScanOf(*tiles.labels), labelCount, false, pairs);
  schedule.Build(pairs.Pairs());
  return abort == nullptr || !abort->IsSet();
}

/// Runs merges as long as `goOn(merge)` says, or there are no more. False when it was aborted.
template <typename GoOn>
bool RunSchedule(LambdaSchedule& schedule, const AbortFlag* abort, GoOn&& goOn) {
  LambdaSchedule::Merge merge;
  for (std::uint64_t step = 0; schedule.Step(merge) && goOn(merge); ++step) {
    constexpr std::uint64_t kEvery = 256;
    if (step % kEvery == 0 && abort != nullptr && abort->IsSet()) return false;
  }
  return true;
}

}  // namespace detail

inline bool LambdaSetup::Read(const ArgList& setup) {
  labelCounts = FindSetupArray<unsigned>(setup, 0);
  return labelCounts && ReadSetup(setup, 1, tilesAcross) && ReadSetup(setup, 2, border);
}

inline unsigned LambdaSetup::CountOf(const BasicTile& tile) const {
  const auto [column, row] = tile.Index();
  const std::size_t at = std::size_t{row} * tilesAcross + column;
  return at < labelCounts->GetCount() ? (*labelCounts)[at] : 0;
}

inline EdgeScan LambdaSetup::ScanOf(const BasicTile& labels) const {
  EdgeScan scan;
  scan.width = static_cast<std::uint32_t>(labels.FullWidth());
  scan.height = static_cast<std::uint32_t>(labels.FullHeight());
  const auto isWhole = [&](unsigned side) { return border != 0 && side == border; };
  scan.columns = scan.width - (isWhole(labels.BorderRight()) ? 1 : 0);
  scan.rows = scan.height - (isWhole(labels.BorderBottom()) ? 1 : 0);
  return scan;
}

template <typename T, typename L>
RasterFullLambdaScheduleTask<T, L>::RasterFullLambdaScheduleTask(ArgList& setup)
    : StatelessTask("RasterFullLambdaScheduleTask") {
  if (!setup_.Read(setup) || !ReadSetup(setup, 3, threshold_)) SetErrorState(TaskErrorBadParams());
}

template <typename T, typename L>
bool RasterFullLambdaScheduleTask<T, L>::Execute(ArgList& args) {
  detail::LambdaTiles<T, L> tiles;
  if (!tiles.Take(args) || setup_.CountOf(*tiles.labels) == 0) return false;
  const auto work = work_.Borrow();
  std::vector<std::uint32_t>& parents = work->parents;
  parents.resize(setup_.CountOf(*tiles.labels));
  std::iota(parents.begin(), parents.end(), 0U);
  if (threshold_ >= 0) {
    if (!detail::BuildSchedule(tiles, setup_, work->pairs, work->schedule, GetAbortFlag()) ||
        !detail::RunSchedule(work->schedule, GetAbortFlag(), [&](const auto& merge) {
          parents[merge.higher] = merge.lower;
          return !(merge.lambda > threshold_);
        })) {
      return false;
    }
  }
  // A segment goes into one of a lower label, so the root of that one is known.
  for (std::size_t label = 0; label < parents.size(); ++label) {
    parents[label] = parents[parents[label]];
  }
  for (L& label : tiles.labels->PixelArray()) {
    label = static_cast<L>(parents[static_cast<std::size_t>(label)]);
  }
  return true;
}

template <typename T, typename L>
RasterFullLambdaScheduleEstimateTask<T, L>::RasterFullLambdaScheduleEstimateTask(ArgList& setup)
    : StatelessTask("RasterFullLambdaScheduleEstimateTask"),
      histogram_(FindSetupArray<unsigned>(setup, 3)),
      binSize_(setup.Get(4)) {
  if (!setup_.Read(setup) || !histogram_ || !binSize_) SetErrorState(TaskErrorBadParams());
  ReadSetup(setup, 5, taken_);
}

template <typename T, typename L>
RasterFullLambdaScheduleEstimateTask<T, L>::~RasterFullLambdaScheduleEstimateTask() {
  if (HasError()) return;
  if (taken_ != nullptr) {
    taken_->insert(taken_->end(), lambdas_.begin(), lambdas_.end());
  } else {
    CountLambdas(lambdas_, *histogram_, binSize_->value);
  }
}

template <typename T, typename L>
bool RasterFullLambdaScheduleEstimateTask<T, L>::Execute(ArgList& args) {
  detail::LambdaTiles<T, L> tiles;
  if (!tiles.Take(args) || setup_.CountOf(*tiles.labels) == 0) return false;
  const auto work = work_.Borrow();
  std::vector<double> lambdas;
  if (!detail::BuildSchedule(tiles, setup_, work->pairs, work->schedule, GetAbortFlag()) ||
      !detail::RunSchedule(work->schedule, GetAbortFlag(), [&](const auto& merge) {
        lambdas.push_back(merge.lambda);
        return true;
      })) {
    return false;
  }
  const std::lock_guard lock(mutex_);
  lambdas_.insert(lambdas_.end(), lambdas.begin(), lambdas.end());
  return true;
}

template <typename T>
RasterTileRigorousLambdaMergeTask<T>::RasterTileRigorousLambdaMergeTask(ArgList& setup)
    : StatelessTask("RasterTileRigorousLambdaMergeTask") {
  if (!setup_.Read(setup) || !ReadSetup(setup, 3, threshold_) || !ReadSetup(setup, 4, sums_)) {
    SetErrorState(TaskErrorBadParams());
  }
}

template <typename T>
bool RasterTileRigorousLambdaMergeTask<T>::Execute(ArgList& args) {
  detail::LambdaTiles<T, std::int32_t> tiles;
  if (!tiles.Take(args) || setup_.CountOf(*tiles.labels) == 0) return false;
  const unsigned labelCount = setup_.CountOf(*tiles.labels);
  const auto work = work_.Borrow();
  const std::size_t bands = tiles.values->Bands();
  work->merge.Begin(labelCount, static_cast<std::uint32_t>(bands), sums_);
  const bool added =
      detail::ForEachLabel(tiles, GetAbortFlag(),
                           [&](std::uint32_t label, const T* values, const unsigned char* states) {
                             if (IsUsable(states, bands)) work->merge.AddPixel(label, values, 1);
                           });
  if (!added) return false;
  Tile<std::int32_t>& labels = *tiles.labels;
  detail::GatherPairs(labels, setup_.ScanOf(labels), labelCount, true, work->pairs);
  const std::vector<std::uint32_t> numbers = work->merge.Join(work->pairs.Pairs(), threshold_);
  const std::uint8_t* const excluded = FindExcluded(labels);
  for (std::size_t i = 0; i < labels.PixelArray().GetCount(); ++i) {
    std::int32_t& label = labels.PixelArray()[i];
    const bool counts = excluded == nullptr || excluded[i] == 0;
    label = counts ? static_cast<std::int32_t>(numbers[static_cast<std::size_t>(label)]) : 0;
  }
  return true;
}

}  // namespace lumo
