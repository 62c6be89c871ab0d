#include "fx/class_names.h"

#include <algorithm>
#include <charconv>

namespace lumo {
namespace {

bool IsInFront(const std::string& a, const std::string& b) {
  double x = 0, y = 0;
  const auto isNumber = [](const std::string& text, double& value) {
    const char* const end = text.data() + text.size();
    return std::from_chars(text.data(), end, value).ptr == end;
  };
  const bool first = isNumber(a, x), second = isNumber(b, y);
  if (first && second && x != y) return x < y;
  return first != second ? first : a < b;
}

}  // namespace

std::vector<std::string> OrderClassNames(std::vector<std::string> names) {
  std::sort(names.begin(), names.end(), IsInFront);
  names.erase(std::unique(names.begin(), names.end()), names.end());
  return names;
}

}  // namespace lumo
