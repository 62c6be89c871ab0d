#include "viewer/work_folder.h"

#include <filesystem>

#include <fmt/format.h>

#include "platform/random_bytes.h"
#include "verb.h"

namespace lumo::host {

namespace fs = std::filesystem;

WorkFolder::WorkFolder() {
  std::error_code fault;
  const fs::path parent = fs::temp_directory_path(fault);
  if (!fault) {
    path_ = (parent / ("vexg-view-" + platform::RandomHex(16))).string();
    // Under a name that nobody can know before its permissions are set.
    fs::create_directory(path_, fault);
    if (!fault) fs::permissions(path_, fs::perms::owner_all, fault);
  }
  if (fault) {
    throw HostError(kExitFailed, "no folder for temporary files can be made: " + fault.message());
  }
}

WorkFolder::~WorkFolder() {
  Remove();
}

void WorkFolder::Remove() {
  std::error_code ignored;
  fs::remove_all(path_, ignored);
}

std::string WorkFolder::NewPath(const std::string& ending) {
  return fmt::format("{}/{}{}", path_, next_++, ending);
}

}  // namespace lumo::host
