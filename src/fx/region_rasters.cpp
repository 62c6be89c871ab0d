#include "fx/region_rasters.h"

#include <algorithm>
#include <numeric>

#include "fx/label_census.h"
#include "fx/label_painting.h"
#include "fx/task_setup.h"
#include "raster/tile_functions.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace {

/// Paints a tile of floats with what `score(values, stride, scores)` makes of the attributes of a
/// region.
template <typename Score>
bool PaintScores(ArgList& args, const RegionPaint& paint, unsigned bands, TilePool<float>& pool,
                 const Score& score) {
  const TilePtr<std::int32_t> labels(args.Get(0));
  if (args.GetCount() < 2 || labels.IsNull() || !labels->IsValid()) return false;
  const TilePtr<float> out = pool.Take();
  std::vector<double> values, scores(bands);
  const bool isDone =
      PaintLabels(*labels, bands, *out, [&](const std::vector<std::uint32_t>& regions, float* to) {
        const auto count = static_cast<unsigned>(regions.size());
        values.resize(std::size_t{count} * paint.columns->Count());
        paint.columns->Read(regions.data(), count, values.data());
        for (unsigned j = 0; j < count; ++j, to += bands) {
          score(values.data() + j, count, scores.data());
          std::transform(scores.begin(), scores.end(), to,
                         [](double value) { return static_cast<float>(value); });
        }
        return true;
      });
  return isDone && args.Set(1, out);
}

/// Runs a painting task, and stores what it lacks.
template <typename Paint>
bool RunTask(ErrorState& task, const Paint& paint) {
  if (task.HasError()) return false;
  if (paint()) return true;
  task.SetErrorState(TaskErrorBadArgs());
  return false;
}

bool ReadPaint(const ArgList& setup, bool withRules, RegionPaint& paint) {
  return ReadSetup(setup, 0, paint) && paint.columns != nullptr &&
         (!withRules || paint.rules != nullptr);
}

/// Places the stages of a process that paints: reading, the task, writing.
template <typename TaskClass, typename T, typename Setup>
void PlacePainting(TileProcess<>& process, const RasterPtr<std::int32_t>& labels, unsigned bands,
                   const RasterPtr<T>& output, const Setup& setup) {
  const TileDimensions lines = WideTiles(labels.Get(), sizeof(std::int32_t), kComputedTile, 0);
  const RasterIteratorPtr<std::int32_t> tiles = LabelTiles(labels, lines);
  const ArgID slot = process.Read(tiles).id;
  process.template AddTask<TaskClass>(ArgIDs({slot, slot}), setup);
  Array<unsigned> first{ArrayDims(bands)};
  std::iota(first.begin(), first.end(), 0U);
  TileDimensions size = tiles->Dimensions();
  size.bands = 0;
  process.Write(TileSlot<T>{slot},
                RasterIteratorPtr<T>(new RasterIterator<T>(output, size, first)));
  process.Close();
}

}  // namespace

unsigned BestMatchClassificationAlgorithm::Pick(const float* scores, unsigned count) {
  float best = 0;
  unsigned picked = 0;
  for (unsigned i = 0; i < count; ++i) {
    if (!(scores[i] > best)) continue;
    best = scores[i];
    picked = i + 1;
  }
  return picked;
}

RasterApplySelectRegionAttributesTask::RasterApplySelectRegionAttributesTask(ArgList& setup)
    : SequentialTask("RasterApplySelectRegionAttributesTask") {
  if (!ReadPaint(setup, false, paint_)) SetErrorState(TaskErrorBadParams());
}

bool RasterApplySelectRegionAttributesTask::Execute(ArgList& args) {
  return RunTask(*this, [&] {
    const unsigned bands = paint_.columns->Count();
    return PaintScores(args, paint_, bands, pool_,
                       [&](const double* values, std::size_t stride, double* scores) {
                         for (unsigned i = 0; i < bands; ++i) scores[i] = values[i * stride];
                       });
  });
}

RasterApplyRegionRuleScoresTask::RasterApplyRegionRuleScoresTask(ArgList& setup)
    : SequentialTask("RasterApplyRegionRuleScoresTask") {
  if (!ReadPaint(setup, true, paint_)) SetErrorState(TaskErrorBadParams());
}

bool RasterApplyRegionRuleScoresTask::Execute(ArgList& args) {
  return RunTask(*this, [&] {
    return PaintScores(args, paint_, static_cast<unsigned>(paint_.rules->rules.size()), pool_,
                       [&](const double* values, std::size_t stride, double* scores) {
                         paint_.rules->ScoreRules(values, stride, scores);
                       });
  });
}

RasterApplyRegionClassScoresTask::RasterApplyRegionClassScoresTask(ArgList& setup)
    : SequentialTask("RasterApplyRegionClassScoresTask") {
  if (!ReadPaint(setup, true, paint_)) SetErrorState(TaskErrorBadParams());
}

