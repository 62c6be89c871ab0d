#include "rasters/value_names.h"

#include <algorithm>

namespace lumo::host {

std::vector<std::string> ReadValueNames(const String& categories) {
  const std::string all = categories.ToUTF8();
  std::vector<std::string> names;
  if (all.empty()) return names;
  for (std::size_t start = 0; start <= all.size();) {
    const std::size_t bar = std::min(all.find('|', start), all.size());
    names.push_back(all.substr(start, bar - start));
    start = bar + 1;
  }
  return names;
}

}  // namespace lumo::host
