#include "geometry/raster_to_vector.h"

#include "tasks/task_errors.h"

namespace lumo {
namespace {

/// Holds the values that the stages of a run share.
template <typename T>
struct VectorizePlan : Object {
  std::uint32_t width = 0;
  std::uint32_t lines = 0;
  ObjectPtr writer;
  LabelMaskPtr mask;  // empty: all count
  LabelCounts counts;
};

/// True when a tile is a block of whole lines of one band.
template <typename T>
bool IsBlockOfLines(const Tile<T>* tile, std::uint64_t width) {
  return tile != nullptr && tile->IsValid() && tile->Width() == width && tile->Bands() == 1 &&
         tile->FullWidth() == tile->Width() && tile->FullHeight() == tile->Height();
}

/// Walks the tile in slot 0 and puts the polygons that it completes into slot 1. Setup arguments:
/// the plan.
template <typename T>
class VectorizeTask final : public SequentialTask {
 public:
  explicit VectorizeTask(ArgList& setup)
      : SequentialTask("VectorizeTask"),
        plan_(dynamic_cast<VectorizePlan<T>*>(setup.Get(0).Get())) {
    if (plan_ == nullptr) SetErrorState(TaskErrorBadParams());
  }

  bool Execute(ArgList& args) override {
    const TilePtr<T> tile(args.Get(0));
    if (HasError() || !IsBlockOfLines(tile.Get(), plan_->width)) {
      if (!HasError()) SetErrorState(TaskErrorBadArgs());
      return false;
    }
    if (plan_->mask &&
        !plan_->mask->Apply(tile->Origin().second, tile->Height(), tile->StateArray().GetData())) {
      SetErrorState(TaskError());
      return false;
    }
    const Pointer<PolygonBatch> batch(new PolygonBatch);
    batch_ = batch.Get();
    if (!vectorizer_) vectorizer_ = std::make_unique<LabelVectorizer<T>>(plan_->width, forward_);
    for (unsigned y = 0; y < tile->Height() && !IsAborted(); ++y) {
      const std::size_t at = tile->Offset(0, y);
      vectorizer_->AddLine(tile->PixelArray().GetData() + at, tile->StateArray().GetData() + at);
    }
    if (vectorizer_->LineCount() == plan_->lines) vectorizer_->Finish();
    return args.Set(1, batch);
  }

 private:
  /// Fills the batch of the token.
  struct Forward final : LabelPolygonSink {
    explicit Forward(VectorizeTask& to) : task(to) {}
    bool Take(double label, TracedPolygon& polygon) override {
      return task.batch_->Take(label, polygon);
    }
    VectorizeTask& task;
  };

  VectorizePlan<T>* plan_;  // the process holds it
  PolygonBatch* batch_ = nullptr;
  Forward forward_{*this};
  std::unique_ptr<LabelVectorizer<T>> vectorizer_;
};

/// Writes the polygons in slot 1. Setup arguments: the plan.
template <typename T>
class WritePolygonsTask final : public SequentialTask {
 public:
  explicit WritePolygonsTask(ArgList& setup)
      : SequentialTask("WritePolygonsTask"),
        plan_(dynamic_cast<VectorizePlan<T>*>(setup.Get(0).Get())) {
    if (plan_ == nullptr) SetErrorState(TaskErrorBadParams());
  }

  bool Execute(ArgList& args) override {
    auto* const batch = dynamic_cast<PolygonBatch*>(args.Get(1).Get());
    if (HasError()) return false;
    if (batch != nullptr && batch->WriteTo<T>(*plan_->writer, plan_->counts)) return true;
    SetErrorState(TaskError());
    return false;
  }

