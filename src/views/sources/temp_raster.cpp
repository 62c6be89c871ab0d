#include <cstdio>

#include "data/access_policy.h"
#include "foundation/fault.h"
#include "views/sources/temp_raster_body.h"

namespace lumo {
namespace {

constexpr unsigned kNames = 10000;

std::string TempDirectory(const String& wanted) {
  std::error_code fault;
  std::string directory = wanted.ToUTF8();
  const std::vector<std::string> roots = GetAccessPolicy().roots;
  if (directory.empty() && !roots.empty()) directory = roots.front();
  if (directory.empty() || !std::filesystem::is_directory(directory, fault)) {
    directory = std::filesystem::temp_directory_path(fault).string();
  }
  if (!directory.empty() && directory.back() != '/' && directory.back() != '\\') {
    directory.push_back('/');
  }
  return directory;
}

}  // namespace

String TempFileName(const String& directory, const String& prefix, const String& extension) {
  const std::string folder = TempDirectory(directory);
  if (folder.empty()) {
    SetFault("there is no directory for temporary files");
    return {};
  }
  std::string start = folder;
  start.append(prefix.GetLength() != 0 ? prefix.ToUTF8() : "cdftmp");
  std::string end = extension.GetLength() != 0 ? extension.ToUTF8() : ".tmp";
  if (end.front() != '.') end = std::string(1, '.').append(end);
  for (unsigned i = 0; i < kNames; ++i) {
    char digits[8];
    std::snprintf(digits, sizeof(digits), "%04u", i);
    std::string name = start;
    name.append(digits).append(end);
    if (i == 0 && !MayUseSource(ConnStrings({name}), true)) return {};
    std::FILE* const file = std::fopen(name.c_str(), "wbx");
    if (file != nullptr) {
      std::fclose(file);
      return name;
    }
    std::error_code fault;
    if (!std::filesystem::exists(std::filesystem::symlink_status(name, fault))) break;
  }
  SetFault(folder + ": no temporary file can be made here");
  return {};
}

VEXG_INSTANCES(EIGHT, TempRaster);

}  // namespace lumo
