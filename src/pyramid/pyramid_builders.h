#pragma once

#include <functional>
#include <mutex>

#include "data/raster_reader.h"
#include "foundation/async.h"
#include "foundation/packing.h"
#include "raster/level_reduction.h"
#include "raster/raster.h"
#include "raster/raster_def.h"
#include "stats/raster_stats.h"

namespace lumo {

class ShareScope;
template <typename T>
class DynamicRasterPyramid;
template <typename T>
struct PyramidPlan;

/// Makes the raster that stands on a source, and on a pyramid where that isn't empty. The floor
/// that has such rasters lies above.
template <typename T>
using MakeSourceRaster =
    std::function<RasterPtr<T>(const RasterReaderPtr<T>&, const RasterDataConnectionPtr&,
                               const RasterReaderPtr<T>&, const RasterDataConnectionPtr&)>;

/// A build of a pyramid, on a thread of its own, with connections of its own.
class VEXG_EXPORT PyramidBuilder : public Async {
 public:
  using Async::Async;

  /// The reason of a failure, in words; no text after a success.
  String GetFault() const;

 protected:
  /// Keeps the fault text of this thread as the reason, and gives up.
  void Fail(const char* otherwise);

 private:
  mutable std::mutex lock_;
  String fault_;
};

using PyramidBuilderPtr = Pointer<PyramidBuilder>;

/// Names the source, the store and the levels of a build.
struct PyramidOrder {
  Array<String> source;   ///< connection strings of the raster
  Array<String> pyramid;  ///< connection strings of the store
  PyramidDef def;         ///< the levels
  TileDimensions tiles;   ///< height: the side of the stored squares
};

/// Has the driver of a format build its pyramid: one call, which can't be aborted on the way.
/// Exists for TwelveTypes.
template <typename T>
class AsyncPyramidBuilder final : public PyramidBuilder {
 public:
  /// @param owner  outlives the build.
  AsyncPyramidBuilder(DynamicRasterPyramid<T>& owner, const PyramidOrder& order,
                      const AsyncCallbackPtr& callback);
  void Execute() override;
  void Finish() override;

 private:
  DynamicRasterPyramid<T>& owner_;
  const PyramidOrder order_;
  bool built_ = false;
};

/// Says how a build takes part in one that is done in shares.
struct PyramidShares {
  ShareScope* scope = nullptr;       ///< null for a build of its own; outlives it
  Packing packing = Packing::kNone;  ///< of the tiles of the pyramid
};

/// Builds a pyramid file of the library's own: the levels, the statistics of the raster on the way,
/// and a histogram of a small level, with which the owner is left. Exists for TwelveTypes; complex
/// rasters get neither statistics nor a histogram. Of a share it makes levels and sums alone, and
/// no pyramid file; that of all shares takes them.
template <typename T>
class AsyncOrvaPyramidBuilder final : public PyramidBuilder {
 public:
  /// @param owner  outlives the build.
  AsyncOrvaPyramidBuilder(DynamicRasterPyramid<T>& owner, const PyramidOrder& order,
                          const MakeSourceRaster<T>& makeRaster, const AsyncCallbackPtr& callback,
                          const PyramidShares& shares = {});
  void Execute() override;

 private:
  struct Rasters;

  bool Build();
  bool Open(Rasters& rasters);
  bool MakeLevels(const Rasters& rasters);
  bool MakeReduced(const PyramidPlan<T>& plan, LevelReduction reduction);
  bool MakeShare();
  bool JoinShares(const Rasters& rasters);
  bool CollectStats(const RasterPtr<T>& raster);
  bool MakeHistogram(const Rasters& rasters);
  IPC Share(double weight) const;

  DynamicRasterPyramid<T>& owner_;
  const PyramidOrder order_;
  const MakeSourceRaster<T> makeRaster_;
  const PyramidShares shares_;
  std::conditional_t<std::is_arithmetic_v<T>, RasterStatsPtr<T>, std::nullptr_t> stats_;
};

/// The level whose larger side has 256 to 511 pixels, where the pyramid has it; else the nearest.
/// 0 stands for the raster itself where level 0 isn't stored.
VEXG_EXPORT unsigned ChooseHistogramLevel(unsigned samples, unsigned lines, unsigned levelMin,
                                          unsigned levelMax);

VEXG_EXTERN_HIDDEN(TWELVE, AsyncPyramidBuilder);
VEXG_EXTERN_HIDDEN(TWELVE, AsyncOrvaPyramidBuilder);

}  // namespace lumo
