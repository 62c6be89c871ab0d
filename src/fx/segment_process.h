#pragma once

#include <optional>
#include <string>

#include "commands/value_text.h"
#include "foundation/scalar.h"
#include "fx/lambda_schedule.h"
#include "fx/level_tasks.h"
#include "fx/local_merge.h"
#include "fx/some_tiles_process.h"

// A raster is segmented tile by tile: gradient, stretch and clip, watershed, merging, stitching.
// The tiles overlap by a border; a segment that reaches into the next tile keeps its label there.
//
// T is one of EightTypes. Rasters and arrays are shared for the length of a run.

namespace lumo {

/// Says from what a segmentation starts: the gradients of neighbouring pixels (ComputeSobelRow), or
/// their mean band values.
enum class SegmentAlgorithm : unsigned char { kSobel, kIntensity };

/// Says in which order segments of a whole raster are merged by costs: the cheapest pair anywhere
/// first (LambdaSchedule), or in rounds (LocalMerge).
enum class MergeOrder : unsigned char { kTold, kLocal };

/// Holds the settings of a segmentation.
struct SegmentRequest {
  SegmentAlgorithm algorithm = SegmentAlgorithm::kSobel;
  LinearStretch stretch;                  ///< from gradients to levels
  ClipLimits limits;                      ///< of the levels
  double mergeValue = 0;                  ///< threshold of merging; none unless above 0
  Form sums = Form::kTold;                ///< of the rigorous merge
  bool bordersOnly = false;               ///< an image of the borders instead of labels
  unsigned tileBytes = kTileBudget;       ///< of the band values of a tile
  unsigned tileBorder = 1;                ///< overlap on each side
  bool isRigorous = false;                ///< merging without tiles: by RigorousMerge
  double leastPixels = 0;                 ///< smaller segments join others, without tiles
  MergeOrder order = MergeOrder::kTold;   ///< without tiles
  unsigned rounds = LocalMerge::kRounds;  ///< of the local order
  GrowthLimits growth;                    ///< of merging by schedule, without tiles
  /// A file to keep the tree of merging by schedule in, without tiles; empty for none.
  std::string tree;
  /// With a tree: the percentage of all merges to do, instead of those up to mergeValue.
  std::optional<double> mergePercent;
  std::uint64_t memory = kNoLimit;  ///< bytes for the segments and their neighbours, without tiles

  static constexpr std::uint64_t kNoLimit = 0xFFFFFFFFFFFFFFFF;
};

/// The grid of tiles that a raster is cut into.
struct SegmentGrid {
  unsigned side = 0;  ///< of a tile
  unsigned columns = 0;
  unsigned rows = 0;
  unsigned border = 0;

  SegmentGrid(const BasicRaster& raster, std::size_t elementBytes, unsigned tileBytes,
              unsigned tileBorder);
  bool IsOneTile() const { return columns <= 1 && rows <= 1; }
  /// Squares of the grid with a border that ends at the edges of the raster.
  TileDimensions Tiles(unsigned withBorder) const;
};

/// The part that all processes which begin with a watershed have in common.
template <typename T>
class WatershedProcess : public SomeTilesProcess {
 protected:
  /// @param segment  what gradients are computed from.
  /// @param merge    what drives merging; may be the same.
  WatershedProcess(const char* name, const RasterPtr<T>& segment, const RasterPtr<T>& merge,
                   const SegmentRequest& request, const IPC& ipc);

  /// Places the stages from the reading to the watershed. @tparam ClipTask  the one that limits.
  template <typename ClipTask>
  void AddWatershed(const SegmentRequest& request, const TileRange& tiles = {});
  /// Places the stages behind the merging, and is the last.
  void AddOutput(const SegmentRequest& request, const RasterPtr<std::int32_t>& labels);

  SegmentGrid grid_;
  RasterIteratorPtr<T> segmentTiles_, mergeTiles_;
  ArgID merge_ = 0;   // slot of the band values that drive merging
  ArgID labels_ = 0;  // slot of the labels, and of what they are made of
  Pointer<Array<unsigned>> labelCounts_;
};

/// Counts the costs of merging a raster to the end, see RasterFullLambdaScheduleEstimateTask. Its
/// tiles are of the default size, with a border of 1. No raster is written.
template <typename T>
class RasterTileWatershedSegmentFLSEstimateProcess final : public WatershedProcess<T> {
 public:
  /// @param histogram  [out] cumulative counts, as many as it has bins.
  /// @param binSize    [out]
  /// @param tiles      of SegmentGrid.
  /// @param lambdas    gets the costs, in any order, in place of `histogram` and `binSize`;
  /// outlives
  ///                   the process. Null for none.
  RasterTileWatershedSegmentFLSEstimateProcess(
      const RasterPtr<T>& segment, const RasterPtr<T>& merge, const SegmentRequest& request,
      const Pointer<Array<unsigned>>& histogram, const ScalarPtr<double>& binSize,
      const IPC& ipc = {}, const TileRange& tiles = {}, std::vector<double>* lambdas = nullptr);
};

/// Segments a raster, and merges by RasterFullLambdaScheduleTask.
template <typename T>
class RasterTileWatershedSegmentFLSMergeProcess final : public WatershedProcess<T> {
 public:
  /// @param labels  one band, of the size of the others.
  RasterTileWatershedSegmentFLSMergeProcess(const RasterPtr<T>& segment, const RasterPtr<T>& merge,
                                            const RasterPtr<std::int32_t>& labels,
                                            const SegmentRequest& request, const IPC& ipc = {});
};

/// Segments a raster, and merges by RasterTileRigorousLambdaMergeTask.
template <typename T>
class RasterTileWatershedSegmentLambdaMergeProcess final : public WatershedProcess<T> {
 public:
  /// @param labels  one band, of the size of the others.
  RasterTileWatershedSegmentLambdaMergeProcess(const RasterPtr<T>& segment,
                                               const RasterPtr<T>& merge,
                                               const RasterPtr<std::int32_t>& labels,
                                               const SegmentRequest& request, const IPC& ipc = {});
};

/// The grid of the two processes below.
template <typename T>
SegmentGrid GradientGrid(const BasicRaster& raster) {
  return {raster, sizeof(T), kTileBudget, 1};
}

/// Counts the histogram of the gradients of a raster, or of some of its tiles.
template <typename T>
class RasterSegmentHistogramProcess final : public SomeTilesProcess {
 public:
  RasterSegmentHistogramProcess(const RasterPtr<T>& raster, SegmentAlgorithm algorithm,
                                const ObjectPtr& histogram, const IPC& ipc = {},
                                const TileRange& tiles = {});
};

/// Finds the smallest and the largest gradient of a raster, or of some of its tiles.
template <typename T>
class RasterSegmentLimitsProcess final : public SomeTilesProcess {
 public:
  RasterSegmentLimitsProcess(const RasterPtr<T>& raster, SegmentAlgorithm algorithm,
                             const IPC& ipc = {}, const TileRange& tiles = {});

  /// Both, after a run; the first is above the second where no pixel has a gradient.
  double Least() const { return least_; }
  double Most() const { return most_; }

 private:
  double least_;
  double most_;
};

VEXG_EXTERN(EIGHT, RasterTileWatershedSegmentFLSEstimateProcess);
VEXG_EXTERN(EIGHT, RasterTileWatershedSegmentFLSMergeProcess);
VEXG_EXTERN(EIGHT, RasterTileWatershedSegmentLambdaMergeProcess);
VEXG_EXTERN(EIGHT, RasterSegmentHistogramProcess);
VEXG_EXTERN(EIGHT, RasterSegmentLimitsProcess);

}  // namespace lumo
