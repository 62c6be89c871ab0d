#include "raster/block_states.h"

#include <algorithm>

#include "raster/interleave.h"

namespace lumo {

unsigned char* BlockStates::Make(Interleave order, unsigned width, unsigned height,
                                 unsigned bands) {
  if (areMade_) return room_.GetData();
  const std::lock_guard lock(lock_);
  if (areMade_) return room_.GetData();
  const ArrayDims dims = BlockDims(order, width, height, bands);
  // A larger array would get a copy of the old contents, which are of no use.
  if (dims.count > room_.GetCapacity() && room_.OwnsData()) room_ = Array<unsigned char>();
  if (!room_.Resize(dims) || room_.GetCount() != dims.count) return nullptr;
  std::fill_n(room_.GetData(), room_.GetCount(), static_cast<unsigned char>(0));
  areMade_ = true;
  return room_.GetData();
}

}  // namespace lumo
