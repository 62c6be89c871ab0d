#include "foundation/fault.h"

#include <utility>

#include "foundation/near_name.h"

namespace lumo {
namespace {

thread_local String tFault;

}  // namespace

void SetFault(const String& text) {
  // Names of files may hold anything, and the text goes to terminals and into lines.
  tFault = text.GetLength() != 0 ? String(Printable(text.ToUTF8())) : text;
}

String TakeFault() {
  return std::exchange(tFault, String());
}

String TakeFaultOr(const char* otherwise) {
  const String told = TakeFault();
  return told.GetLength() != 0 ? told : String(otherwise);
}

}  // namespace lumo
