#include "foundation/fault.h"

#include <utility>

namespace lumo {
namespace {

thread_local String tFault;

}  // namespace

void SetFault(const String& text) {
  tFault = text;
}

String TakeFault() {
  return std::exchange(tFault, String());
}

String TakeFaultOr(const char* otherwise) {
  const String told = TakeFault();
  return told.GetLength() != 0 ? told : String(otherwise);
}

}  // namespace lumo
