#include "data/access_policy.h"

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <mutex>
#include <string_view>
#include <utility>

#include "data/file_uri.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "platform/file_gate.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

std::mutex gMutex;
AccessPolicy gPolicy;
std::atomic<bool> gAreFilesLimited{false};
thread_local unsigned tOwnMemory = 0;
thread_local unsigned tAdmitted = 0;
thread_local String tRefusal;

bool IsOneOf(std::string_view text, std::initializer_list<std::string_view> list) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

bool Refuse(const std::string& what, const char* why) {
  SetFault(std::string(what).append(": ").append(why));
  return false;
}

constexpr const char* kOutside = "outside the folders that are allowed here";

bool StartsWithOneOf(std::string_view name, std::initializer_list<std::string_view> prefixes) {
  return std::any_of(prefixes.begin(), prefixes.end(),
                     [&](std::string_view prefix) { return name.starts_with(prefix); });
}

bool IsAlphanumeric(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

/// True when an address with a scheme stands somewhere in the name: "http://x", "WMS:http://x".
bool HoldsAddress(std::string_view name) {
  for (std::size_t at = name.find("://"); at != name.npos; at = name.find("://", at + 1)) {
    if (at != 0 && IsAlphanumeric(name[at - 1])) return true;
  }
  return false;
}

/// True when a name of a file system behind the network stands somewhere in the name.
bool HoldsNetworkFile(std::string_view name) {
  for (const std::string_view prefix : {"/vsicurl", "/vsis3", "/vsigs", "/vsiaz", "/vsiadls",
                                        "/vsioss", "/vsiswift", "/vsihdfs", "/vsiwebhdfs"}) {
    if (name.find(prefix) != name.npos) return true;
  }
  return false;
}

/// True for the beginning of a file system that no disk holds, whatever folders there are.
bool IsVirtualName(std::string_view name) {
  return StartsWithOneOf(
      name, {"/vsimem/",  "/vsizip/",   "/vsizip{",     "/vsigzip/",   "/vsitar/",   "/vsitar{",
             "/vsi7z/",   "/vsirar/",   "/vsisubfile/", "/vsisparse/", "/vsicached", "/vsicrypt/",
             "/vsistdin", "/vsistdout", "/vsicurl",     "/vsis3",      "/vsigs",     "/vsiaz",
             "/vsiadls",  "/vsioss",    "/vsiswift",    "/vsihdfs",    "/vsiwebhdfs"});
}

bool Exists(const std::string& name) {
  std::error_code fault;
  return fs::exists(fs::status(name, fault));
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

/// Where a name leads: links are followed, and what isn't there yet lies in its folder. False when
/// that can't be found out, as for a link that leads nowhere: making the file would follow it.
bool Resolve(const std::string& name, fs::path& resolved) {
  std::error_code fault;
  const fs::path named(name);
  resolved = fs::canonical(named, fault);
  if (!fault) return true;
  std::error_code missing;
  if (fs::is_symlink(fs::symlink_status(named, missing))) return false;
  const fs::path folder = named.has_parent_path() ? named.parent_path() : fs::path(".");
  fault.clear();
  resolved = fs::canonical(folder, fault) / named.filename();
  return !fault && named.filename() != "..";
}

bool MayUseFile(const std::string& name, const AccessPolicy& policy, bool making) {
  if (policy.roots.empty()) return true;
  fs::path resolved;
  if (!Resolve(name, resolved)) return Refuse(name, kOutside);
  if (!making && !Exists(name)) {
    return Refuse(name, "no such file in the folders that are allowed here");
  }
  return LiesInside(resolved, policy.roots) || Refuse(name, kOutside);
}

/// The files that stand in a name of the form DRIVER:"file":rest or DRIVER:file:rest.
std::vector<std::string> FilesInName(const std::string& name) {
  std::vector<std::string> files;
  const std::size_t open = name.find('"');
  const std::size_t close = open != name.npos ? name.find('"', open + 1) : name.npos;
  if (close != name.npos) {
    const std::string quoted = name.substr(open + 1, close - open - 1);
    if (Exists(quoted)) files.push_back(quoted);
  }
  std::vector<std::size_t> marks;  // of the pieces between colons
  for (std::size_t at = name.find(':'); at != name.npos; at = name.find(':', at + 1)) {
    marks.push_back(at);
  }
  constexpr std::size_t kMostColons = 16;
  if (marks.empty() || marks.size() > kMostColons) return files;
  marks.push_back(name.size());
  for (std::size_t from = 0; from + 1 < marks.size(); ++from) {
    for (std::size_t to = from + 1; to < marks.size(); ++to) {
      const std::string piece = name.substr(marks[from] + 1, marks[to] - marks[from] - 1);
      // "//band" is the place of a raster in its file; at worst it names the root folder.
      if (!piece.empty() && !piece.starts_with("//") && Exists(piece)) files.push_back(piece);
    }
  }
  return files;
}

/// The path of an address "file:…"; empty for another name.
std::string PathOfAddress(const std::string& name) {
  constexpr std::string_view kScheme = "file:";
  if (!name.starts_with(kScheme)) return {};
  const std::string rest = name.substr(kScheme.size());
  if (!rest.starts_with("//")) return rest;
  const std::size_t path = rest.find('/', 2);
  return path != rest.npos ? rest.substr(path) : "/";
}

bool MayUseName(const std::string& name, const AccessPolicy& policy, bool making) {
  if (!policy.special && NamesSpecialFile(name)) {
    return Refuse(name, "is no file; devices and pipes are not allowed here");
  }
  const bool isVirtual = IsVirtualName(name);
  if (!isVirtual && (making || Exists(name)) && !HoldsAddress(name)) {
    return MayUseFile(name, policy, making);
  }
  if (!isVirtual && Exists(name)) return MayUseFile(name, policy, false);
  const std::string path = PathOfAddress(name);
  if (!path.empty()) return MayUseFile(path, policy, making);
  const std::vector<std::string> files = isVirtual ? std::vector<std::string>() : FilesInName(name);
  if (!files.empty() && !HoldsNetworkFile(name)) {
    return std::all_of(files.begin(), files.end(),
                       [&](const std::string& file) { return MayUseFile(file, policy, making); });
  }
  if (HoldsAddress(name) || HoldsNetworkFile(name)) {
    if (policy.network) return true;
    return Refuse(name, "sources on the network are not allowed here");
  }
  if (isVirtual || name.find(":/vsi") != name.npos || name.find("\"/vsi") != name.npos) {
    if (policy.virtualFiles) return true;
    return Refuse(name, "virtual files are not allowed here");
  }
  return MayUseFile(name, policy, making);
}

/// True for NAME=VALUE; gives the value.
bool IsOption(const std::string& piece, std::string& value) {
  const std::size_t equals = piece.find('=');
  if (equals == piece.npos || equals == 0) return false;
  const bool isName =
      std::all_of(piece.begin(), piece.begin() + static_cast<std::ptrdiff_t>(equals),
                  [](char c) { return IsAlphanumeric(c) || c == '_'; });
  value = piece.substr(equals + 1);
  return isName;
}

/// The name of a place inside a file is no file, even if there is one of that name.
bool MayUseOption(const std::string& piece, const std::string& value, const AccessPolicy& policy) {
  if (piece.starts_with("SUBDATASET=") || value.empty()) return true;
  const bool leadsOn = Exists(value) || IsVirtualName(value) || HoldsAddress(value);
  return !leadsOn || MayUseName(value, policy, false);
}

/// The folders of the library itself, which may be read whatever the roots are.
std::vector<std::string> OwnFolders() {
  std::vector<std::string> folders;
  const EnvironmentImpl& environment = GetGlobalEnvironmentImpl();
  for (const ContextKey& key :
       {Environment::kBinDirectory, Environment::kXmlDirectory, Environment::kPeDirectory,
        Environment::kGdalDirectory, Environment::kMdfDirectory}) {
    std::error_code fault;
    const fs::path folder = fs::canonical(environment.Find(key).ToUTF8(), fault);
    if (!fault) folders.push_back(folder.string());
  }
  return folders;
}

/// The gate of all that this library opens itself.
bool PassGate(const std::string& path, bool writing, std::string* fault) {
  const String before = TakeFault();
  if (MayReachFile(path, writing)) {
    SetFault(before);
    return true;
  }
  if (fault != nullptr) *fault = TakeFault().ToUTF8();
  return false;
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
  gAreFilesLimited = !resolved.roots.empty();
  platform::SetFileGate(gAreFilesLimited ? PassGate : nullptr);
  return true;
}

void NoteRefusal(const String& text) {
  tRefusal = text;
}

String TakeRefusal() {
  return std::exchange(tRefusal, String());
}

bool AreFilesLimited() {
  return gAreFilesLimited;
}

bool MayReachFile(const std::string& path, bool writing) {
  if (!gAreFilesLimited) return true;
  const AccessPolicy policy = GetAccessPolicy();
  fs::path resolved;
  if (!Resolve(path, resolved)) {
    // Where not even the folder is there, there is nothing to reach.
    std::error_code missing;
    if (!writing && !fs::exists(fs::symlink_status(path, missing))) return true;
    return Refuse(path, kOutside);
  }
  if (LiesInside(resolved, policy.roots)) return true;
  return (!writing && LiesInside(resolved, OwnFolders())) || Refuse(path, kOutside);
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
  bool isFirst = true;
  for (const String& piece : connStrings) {
    const FormatRecord* const format = FindFormat(piece);
    if (format != nullptr) {
      if (!MayUseFormat(*format)) return false;
      continue;
    }
    const std::string text = piece.ToUTF8();
    std::string value;
    const bool may = !isFirst && IsOption(text, value) ? MayUseOption(text, value, policy)
                                                       : MayUseName(text, policy, making);
    if (!may) return false;
    isFirst = false;
  }
  return true;
}

}  // namespace lumo
