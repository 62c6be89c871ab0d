#pragma once

#include "foundation/pointer.h"

namespace lumo {

/// Gives the scalars of all value types one type code. A cast by IsA therefore finds a
/// Scalar<String> as well where a Scalar<double> is meant; FindScalarValue doesn't.
class VEXG_EXPORT ScalarObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// One value in an object, so that it can travel through an ObjectPtr:
///
///     const ObjectPtr input(new Scalar<String>(String("Byte")));
///     const String* const text = FindScalarValue<String>(input);  // null for another value type
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
