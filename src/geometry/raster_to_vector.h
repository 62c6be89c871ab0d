#pragma once

#include <memory>

#include "geometry/label_mask.h"
#include "geometry/polygon_batch.h"
#include "raster/raster_tasks.h"
#include "tasks/process_builder.h"

namespace lumo {

/// Vectorizes a label raster that comes in tiles of one line: slot 0 of a token holds a Tile<T> of
/// one band, one line high, without borders and as wide as the raster; another is TaskErrorBadArgs.
/// The last row of nodes is run when the task is destroyed, unless the process was aborted or the
/// task failed. Setup arguments: the iterator, and a PolygonWriter with labels of int or of T.
/// Exists for EightTypes.
template <typename T>
class VEXG_EXPORT RasterToVectorTask final : public SequentialTask {
 public:
  explicit RasterToVectorTask(ArgList& setup);
  ~RasterToVectorTask() override;
  bool Execute(ArgList& args) override;

 private:
  RasterIteratorPtr<T> iterator_;
  ObjectPtr writer_;
  PolygonBatch batch_;
  std::unique_ptr<LabelVectorizer<T>> vectorizer_;
  LabelCounts counts_;
};

/// Vectorizes one band of a label raster into a writer, with the polygons, and in the order, of
/// RasterToVectorTask. Blocks of lines are read, walked and written at the same time, each on a
/// thread of its own. Exists for EightTypes.
///
///     const ObjectPtr file(new FxvPolygonWriter<std::int32_t, std::uint32_t>(uri));
///     RasterToVectorProcess<std::int32_t> process(raster, 0, file, ipc);
///     if (!process.RunProcess(process.kHere)) return false;
///     const std::uint64_t polygons = process.Counts().polygons;
template <typename T>
class VEXG_EXPORT RasterToVectorProcess final : public ProcessBuilder<Process> {
 public:
  /// @param writer  a PolygonWriter with labels of int or of T, and coordinates of unsigned int.
  RasterToVectorProcess(const RasterPtr<T>& raster, unsigned band, const ObjectPtr& writer,
                        const IPC& ipc = {}, const AsyncCallbackPtr& callback = {});
  ~RasterToVectorProcess() override;

  /// Leaves out the pixels of which a mask of the raster's size says that they do not count. Before
  /// a run.
  void SetMask(const LabelMaskPtr& mask);

  /// The polygons that the runs have written.
  LabelCounts Counts() const;

 private:
  struct Stages;
  std::unique_ptr<Stages> stages_;
};

VEXG_EXTERN(EIGHT, RasterToVectorTask);

VEXG_EXTERN(EIGHT, RasterToVectorProcess);

}  // namespace lumo
