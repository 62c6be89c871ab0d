#pragma once

#include "foundation/pointer.h"

namespace lumo {

/// What the scalars of all value types have in common: one type code. A cast by IsA therefore can't
/// tell a Scalar<String> from a Scalar<double>.
class VEXG_EXPORT ScalarObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// One value in an object, so that it can travel through an ObjectPtr.
template <typename T>
class Scalar : public ScalarObject {
 public:
  Scalar() = default;
  explicit Scalar(const T& initial) : value(initial) {}

  T value = T();
};

template <typename T>
using ScalarPtr = Pointer<Scalar<T>>;

/// The value of the Scalar<T> at `object`; null when there is none, or one of another value type.
template <typename T>
const T* FindScalarValue(const ObjectPtr& object) {
  const auto* const scalar = dynamic_cast<const Scalar<T>*>(object.Get());
  return scalar != nullptr ? &scalar->value : nullptr;
}

}  // namespace lumo
