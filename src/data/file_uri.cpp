#include "data/file_uri.h"

#include <filesystem>

namespace lumo {
namespace {

constexpr std::string_view kBracket = "]";
constexpr std::string_view kEncodedBracket = "%5D";
constexpr std::string_view kCounterMark = "//";

std::string Replace(std::string text, std::string_view from, std::string_view to) {
  for (std::size_t at = 0; (at = text.find(from, at)) != std::string::npos; at += to.size()) {
    text.replace(at, from.size(), to);
  }
  return text;
}

}  // namespace

URI FileURI(const std::string& path) {
  std::error_code fault;
  const std::filesystem::path absolute = std::filesystem::weakly_canonical(path, fault);
  return URI(String(Replace(fault ? path : absolute.string(), kBracket, kEncodedBracket)));
}

std::string PathOfFileURI(const URI& uri) {
  std::string text = uri.ToUTF8();
  const std::size_t counter = text.rfind(kCounterMark);
  const std::size_t digits = counter + kCounterMark.size();
  if (counter != text.npos && digits < text.size() &&
      text.find_first_not_of("0123456789", digits) == text.npos) {
    text.resize(counter);
  }
  return Replace(text, kEncodedBracket, kBracket);
}

URI CountedURI(const URI& uri, unsigned counter) {
  if (counter == 1) return uri;
  return URI(String(uri.ToUTF8().append(kCounterMark).append(std::to_string(counter))));
}

std::vector<std::string> PathsIn(const std::string& name) {
  std::vector<std::string> paths{name};
  constexpr const char* kMarks = ":\"'";
  for (std::size_t at = 0; (at = name.find_first_of(kMarks, at)) != name.npos;) {
    ++at;
    const std::size_t end = name.find_first_of(kMarks, at);
    if (at < name.size()) paths.push_back(name.substr(at));
    if (end != name.npos && end != at) paths.push_back(name.substr(at, end - at));
  }
  return paths;
}

}  // namespace lumo
