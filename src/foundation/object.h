#pragma once

#include "foundation/error_state.h"
#include "foundation/string.h"

namespace lumo {

/// Root of all that can be held in the catalog, handed to a command or cast by type code.
///
/// Each derived class has a static `TypeCode`, taken at load from GloballyUniqueObjectTypeCode with
/// its short name, and answers IsA by comparing with it and then asking its base: a few integer
/// compares and nothing else.
class VEXG_EXPORT Object : public ErrorState {
 public:
  static const unsigned TypeCode;

  /// True when `typeCode` is the code of this object's class or of any of its bases up to Object.
  virtual bool IsA(unsigned typeCode) const;

  /// The key of this object in the catalog: "{Object}@" and the address in lower-case hexadecimal
  /// digits, unless the class has a natural identifier of its own.
  virtual URI GetURI() const;

  /// False when an error is stored.
  virtual bool IsValid() const;
};

}  // namespace lumo
