#include "common/messages.h"

#include <algorithm>
#include <cpl_error.h>

#include "foundation/fault.h"

namespace lumo::gdal {

struct Messages::Handler {
  static void CPL_STDCALL Take(CPLErr severity, CPLErrorNum, const char* text) {
    auto* const messages = static_cast<Messages*>(CPLGetErrorHandlerUserData());
    if (severity != CE_Warning && severity != CE_Failure && severity != CE_Fatal) return;
    std::string& line = severity == CE_Warning ? messages->warning_ : messages->error_;
    line = text;
    std::replace(line.begin(), line.end(), '\n', ' ');
  }
};

Messages::Messages() {
  CPLPushErrorHandlerEx(Handler::Take, this);
}

Messages::~Messages() {
  CPLPopErrorHandler();
  CPLErrorReset();
}

std::string Messages::Text() const {
  if (const FileFault* const fault = faults_.First()) return fault->path + ": " + fault->Text();
  return error_.empty() ? warning_ : error_;
}

bool Messages::Fail(const std::string& name, const char* otherwise) const {
  const std::string text = Text();
  return FailWith(name, text.empty() ? otherwise : text);
}

void Messages::Clear() {
  faults_.Clear();
  error_.clear();
  warning_.clear();
}

bool FailWith(const std::string& name, const std::string& what) {
  // GDAL itself puts the name in front of some messages.
  SetFault(what.starts_with(name + ": ") ? what : name + ": " + what);
  return false;
}

}  // namespace lumo::gdal
