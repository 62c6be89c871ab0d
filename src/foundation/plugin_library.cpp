#include "foundation/plugin_library.h"

#include <filesystem>
#include <map>
#include <mutex>
#include <string_view>

#include "foundation/environment.h"
#include "foundation/own_plugin.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

/// The version of the interfaces that plug-ins are built against.
std::string InterfaceVersion() {
  const std::string version = VEXG_VERSION;
  return version.substr(0, version.rfind('.'));
}

/// When the files of a plug-in's name were last changed, the smallest time where there is none.
using Changes = std::vector<fs::file_time_type>;

Changes ChangesOf(const std::vector<std::string>& paths) {
  Changes changes;
  for (const std::string& path : paths) {
    std::error_code missing;
    const fs::file_time_type time = fs::last_write_time(path, missing);
    changes.push_back(missing ? fs::file_time_type::min() : time);
  }
  return changes;
}

/// Looks for the note of VEXG_OWN_PLUGIN.
bool HasOwnMark(const std::string& path) {
  constexpr std::size_t kFirstBytes = 8192;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, nullptr,
                                       platform::RandomAccessFile::Gate::kPassed);
  std::string bytes(kFirstBytes, '\0');
  std::size_t got = 0;
  if (file == nullptr || !file->ReadUpTo(0, bytes.data(), bytes.size(), got)) return false;
  bytes.resize(got);
  static constexpr char kMark[] = "vexg-pi\0comes with vexg";
  return bytes.find(std::string_view(kMark, sizeof kMark)) != bytes.npos;
}

struct Failure {
  Changes changes;
  std::string fault;
};

}  // namespace

std::vector<std::string> PluginDirectories() {
  std::vector<std::string> directories;
  const String bin = GetGlobalEnvironmentImpl().Find(Environment::kBinDirectory);
  if (bin.GetLength() != 0) directories.push_back(bin.ToUTF8());
  const std::string own = platform::LibraryDirectory();
  if (own.empty()) return directories;
  directories.push_back(own + "/vexg/plugins-" + InterfaceVersion());
  directories.push_back(own);
  return directories;
}

bool IsOwnPlugin(const std::string& name) {
  static std::mutex mutex;
  static auto& known = *new std::map<std::vector<std::string>, std::pair<Changes, bool>>;
  std::vector<std::string> paths = PluginDirectories();
  for (std::string& path : paths) path.append("/").append(name);
  const Changes changes = ChangesOf(paths);
  const std::lock_guard lock(mutex);
  const auto at = known.find(paths);
  if (at != known.end() && at->second.first == changes) return at->second.second;
  std::size_t i = 0;
  while (i < paths.size() && changes[i] == fs::file_time_type::min()) ++i;
  const bool isOwn = i < paths.size() && HasOwnMark(paths[i]);
  known[paths] = {changes, isOwn};
  return isOwn;
}

platform::Module LoadPlugin(const std::string& name, std::string& fault) {
  static std::mutex mutex;
  static std::map<std::vector<std::string>, Failure> failures;
  std::vector<std::string> paths = PluginDirectories();
  for (std::string& path : paths) path.append("/").append(name);
  const Changes changes = ChangesOf(paths);
  const std::lock_guard lock(mutex);
  const auto known = failures.find(paths);
  if (known != failures.end() && known->second.changes == changes) {
    fault = known->second.fault;
    return {};
  }
  platform::Module module;
  std::size_t i = 0;
  while (i < paths.size() && changes[i] == fs::file_time_type::min()) ++i;
  module = LoadPluginFile(i < paths.size() ? paths[i] : name, fault);
  if (!module.IsLoaded()) failures[paths] = {changes, fault};
  return module;
}

platform::Module LoadPluginFile(const std::string& path, std::string& fault) {
  using Binding = platform::Module::Binding;
  return platform::Module::Load(path, &fault,
                                HasOwnMark(path) ? Binding::kAtCall : Binding::kAtLoad);
}

}  // namespace lumo
