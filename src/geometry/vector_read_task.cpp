#include "geometry/vector_read_task.h"

#include <string>

#include "foundation/fault.h"
#include "tasks/task_errors.h"

namespace lumo {

template <typename L, typename C>
VectorReadTask<L, C>::VectorReadTask(ArgList& setup)
    : SequentialTask("VectorReadTask"),
      source_(setup.Get(0)),
      reader_(dynamic_cast<PolygonReader<L, C>*>(source_.Get())) {
  if (reader_ == nullptr || !reader_->IsValid()) SetErrorState(TaskErrorBadParams());
}

template <typename L, typename C>
bool VectorReadTask<L, C>::Execute(ArgList& args) {
  if (HasError() || read_ == reader_->Count()) return false;
  const Polygon2DPtr<C> polygon(new Polygon2D<C>);
  if (!reader_->Read(*polygon)) {
    SetFault("polygon " + std::to_string(read_ + 1) + " of " + std::to_string(reader_->Count()) +
             " can't be read");
    SetErrorState(TaskError());
    return false;
  }
  ++read_;
  return args.Set(0, polygon);
}

template class VectorReadTask<std::int32_t, std::uint32_t>;

}  // namespace lumo
