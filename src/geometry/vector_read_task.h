#pragma once

#include "geometry/polygon_stream.h"
#include "tasks/task.h"

namespace lumo {

/// The first stage of a process over polygons: each call reads the next one into slot 0, a
/// Polygon2DPtr<C>, until as many are read as the reader's Count(). Setup arguments: a
/// PolygonReader<L, C>. Exists for labels of std::int32_t with coordinates of std::uint32_t.
///
/// Failure: TaskErrorBadParams without a reader, or with one that isn't valid; TaskError when a
///          polygon that Count() promises can't be read, which ends the process.
template <typename L, typename C>
class VectorReadTask final : public SequentialTask {
 public:
  explicit VectorReadTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  ObjectPtr source_;  // holds reader_
  PolygonReader<L, C>* reader_;
  unsigned read_ = 0;
};

extern template class VEXG_EXPORT VectorReadTask<std::int32_t, std::uint32_t>;

}  // namespace lumo
