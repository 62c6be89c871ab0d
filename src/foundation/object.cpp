#include "foundation/object.h"

#include <sstream>

#include "foundation/type_code.h"

namespace lumo {

const unsigned Object::TypeCode = GloballyUniqueObjectTypeCode("Object");

bool Object::IsA(unsigned typeCode) const {
  return typeCode == TypeCode;
}

URI Object::GetURI() const {
  std::ostringstream text;
  text << "{Object}@" << std::hex << reinterpret_cast<std::uintptr_t>(this);
  return URI(text.str());
}

bool Object::IsValid() const {
  return !HasError();
}

}  // namespace lumo
