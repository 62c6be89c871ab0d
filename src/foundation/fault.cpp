#include "foundation/fault.h"

#include <utility>

#include "foundation/near_name.h"
#include "platform/temporary_file.h"

namespace lumo {
namespace {

thread_local String tFault;

}  // namespace

void SetFault(const String& text) {
  // Names of files may hold anything, and the text goes to terminals and into lines.
  if (text.GetLength() == 0) {
    tFault = text;
  } else {
    tFault = Printable(platform::WithoutTemporaryNames(text.ToUTF8()));
  }
}

String TakeFault() {
  return std::exchange(tFault, String());
}

String TakeFaultOr(const char* otherwise) {
  const String told = TakeFault();
  return told.GetLength() != 0 ? told : String(otherwise);
}

}  // namespace lumo
