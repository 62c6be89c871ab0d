#include "options/troff.h"

#include <fmt/format.h>

#include "foundation/library.h"

namespace lumo::host {

std::string Troff(const std::string& text) {
  std::string escaped;
  for (const char c : text) {
    if (c == '\\' || c == '-') escaped += '\\';
    escaped += c == '\\' ? 'e' : c;
  }
  return escaped.starts_with('.') || escaped.starts_with('\'') ? "\\&" + escaped : escaped;
}

std::string HeadOfManual(const std::string& name, int section, const std::string& summary) {
  return fmt::format(".TH {} {} \"\" \"vexg {}\"\n.SH NAME\n{} \\- {}\n", name, section,
                     GetLibraryVersion(), Troff(name), Troff(summary));
}

}  // namespace lumo::host
