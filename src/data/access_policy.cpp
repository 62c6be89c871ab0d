#include "data/access_policy.h"

#include <algorithm>
#include <filesystem>
#include <mutex>
#include <string_view>

#include "data/file_uri.h"
#include "foundation/fault.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

std::mutex gMutex;
AccessPolicy gPolicy;
thread_local unsigned tOwnMemory = 0;
thread_local unsigned tAdmitted = 0;

bool IsOneOf(std::string_view text, std::initializer_list<std::string_view> list) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

bool Refuse(const std::string& what, const char* why) {
  SetFault(std::string(what).append(": ").append(why));
  return false;
}

/// Names that reach over the network: addresses with a scheme, and the file systems behind one.
bool IsNetworkName(std::string_view name) {
  if (name.find("://") != name.npos) return true;
  for (const std::string_view prefix : {"/vsicurl", "/vsis3", "/vsigs", "/vsiaz", "/vsiadls",
                                        "/vsioss", "/vsiswift", "/vsihdfs", "/vsiwebhdfs"}) {
    if (name.find(prefix) != name.npos) return true;
  }
  return false;
}

/// True when `path` lies in one of the folders once all links are followed.
bool LiesInside(const fs::path& path, const std::vector<std::string>& roots) {
  return std::any_of(roots.begin(), roots.end(), [&](const std::string& root) {
    const fs::path folder(root);
    return std::mismatch(folder.begin(), folder.end(), path.begin(), path.end()).first ==
           folder.end();
  });
}

/// True for what is there and is neither a file nor a folder.
bool IsSpecialFile(const std::string& path) {
  std::error_code fault;
  const fs::file_status status = fs::status(path, fault);
  return fs::exists(status) && !fs::is_regular_file(status) && !fs::is_directory(status);
}

/// True when a name is, or holds as a part, a device, a pipe or a socket.
bool NamesSpecialFile(const std::string& name) {
  const std::vector<std::string> paths = PathsIn(name);
  return std::any_of(paths.begin(), paths.end(), IsSpecialFile);
}

bool MayUseName(const std::string& name, const AccessPolicy& policy, bool making) {
  if (!policy.special && NamesSpecialFile(name)) {
    return Refuse(name, "is no file; devices and pipes are not allowed here");
  }
  if (IsNetworkName(name)) {
    if (policy.network) return true;
    return Refuse(name, "sources on the network are not allowed here");
  }
  if (name.find("/vsi") != name.npos) {
    if (policy.virtualFiles) return true;
    return Refuse(name, "virtual files are not allowed here");
  }
  if (policy.roots.empty()) return true;

  std::error_code fault;
  const fs::path named(name);
  fs::path resolved = fs::canonical(named, fault);
  if (fault && making) {
    // A link that leads nowhere would be followed when the file is made.
    if (fs::is_symlink(fs::symlink_status(named, fault))) {
      return Refuse(name, "outside the folders that are allowed here");
    }
    const fs::path folder = named.has_parent_path() ? named.parent_path() : fs::path(".");
    resolved = fs::canonical(folder, fault) / named.filename();
  }
  if (fault) return Refuse(name, "no such file in the folders that are allowed here");
  return LiesInside(resolved, policy.roots) ||
         Refuse(name, "outside the folders that are allowed here");
}

}  // namespace

bool SetAccessPolicy(const AccessPolicy& policy) {
  AccessPolicy resolved = policy;
  for (std::string& root : resolved.roots) {
    std::error_code fault;
    const fs::path folder = fs::canonical(root, fault);
    if (fault || !fs::is_directory(folder, fault)) return Refuse(root, "no such directory");
    root = folder.string();
  }
  const std::lock_guard lock(gMutex);
  gPolicy = resolved;
  return true;
}

OwnMemoryScope::OwnMemoryScope() {
  ++tOwnMemory;
}

OwnMemoryScope::~OwnMemoryScope() {
  --tOwnMemory;
}

AdmittedSourceScope::AdmittedSourceScope() {
  ++tAdmitted;
}

AdmittedSourceScope::~AdmittedSourceScope() {
  --tAdmitted;
}

AccessPolicy GetAccessPolicy() {
  const std::lock_guard lock(gMutex);
  return gPolicy;
}

bool MayUseFormat(const FormatRecord& format) {
  const AccessPolicy policy = GetAccessPolicy();
  const std::string name = format.name.ToUTF8();
  if (!policy.memory && tOwnMemory == 0 && name == "MemoryRaster") {
    return Refuse(name, "memory addresses are not allowed here");
  }
  if (!policy.network &&
      IsOneOf(name, {"WMS", "WCS", "JPIP", "EsriImageService", "EsriRasterCatalogItem"})) {
    return Refuse(name, "sources on the network are not allowed here");
  }
  if (!policy.indirect && IsOneOf(name, {"WMS", "WCS", "Spot", "PDS", "EXTERNAL"})) {
    return Refuse(name, "formats whose files name other files are not allowed here");
  }
  return true;
}

bool MayUseSource(const Array<String>& connStrings, bool making) {
  if (tAdmitted != 0) return true;
  const AccessPolicy policy = GetAccessPolicy();
  if (FindFormatName(connStrings) == "MemoryRaster") {
    return MayUseFormat(*FindFormat("MemoryRaster"));
  }
  for (const String& piece : connStrings) {
    const FormatRecord* const format = FindFormat(piece);
    if (format != nullptr ? !MayUseFormat(*format) : !MayUseName(piece.ToUTF8(), policy, making)) {
      return false;
    }
  }
  return true;
}

}  // namespace lumo
