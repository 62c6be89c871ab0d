#pragma once

#include "foundation/scalar.h"
#include "pyramid/pyramid_process.h"

namespace lumo {

namespace detail {

/// The blocks of the paths kScanline and kRow, with the axes in the source's own order.
template <typename T>
class PyramidSourceIterator final : public RasterIterator<T> {
 public:
  PyramidSourceIterator(const RasterPtr<T>& raster, const TileDimensions& tiles)
      : RasterIterator<T>(raster, tiles) {
    this->order_ = StreamOrder(raster.Get());
  }
};

template <typename T>
RasterIteratorPtr<T> MakePyramidIterator(const PyramidPlan<T>& plan, PyramidPath path) {
  // Whole lines, as many as stay in the caches between the stages.
  const TileDimensions tiles =
      path == PyramidPath::kRow
          ? TileDimensions{plan.tileSide, plan.tileSide}
          : WideTiles(plan.source.Get(), sizeof(T), RasterIteratorStream<T>::kBudget, 0);
  return RasterIteratorPtr<T>(new PyramidSourceIterator<T>(plan.source, tiles));
}

inline ObjectPtr MakeScalar(unsigned value) {
  return ObjectPtr(new Scalar<unsigned>(value));
}

}  // namespace detail

template <typename T>
RasterPyramidProcess<T>::RasterPyramidProcess(const char* name, const PyramidPlan<T>& plan,
                                              PyramidCallback<T>* receiver, const IPC& ipc)
    : ProcessBuilderCallback<Process, PyramidCallback<T>>(name, receiver, ipc),
      plan_(plan),
      path_(ChoosePyramidPath(plan.source->GetRasterDef())),
      tile_(this->GetPipeline().TakeTokenArg()) {}

template <typename T>
ArgID RasterPyramidProcess<T>::AddSetup(const ObjectPtr& object) {
  const ArgID id = this->GetPipeline().TakeSetupArg();
  SetArg(id, object);
  return id;
}

template <typename T>
bool RasterPyramidProcess<T>::AddStage(TaskFactory* factory, const std::vector<ArgID>& setup) {
  Array<ArgID> ids{ArrayDims(static_cast<unsigned>(setup.size()))};
  std::copy(setup.begin(), setup.end(), ids.begin());
  return this->GetPipeline().AddTask(stages_++, TaskDescriptor(factory, ArgIDs({tile_}), ids));
}

/// Places the stage that reads. @return the factory of the tasks for levels; null on a failure.
template <typename T>
TaskFactory* RasterPyramidProcess<T>::PlaceReader() {
  Process& process = this->GetPipeline();
  if (path_ == PyramidPath::kMorten) {
    const unsigned blockSide = TilingOf(plan_.source->Bands(), plan_.tileSide).side;
    const ObjectPtr side = detail::MakeScalar(blockSide);
    const LevelShape blocks(plan_.source->Samples(), plan_.source->Lines(), 0, blockSide);
    process.SetTotalTokens(std::uint64_t{blocks.Columns()} * blocks.Rows() * plan_.source->Bands());
    const bool placed =
        AddStage(&mortenRead_, {AddSetup(plan_.source), AddSetup(side), AddSetup(side)});
    return placed ? &mortenDecimate_ : nullptr;
  }
  const RasterIteratorPtr<T> iterator = detail::MakePyramidIterator(plan_, path_);
  process.SetTotalTokens(std::uint64_t{iterator->Columns()} * iterator->Rows());
  if (!AddStage(&read_, {AddSetup(iterator)})) return nullptr;
  if (path_ == PyramidPath::kRow) return &rowDecimate_;
  return &scanlineDecimate_;
}

template <typename T>
void RasterPyramidProcess<T>::Place(TaskFactory* statsTask, const ObjectPtr& stats) {
  TaskFactory* const decimate = PlaceReader();
  if (decimate == nullptr) return;
  const bool hasStats = statsTask != nullptr && path_ != PyramidPath::kMorten;
  if (hasStats && !AddStage(statsTask, {AddSetup(stats)})) return;

  const ArgID full = AddSetup(plan_.full);
  const ArgID side = AddSetup(detail::MakeScalar(plan_.tileSide));
  std::vector<ArgID> more;
  if (path_ == PyramidPath::kMorten) {
    const unsigned blockSide = TilingOf(plan_.source->Bands(), plan_.tileSide).side;
    more.assign(2, AddSetup(detail::MakeScalar(blockSide)));
  }
  for (unsigned level = plan_.levelMin; level <= plan_.levelMax; ++level) {
    std::vector<ArgID> setup{full, AddSetup(detail::MakeScalar(level)), side};
    setup.insert(setup.end(), more.begin(), more.end());
    if (!AddStage(decimate, setup)) return;
  }
  this->SetBuilt();
}

}  // namespace lumo
