#include "foundation/warnings.h"

#include <algorithm>
#include <utility>

#include "foundation/near_name.h"

namespace lumo {
namespace {

constexpr std::size_t kMost = 8;

thread_local std::vector<std::string> tWarnings;

}  // namespace

void AddWarning(const std::string& text) {
  const std::string line = Printable(text);
  if (tWarnings.size() >= kMost) return;
  if (std::find(tWarnings.begin(), tWarnings.end(), line) == tWarnings.end()) {
    tWarnings.push_back(line);
  }
}

std::vector<std::string> TakeWarnings() {
  return std::exchange(tWarnings, {});
}

}  // namespace lumo
