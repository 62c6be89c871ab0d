#include "foundation/containers.h"

#include "foundation/scalar.h"
#include "foundation/type_code.h"

namespace lumo {

const unsigned ScalarObject::TypeCode = GloballyUniqueObjectTypeCode("Scalar");
const unsigned MapObject::TypeCode = GloballyUniqueObjectTypeCode("Map");
const unsigned SetObject::TypeCode = GloballyUniqueObjectTypeCode("Set");
const unsigned ListObject::TypeCode = GloballyUniqueObjectTypeCode("List");
const unsigned DequeObject::TypeCode = GloballyUniqueObjectTypeCode("Deque");

bool ScalarObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

bool MapObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

bool SetObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

bool ListObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

bool DequeObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

}  // namespace lumo