 private:
  VectorizePlan<T>* plan_;
};

/// Whole lines of one band, as many as a block of the usual size has.
template <typename T>
TileDimensions BlocksOfLines(const RasterPtr<T>& raster) {
  constexpr unsigned kBudget = 0x100000;
  TileDimensions dimensions = WideTiles(raster.Get(), sizeof(T), kBudget, 0);
  dimensions.bands = 1;
  return dimensions;
}

Array<unsigned> OneBand(unsigned band) {
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = band;
  return bands;
}

}  // namespace

template <typename T>
RasterToVectorTask<T>::RasterToVectorTask(ArgList& setup)
    : SequentialTask("RasterToVectorTask"), iterator_(setup.Get(0)), writer_(setup.Get(1)) {
  if (iterator_.IsNull() || !iterator_->IsValid() || writer_.IsNull()) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  vectorizer_ = std::make_unique<LabelVectorizer<T>>(iterator_->GetRaster()->Samples(), batch_);
}

template <typename T>
RasterToVectorTask<T>::~RasterToVectorTask() {
  if (HasError() || IsAborted()) return;
  try {
    vectorizer_->Finish();
    batch_.WriteTo<T>(*writer_, counts_);
  } catch (const std::bad_alloc&) {
    writer_->SetErrorState(ObjectErrorOutOfMemory());
  }
}

template <typename T>
bool RasterToVectorTask<T>::Execute(ArgList& args) {
  if (HasError()) return false;
  const TilePtr<T> tile(args.Get(0));
  if (!IsBlockOfLines(tile.Get(), iterator_->GetRaster()->Samples()) || tile->Height() != 1) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  vectorizer_->AddLine(tile->PixelArray().GetData(), tile->StateArray().GetData());
  const bool isWritten = batch_.WriteTo<T>(*writer_, counts_);
  batch_.Clear();
  if (!isWritten) SetErrorState(TaskError());
  return isWritten;
}

template <typename T>
struct RasterToVectorProcess<T>::Stages {
  Pointer<VectorizePlan<T>> plan{new VectorizePlan<T>};
  ManagedTask<RasterReadTask<T>> read;
  ManagedTask<VectorizeTask<T>> vectorize;
  ManagedTask<WritePolygonsTask<T>> write;
};

template <typename T>
RasterToVectorProcess<T>::RasterToVectorProcess(const RasterPtr<T>& raster, unsigned band,
                                                const ObjectPtr& writer, const IPC& ipc,
                                                const AsyncCallbackPtr& callback)
    : ProcessBuilder("RasterToVectorProcess", ipc, callback), stages_(std::make_unique<Stages>()) {
  const RasterIteratorPtr<T> iterator(
      new RasterIterator<T>(raster, BlocksOfLines(raster), OneBand(band)));
  if (!iterator->IsValid() || writer.IsNull()) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  stages_->plan->width = raster->Samples();
  stages_->plan->lines = raster->Lines();
  stages_->plan->writer = writer;
  Process& process = GetPipeline();
  const ArgID iteratorId = process.TakeSetupArg();
  const ArgID planId = process.TakeSetupArg();
  const ArgID tile = process.TakeTokenArg();
  const ArgID batch = process.TakeTokenArg();
  const bool placed =
      process.AddTask(0, TaskDescriptor(&stages_->read, ArgIDs({tile}), ArgIDs({iteratorId}))) &&
      process.AddTask(
          1, TaskDescriptor(&stages_->vectorize, ArgIDs({tile, batch}), ArgIDs({planId}))) &&
      process.AddTask(2, TaskDescriptor(&stages_->write, ArgIDs({tile, batch}), ArgIDs({planId})));
  SetArg(iteratorId, iterator);
  SetArg(planId, stages_->plan);
  process.SetTotalTokens(std::uint64_t{iterator->Columns()} * iterator->Rows());
  if (placed) SetBuilt();
}

template <typename T>
RasterToVectorProcess<T>::~RasterToVectorProcess() = default;

template <typename T>
void RasterToVectorProcess<T>::SetMask(const LabelMaskPtr& mask) {
  stages_->plan->mask = mask;
}

template <typename T>
LabelCounts RasterToVectorProcess<T>::Counts() const {
  return stages_->plan->counts;
}

VEXG_INSTANCES(EIGHT, RasterToVectorTask);
VEXG_INSTANCES(EIGHT, RasterToVectorProcess);

}  // namespace lumo
