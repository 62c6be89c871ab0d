#include "data/file_uri.h"

#include <filesystem>

namespace lumo {
namespace {

constexpr std::string_view kBracket = "]";
constexpr std::string_view kEncodedBracket = "%5D";

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
  return Replace(uri.ToUTF8(), kEncodedBracket, kBracket);
}

}  // namespace lumo
