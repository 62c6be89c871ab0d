#pragma once

#include <utility>

#include "foundation/array.h"

namespace lumo {

/// Makes a list long enough to hold `index`, and keeps what it holds when there is no memory for
/// that, where resizing in place would lose it.
/// @return false, with no change, when it can't grow.
/// Elements that are added hold whatever Array gives them: plain data are not initialised. Each
/// call that grows the list copies it, so a list that grows one by one costs the square of its
/// count.
template <typename T>
bool GrowToHold(Array<T>& list, unsigned index) {
  if (index < list.GetCount()) return true;
  if (index == ArrayDims::kTooMany) return false;
  Array<T> longer(list);
  if (!longer.IsValid() || !longer.Resize(ArrayDims(index + 1))) return false;
  list = std::move(longer);
  return true;
}

}  // namespace lumo
