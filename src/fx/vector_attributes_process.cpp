#include "fx/vector_attributes_process.h"

#include <algorithm>

#include "foundation/fault.h"
#include "geometry/vector_read_task.h"
#include "tasks/task_errors.h"

namespace lumo {

bool AddShape(RecordSpool& spool, std::uint32_t label, const ShapeSums::Values& values) {
  float record[SpatialRegionAttributes::kAttributes];
  std::transform(values.begin(), values.end(), record,
                 [](double value) { return static_cast<float>(value); });
  return spool.Add(label, record);
}

template <typename L, typename C, typename File>
SpatialRegionAttributesComputeTask<L, C, File>::SpatialRegionAttributesComputeTask(ArgList& setup)
    : SequentialTask("SpatialRegionAttributesComputeTask"),
      held_(setup.Get(0)),
      setup_(dynamic_cast<SpatialSetup<File>*>(held_.Get())) {
  if (setup_ == nullptr || setup_->file.IsNull() || !setup_->file->IsValid()) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  spool_ = std::make_unique<RecordSpool>(*setup_->file);
}

template <typename L, typename C, typename File>
SpatialRegionAttributesComputeTask<L, C, File>::~SpatialRegionAttributesComputeTask() {
  if (HasError() || IsAborted()) return;
  try {
    for (const auto& [label, shape] : repeated_) Write(label, shape);
    spool_->Flush();
  } catch (const std::bad_alloc&) {
    setup_->file->SetErrorState(ObjectErrorOutOfMemory());
  }
}

template <typename L, typename C, typename File>
bool SpatialRegionAttributesComputeTask<L, C, File>::Write(std::uint32_t label,
                                                           const ShapeSums& shape) {
  const bool isTogether = setup_->parts == RegionParts::kTogether;
  return AddShape(*spool_, label, shape.GetValues(setup_->size, isTogether));
}

template <typename L, typename C, typename File>
bool SpatialRegionAttributesComputeTask<L, C, File>::Execute(ArgList& args) {
  if (HasError()) return false;
  const Polygon2DPtr<C> polygon(args.Get(0));
  if (polygon.IsNull() || !polygon->IsValid() || polygon->Label() < 0) {
    if (polygon && polygon->Label() < 0) {
      SetFault(String("VectorFXV: there is a label " +
                      std::to_string(static_cast<std::int64_t>(polygon->Label())) +
                      "; labels are 0 or above"));
    }
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  const auto label = static_cast<std::uint32_t>(polygon->Label());
  ShapeSums shape;
  shape.Add(*polygon, setup_->size);
  if (setup_->parts == RegionParts::kTogether && setup_->counts.Get(label) > 1) {
    repeated_[label].Merge(shape);
    return true;
  }
  if (Write(label, shape)) return true;
  SetErrorState(TaskError());
  return false;
}

template <typename L, typename C, typename File>
struct SpatialRegionAttributesComputeProcess<L, C, File>::Stages {
  ManagedTask<VectorReadTask<L, C>> read;
  ManagedTask<SpatialRegionAttributesComputeTask<L, C, File>> compute;
};

template <typename L, typename C, typename File>
SpatialRegionAttributesComputeProcess<L, C, File>::SpatialRegionAttributesComputeProcess(
    const PolygonReaderPtr<L, C>& reader, const Pointer<SpatialSetup<File>>& setup, const IPC& ipc)
    : ProcessBuilder("SpatialRegionAttributesComputeProcess", ipc),
      stages_(std::make_unique<Stages>()) {
  Process& process = GetPipeline();
  const ArgID readerId = process.TakeSetupArg();
  const ArgID setupId = process.TakeSetupArg();
  const ArgID polygon = process.TakeTokenArg();
  const bool placed =
      process.AddTask(0, TaskDescriptor(&stages_->read, ArgIDs({polygon}), ArgIDs({readerId}))) &&
      process.AddTask(1, TaskDescriptor(&stages_->compute, ArgIDs({polygon}), ArgIDs({setupId})));
  SetArg(readerId, reader);
  SetArg(setupId, setup);
  process.SetTotalTokens(reader.IsNull() ? 0 : reader->Count());
  if (placed) SetBuilt();
}

template <typename L, typename C, typename File>
SpatialRegionAttributesComputeProcess<L, C, File>::~SpatialRegionAttributesComputeProcess() =
    default;

template class SpatialRegionAttributesComputeTask<std::int32_t, std::uint32_t,
                                                  SpatialRegionAttributesFile>;
template class SpatialRegionAttributesComputeProcess<std::int32_t, std::uint32_t,
                                                     SpatialRegionAttributesFile>;

}  // namespace lumo
