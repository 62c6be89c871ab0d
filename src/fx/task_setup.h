#pragma once

#include "foundation/scalar.h"
#include "tasks/task.h"

// Readers of the objects that the stages of the feature extraction are made from.

namespace lumo {

/// Makes an object of a value, which a stage is made from.
template <typename T>
ObjectPtr MakeSetup(const T& value) {
  return ObjectPtr(new Scalar<T>(value));
}

/// Reads the Scalar<T> at a position of what a task is made from. False where there is none.
template <typename T>
bool ReadSetup(const ArgList& setup, unsigned position, T& value) {
  const T* const found = FindScalarValue<T>(setup.Get(position));
  if (found != nullptr) value = *found;
  return found != nullptr;
}

/// Finds the array at a position of what a task is made from, which shares it; empty where there is
/// none.
template <typename T>
Pointer<Array<T>> FindSetupArray(const ArgList& setup, unsigned position) {
  const Pointer<Array<T>> found(setup.Get(position));
  const bool fits =
      dynamic_cast<const Array<T>*>(static_cast<ArrayObject*>(found.Get())) != nullptr;
  return fits ? found : Pointer<Array<T>>();
}

}  // namespace lumo