bool RasterApplyRegionClassScoresTask::Execute(ArgList& args) {
  return RunTask(*this, [&] {
    std::vector<double> ruleScores(paint_.rules->rules.size());
    return PaintScores(args, paint_, static_cast<unsigned>(paint_.rules->ClassCount()), pool_,
                       [&](const double* values, std::size_t stride, double* scores) {
                         paint_.rules->ScoreRules(values, stride, ruleScores.data());
                         paint_.rules->ScoreClasses(ruleScores.data(), scores);
                       });
  });
}

template <typename File, typename Algorithm>
RasterClassifyTask<File, Algorithm>::RasterClassifyTask(ArgList& setup)
    : StatelessTask("RasterClassifyTask") {
  const Pointer<File> file(setup.Get(0));
  if (file.IsNull() || !file->IsValid()) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  const unsigned count = file->Attributes();
  std::vector<float> scores(count);
  classes_.resize(file->RegionCount());
  for (unsigned region = 0; region < classes_.size(); ++region) {
    for (unsigned i = 0; i < count; ++i) scores[i] = std::as_const(*file).Value(region, 0, i);
    classes_[region] = static_cast<unsigned char>(Algorithm::Pick(scores.data(), count));
  }
  noLabel_ = static_cast<unsigned char>(count + 1);
}

template <typename File, typename Algorithm>
bool RasterClassifyTask<File, Algorithm>::Execute(ArgList& args) {
  const TilePtr<std::int32_t> labels(args.Get(0));
  if (args.GetCount() < 2 || labels.IsNull() || !labels->IsValid() || labels->Bands() != 1) {
    return false;
  }
  const TilePtr<unsigned char> out = pool_.Take();
  if (!out->Resize(labels->Dimensions())) return false;
  out->SetIndex(labels->Index());
  out->SetOrigin(labels->Origin());
  const std::int32_t* const from = labels->PixelArray().GetData();
  const unsigned char* const states = std::as_const(*labels).StateArray().GetData();
  unsigned char* const to = out->PixelArray().GetData();
  for (std::size_t i = 0; i < out->PixelArray().GetCount(); ++i) {
    const auto region = static_cast<std::uint32_t>(from[i]);
    to[i] = region == 0                                           ? noLabel_
            : region < classes_.size() && IsValidState(states[i]) ? classes_[region]
                                                                  : 0;
    if (from[i] < 0 && IsValidState(states[i])) {
      SetFault(String("there is a label below 0: " + std::to_string(from[i])));
      return false;
    }
  }
  return args.Set(1, out);
}

template class RasterClassifyTask<RegionClassificationProbabilityFile,
                                  BestMatchClassificationAlgorithm>;

CreateRegionAttributesRasterProcess::CreateRegionAttributesRasterProcess(
    const RasterPtr<std::int32_t>& labels, const ChosenAttributes& columns,
    const RasterPtr<float>& output, const IPC& ipc)
    : TileProcess("CreateRegionAttributesRasterProcess", ipc) {
  PlacePainting<RasterApplySelectRegionAttributesTask>(*this, labels, columns.Count(), output,
                                                       MakeSetup(RegionPaint{&columns, nullptr}));
}

CreateRegionRuleScoresRasterProcess::CreateRegionRuleScoresRasterProcess(
    const RasterPtr<std::int32_t>& labels, const ChosenAttributes& columns,
    const FuzzyRuleSet& rules, const RasterPtr<float>& output, const IPC& ipc)
    : TileProcess("CreateRegionRuleScoresRasterProcess", ipc) {
  PlacePainting<RasterApplyRegionRuleScoresTask>(*this, labels,
                                                 static_cast<unsigned>(rules.rules.size()), output,
                                                 MakeSetup(RegionPaint{&columns, &rules}));
}

CreateRegionClassScoresRasterProcess::CreateRegionClassScoresRasterProcess(
    const RasterPtr<std::int32_t>& labels, const ChosenAttributes& columns,
    const FuzzyRuleSet& rules, const RasterPtr<float>& output, const IPC& ipc)
    : TileProcess("CreateRegionClassScoresRasterProcess", ipc) {
  PlacePainting<RasterApplyRegionClassScoresTask>(*this, labels,
                                                  static_cast<unsigned>(rules.ClassCount()), output,
                                                  MakeSetup(RegionPaint{&columns, &rules}));
}

RasterClassifyProcess::RasterClassifyProcess(
    const RasterPtr<std::int32_t>& labels,
    const Pointer<RegionClassificationProbabilityFile>& scores,
    const RasterPtr<unsigned char>& output, const IPC& ipc)
    : TileProcess("RasterClassifyProcess", ipc) {
  PlacePainting<
      RasterClassifyTask<RegionClassificationProbabilityFile, BestMatchClassificationAlgorithm>>(
      *this, labels, 1, output, scores);
}

}  // namespace lumo
