#include "viewer/page_files.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

#include <fmt/format.h>

#include "foundation/environment.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

/// The type of a file by its ending; empty for one that is no part of the page.
std::string TypeOf(const fs::path& file) {
  static const std::map<std::string, std::string> types{{".html", "text/html; charset=utf-8"},
                                                        {".css", "text/css; charset=utf-8"},
                                                        {".js", "text/javascript; charset=utf-8"},
                                                        {".svg", "image/svg+xml"}};
  const auto at = types.find(file.extension().string());
  return at == types.end() ? std::string() : at->second;
}

}  // namespace

PageFiles::PageFiles() {
  const char* const given = std::getenv("VEXG_VIEW_PAGE");
  const fs::path folder =
      given != nullptr
          ? fs::path(given)
          : fs::path(GetGlobalEnvironmentImpl().Find(Environment::kXmlDirectory).ToUTF8()) / "view";
  std::error_code fault;
  for (const fs::directory_entry& entry : fs::directory_iterator(folder, fault)) {
    const std::string type = TypeOf(entry.path());
    if (type.empty()) continue;
    std::ifstream in(entry.path(), std::ios::binary);
    const std::string text{std::istreambuf_iterator<char>(in), {}};
    files_[fmt::format("/{}", entry.path().filename().string())] = {type, text};
  }
  const auto page = files_.find("/index.html");
  if (page == files_.end()) {
    throw HostError(kExitFailed, folder.string() + ": the page of the viewer is not there");
  }
  files_["/"] = page->second;
}

const PageFiles::File* PageFiles::Find(const std::string& path) const {
  const auto at = files_.find(path);
  return at == files_.end() ? nullptr : &at->second;
}

}  // namespace lumo::host
