#include "common/messages.h"

#include <algorithm>
#include <cctype>
#include <cpl_error.h>

#include "common/hdf5_files.h"
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
  SilenceHdf5();
  CPLPushErrorHandlerEx(Handler::Take, this);
}

Messages::~Messages() {
  CPLPopErrorHandler();
  CPLErrorReset();
}

namespace {

/// True when the name that ends at `end` goes on there, as that of a side file does.
bool GoesOn(const std::string& text, std::size_t end) {
  const auto isPart = [&](std::size_t at) {
    return at < text.size() && (std::isalnum(static_cast<unsigned char>(text[at])) != 0 ||
                                text[at] == '_' || text[at] == '-' || text[at] == '/');
  };
  return isPart(end) || (end < text.size() && text[end] == '.' && isPart(end + 1));
}

/// `text` without the file's own name, which stands in front of it anyway.
std::string WithoutName(std::string text, const std::string& name) {
  std::size_t at = text.find(name);
  if (name.empty() || at == std::string::npos || GoesOn(text, at + name.size())) return text;
  // "name: what", "name, band 1: what", "HDF5:"name"://place, band 1: what"
  const std::size_t comma = text.find_first_of(",: ", at + name.size());
  const bool leads = at == 0 || text.substr(0, at).find(' ') == std::string::npos;
  if (leads && comma != std::string::npos) {
    const std::size_t end = text[comma] == ' ' ? comma : text.find(' ', comma);
    if (end != std::string::npos && end + 1 < text.size()) return text.substr(end + 1);
  }
  std::size_t length = name.size();
  const auto isQuote = [](char c) { return c == '\'' || c == '`' || c == '"'; };
  if (at != 0 && isQuote(text[at - 1])) --at, ++length;
  if (at + length < text.size() && isQuote(text[at + length])) ++length;
  return text.replace(at, length, "it");
}

}  // namespace

bool Messages::Fail(const std::string& name, const char* otherwise) const {
  // GDAL itself puts the name into some messages.
  return FailWith(name, Text().empty() ? otherwise : WithoutName(Text(), name));
}

void Messages::Clear() {
  error_.clear();
  warning_.clear();
}

bool FailWith(const std::string& name, const std::string& what) {
  SetFault(std::string(name).append(": ").append(what));
  return false;
}

}  // namespace lumo::gdal
