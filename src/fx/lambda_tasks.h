#pragma once

#include <mutex>

#include "fx/label_pairs.h"
#include "fx/lambda_schedule.h"
#include "fx/rigorous_merge.h"
#include "raster/raster_tasks.h"
#include "tasks/scratch_pool.h"

// The stages that merge the segments of a tile. Slot 0 of a token holds the tile of band values, of
// any of EightTypes, with borders at least those of the labels; slot 1 the labels, which are
// changed in place. Edges along the last column and row of a tile are counted unless there the tile
// has its whole border.
//
// Setup arguments begin with those that all of them have: Array<unsigned>, the number of labels of
// each tile and 1, by row * tiles across + column; Scalar<unsigned>, the tiles across;
// Scalar<unsigned>, the border of tiles that no edge of the raster cuts.

namespace lumo {

/// The arguments that all tasks of lambda_tasks.h are made from.
struct LambdaSetup {
  Pointer<Array<unsigned>> labelCounts;
  unsigned tilesAcross = 0;
  unsigned border = 0;

  bool Read(const ArgList& setup);
  /// The labels of a tile and 1; 0 for a tile that isn't in the grid.
  unsigned CountOf(const BasicTile& tile) const;
  /// Where the edges of a tile of labels are counted.
  EdgeScan ScanOf(const BasicTile& labels) const;
};

/// Merges segments by LambdaSchedule until a merge costs more than a threshold, that one included.
/// The labels are those of the segments that took the others over. Below 0 nothing is merged.
/// Fourth setup argument: Scalar<double>, the threshold. Exists for EightTypes and int.
template <typename T, typename L>
class RasterFullLambdaScheduleTask final : public StatelessTask {
 public:
  explicit RasterFullLambdaScheduleTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  struct Work {
    LabelPairs pairs;
    LambdaSchedule schedule;
    std::vector<std::uint32_t> parents;
  };

  LambdaSetup setup_;
  double threshold_ = 0;
  ScratchPool<Work> work_;
};

/// Counts costs into bins of m / (n - 1), m the largest, and makes the counts cumulative. Costs
/// that are not finite do not count; nothing happens without one above 0.
VEXG_EXPORT void CountLambdas(const std::vector<double>& lambdas, Array<unsigned>& histogram,
                              double& binSize);

/// Merges all segments, changes no labels, and counts the costs of all tiles. When the task goes,
/// the outputs hold what was counted; they stay where no cost was above 0.
///
/// Fourth and fifth setup argument: Array<unsigned>, which receives cumulative counts of the costs
/// in n bins from 0 on; Scalar<double>, which receives the width of the bins, the largest cost
/// divided by n - 1. A sixth one, a Scalar of a pointer to a vector of double, if there is one that
/// isn't null, has the costs themselves put there instead. Exists for EightTypes and int.
///
/// Memory: 8 bytes for each merge of the whole raster.
template <typename T, typename L>
class RasterFullLambdaScheduleEstimateTask final : public StatelessTask {
 public:
  explicit RasterFullLambdaScheduleEstimateTask(ArgList& setup);
  ~RasterFullLambdaScheduleEstimateTask() override;
  bool Execute(ArgList& args) override;

 private:
  struct Work {
    LabelPairs pairs;
    LambdaSchedule schedule;
  };

  LambdaSetup setup_;
  Pointer<Array<unsigned>> histogram_;
  ScalarPtr<double> binSize_;
  std::vector<double>* taken_ = nullptr;  // where the costs go
  ScratchPool<Work> work_;
  std::mutex mutex_;
  std::vector<double> lambdas_;  // under mutex_
};

/// Joins segments by RigorousMerge. Fourth and fifth setup argument: Scalar<double>, the threshold;
/// Scalar<Form>. Exists for EightTypes.
template <typename T>
class RasterTileRigorousLambdaMergeTask final : public StatelessTask {
 public:
  explicit RasterTileRigorousLambdaMergeTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  struct Work {
    LabelPairs pairs;
    RigorousMerge merge;
  };

  LambdaSetup setup_;
  double threshold_ = 0;
  Form sums_ = Form::kTold;
  ScratchPool<Work> work_;
};

#define VEXG_EXTERN_LAMBDA(T)                                                              \
  extern template class VEXG_EXPORT RasterFullLambdaScheduleTask<T, std::int32_t>;         \
  extern template class VEXG_EXPORT RasterFullLambdaScheduleEstimateTask<T, std::int32_t>; \
  extern template class VEXG_EXPORT RasterTileRigorousLambdaMergeTask<T>;
VEXG_FOR_ALL(EIGHT, VEXG_EXTERN_LAMBDA);
#undef VEXG_EXTERN_LAMBDA

}  // namespace lumo
