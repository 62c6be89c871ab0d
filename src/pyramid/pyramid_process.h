#pragma once

#include <vector>

#include "pyramid/pyramid_tasks.h"
#include "raster/raster_def.h"
#include "stats/raster_stats_process.h"
#include "tasks/process_builder.h"

namespace lumo {

/// Names the orders in which a raster is read to make the levels of its pyramid.
enum class PyramidPath {
  kScanline,  ///< whole lines
  kRow,       ///< squares, row by row
  kMorten,    ///< one band after the other in squares along Z: needs little memory for many bands
};
/// The order that suits the storage of a raster, and its number of bands.
VEXG_EXPORT PyramidPath ChoosePyramidPath(const RasterDef& def);

/// Names the rasters and levels that a process works on.
template <typename T>
struct PyramidPlan {
  RasterPtr<T> source;    ///< what is read
  RasterPtr<T> full;      ///< whose StoredPyramidLevels are written
  unsigned levelMin = 0;  ///< first level that is made; 0 is the raster itself
  unsigned levelMax = 0;  ///< last level that is made
  unsigned tileSide = 0;  ///< of the stored squares, in pixels
};

/// Hears that the levels are written. Not called for a run that failed or was aborted.
template <typename T>
class PyramidCallback {
 public:
  virtual ~PyramidCallback() = default;
  /// Called once, on the thread of the run.
  virtual void OnLevelsWritten() = 0;

 private:
  friend class ProcessBuilderCallback<Process, PyramidCallback>;
  void OnProcessEnd(ProcessBuilder<Process>& process) {
    if (!process.HasError()) OnLevelsWritten();
  }
};

/// Reads a raster once, and makes all levels of a pyramid on the way: the base of the two below. A
/// level is a stage of its own, so that levels are made at the same time, and beside the reading.
template <typename T>
class RasterPyramidProcess : public ProcessBuilderCallback<Process, PyramidCallback<T>> {
 protected:
  /// @param receiver  outlives the run; may be null.
  RasterPyramidProcess(const char* name, const PyramidPlan<T>& plan, PyramidCallback<T>* receiver,
                       const IPC& ipc);

  /// Places the stages.
  /// @param statsTask  takes in each tile on the way, into `stats`; null for none. Not used on the
  ///                   path kMorten, whose tiles are of one band each.
  void Place(TaskFactory* statsTask, const ObjectPtr& stats);

 private:
  using ProcessBuilderCallback<Process, PyramidCallback<T>>::SetArg;

  ArgID AddSetup(const ObjectPtr& object);
  TaskFactory* PlaceReader();
  bool AddStage(TaskFactory* factory, const std::vector<ArgID>& setup);

  const PyramidPlan<T> plan_;
  const PyramidPath path_;
  ArgID tile_;
  unsigned stages_ = 0;
  ManagedTask<RasterReadTask<T>> read_;
  ManagedTask<RasterMortenReadTask<T>> mortenRead_;
  ManagedTask<RasterPyramidScanlineDecimateTask<T>> scanlineDecimate_;
  ManagedTask<RasterPyramidRowDecimateTask<T>> rowDecimate_;
  ManagedTask<RasterPyramidMortenDecimateTask<T>> mortenDecimate_;
};

/// Makes the levels of a pyramid. Exists for TwelveTypes.
///
///     PyramidPlan<float> plan{source, full, 1, 5, 256};
///     RasterPyramidDecimateRasterProcess<float> process(plan, nullptr, ipc);
///     const bool well = process.RunProcess(process.kHere);
template <typename T>
class RasterPyramidDecimateRasterProcess final : public RasterPyramidProcess<T> {
 public:
  explicit RasterPyramidDecimateRasterProcess(const PyramidPlan<T>& plan,
                                              PyramidCallback<T>* receiver = nullptr,
                                              const IPC& ipc = {})
      : RasterPyramidProcess<T>("RasterPyramidDecimateRasterProcess", plan, receiver, ipc) {
    this->Place(nullptr, ObjectPtr());
  }
};

/// Makes the levels of a pyramid and, except on the path kMorten, the statistics of the raster.
/// Exists for TenTypes.
template <typename T, typename Stats>
class RasterPyramidDecimateRasterStatsProcess final : public RasterPyramidProcess<T> {
 public:
  /// @param stats  is reset for the bands of the raster.
  RasterPyramidDecimateRasterStatsProcess(const PyramidPlan<T>& plan, const Pointer<Stats>& stats,
                                          PyramidCallback<T>* receiver = nullptr,
                                          const IPC& ipc = {})
      : RasterPyramidProcess<T>("RasterPyramidDecimateRasterStatsProcess", plan, receiver, ipc) {
    stats->Reset(plan.source->Bands());
    this->Place(&accumulate_, stats);
  }

 private:
  ManagedTask<RasterStatsAccumulateTask<T, Stats>> accumulate_;
};

VEXG_EXTERN(TWELVE, RasterPyramidProcess);
VEXG_EXTERN(TWELVE, RasterPyramidDecimateRasterProcess);
VEXG_EXTERN(TEN, RasterPyramidDecimateRasterStatsProcess, RasterStats);

}  // namespace lumo
