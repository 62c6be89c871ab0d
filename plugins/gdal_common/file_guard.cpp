#include "gdal_common/file_guard.h"

#include <cerrno>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <cpl_vsi_virtual.h>
#include <filesystem>
#include <string_view>

#include "data/access_policy.h"
#include "foundation/fault.h"

namespace lumo::gdal {
namespace {

namespace fs = std::filesystem;

/// GDAL's own folder of tables, which it may read whatever the policy says.
bool IsDataFile(const std::string& path) {
  static const std::string folder = [] {
    const char* const table = CPLFindFile("gdal", "gdalvrt.xsd");
    std::error_code fault;
    return table != nullptr ? fs::canonical(table, fault).parent_path().string() : std::string();
  }();
  std::error_code fault;
  const fs::path resolved = fs::canonical(path, fault);
  return !fault && !folder.empty() && resolved.parent_path() == folder;
}

bool May(const char* path, bool writing) {
  if (!AreFilesLimited()) return true;
  const String before = TakeFault();
  const bool may = MayReachFile(path, writing) || (!writing && IsDataFile(path));
  const String refusal = TakeFault();
  SetFault(before);
  if (may) return true;
  errno = EACCES;
  std::error_code missing;
  const bool isThere = fs::exists(fs::symlink_status(path, missing));
  if (!writing && (!isThere || fs::is_directory(path, missing))) return false;
  NoteRefusal(refusal);
  CPLError(CE_Failure, CPLE_OpenFailed, "%s", refusal.ToUTF8().c_str());
  return false;
}

bool Writes(const char* access) {
  return std::string_view(access).find_first_of("wa+") != std::string_view::npos;
}

/// The files of the disk, behind the policy.
class FileGuard final : public VSIFilesystemHandler {
 public:
  explicit FileGuard(VSIFilesystemHandler* inner) : inner_(inner) {}

  VSIVirtualHandle* Open(const char* path, const char* access, bool setError,
                         CSLConstList options) override {
    return May(path, Writes(access)) ? inner_->Open(path, access, setError, options) : nullptr;
  }
  int Stat(const char* path, VSIStatBufL* status, int flags) override {
    return May(path, false) ? inner_->Stat(path, status, flags) : -1;
  }
  int Unlink(const char* path) override { return MayInFolder(path) ? inner_->Unlink(path) : -1; }
  int Mkdir(const char* path, long mode) override {
    return May(path, true) ? inner_->Mkdir(path, mode) : -1;
  }
  int Rmdir(const char* path) override { return May(path, true) ? inner_->Rmdir(path) : -1; }
  char** ReadDirEx(const char* path, int most) override {
    return May(path, false) ? inner_->ReadDirEx(path, most) : nullptr;
  }
  char** SiblingFiles(const char* path) override { return inner_->SiblingFiles(path); }
  int Rename(const char* from, const char* to) override {
    return MayInFolder(from) && MayInFolder(to) ? inner_->Rename(from, to) : -1;
  }
  int IsCaseSensitive(const char* path) override { return inner_->IsCaseSensitive(path); }
  GIntBig GetDiskFreeSpace(const char* path) override { return inner_->GetDiskFreeSpace(path); }
  int SupportsSparseFiles(const char* path) override { return inner_->SupportsSparseFiles(path); }
  int HasOptimizedReadMultiRange(const char* path) override {
    return inner_->HasOptimizedReadMultiRange(path);
  }
  VSIDIR* OpenDir(const char* path, int depth, const char* const* options) override {
    return May(path, false) ? inner_->OpenDir(path, depth, options) : nullptr;
  }
  bool IsLocal(const char* path) override { return inner_->IsLocal(path); }
  bool SupportsSequentialWrite(const char* path, bool mayUseTemporary) override {
    return inner_->SupportsSequentialWrite(path, mayUseTemporary);
  }
  bool SupportsRandomWrite(const char* path, bool mayUseTemporary) override {
    return inner_->SupportsRandomWrite(path, mayUseTemporary);
  }
  bool SupportsRead(const char* path) override { return inner_->SupportsRead(path); }

 private:
  /// A name that is removed or taken is the link itself, not what it leads to.
  static bool MayInFolder(const char* path) {
    const fs::path folder = fs::path(path).parent_path();
    return May(folder.empty() ? "." : folder.c_str(), true);
  }

  VSIFilesystemHandler* const inner_;
};

/// The names of what lies behind the network, and of the process's own streams, where the policy
/// does not allow them: a file may name them too.
class ClosedFiles final : public VSIFilesystemHandler {
 public:
  ClosedFiles(VSIFilesystemHandler* inner, bool AccessPolicy::*allowed)
      : inner_(inner), allowed_(allowed) {}

  VSIVirtualHandle* Open(const char* path, const char* access, bool setError,
                         CSLConstList options) override {
    return IsAllowed(path) ? inner_->Open(path, access, setError, options) : nullptr;
  }
  int Stat(const char* path, VSIStatBufL* status, int flags) override {
    return IsAllowed(path) ? inner_->Stat(path, status, flags) : -1;
  }
  char** ReadDirEx(const char* path, int most) override {
    return IsAllowed(path) ? inner_->ReadDirEx(path, most) : nullptr;
  }
  VSIDIR* OpenDir(const char* path, int depth, const char* const* options) override {
    return IsAllowed(path) ? inner_->OpenDir(path, depth, options) : nullptr;
  }
  const char* GetActualURL(const char* path) override { return inner_->GetActualURL(path); }
  const char* GetOptions() override { return inner_->GetOptions(); }
  int HasOptimizedReadMultiRange(const char* path) override {
    return inner_->HasOptimizedReadMultiRange(path);
  }
  bool IsLocal(const char* path) override { return inner_->IsLocal(path); }

 private:
  bool IsAllowed(const char* path) const {
    if (GetAccessPolicy().*allowed_) return true;
    errno = EACCES;
    const std::string refusal = std::string(path) + ": not allowed here";
    NoteRefusal(String(refusal));
    CPLError(CE_Failure, CPLE_OpenFailed, "%s", refusal.c_str());
    return false;
  }

  VSIFilesystemHandler* const inner_;
  bool AccessPolicy::*const allowed_;
};

}  // namespace

void InstallFileGuard() {
  // Two plug-ins share one GDAL.
  constexpr const char* kMark = "VEXG_FILE_GUARD";
  if (CPLGetConfigOption(kMark, nullptr) != nullptr) return;
  CPLSetConfigOption(kMark, "YES");
  const AccessPolicy policy = GetAccessPolicy();
  if (!policy.roots.empty()) CPLSetConfigOption("CPL_TMPDIR", policy.roots.front().c_str());
  VSIFileManager::InstallHandler("", new FileGuard(VSIFileManager::GetHandler("")));
  const CPLStringList prefixes(VSIFileManager::GetPrefixes());
  for (int i = 0; i < prefixes.Count(); ++i) {
    const std::string_view prefix = prefixes[i];
    const bool isStream = prefix.starts_with("/vsistd");
    bool isNetwork = false;
    for (const std::string_view start : {"/vsicurl", "/vsis3", "/vsigs", "/vsiaz", "/vsiadls",
                                         "/vsioss", "/vsiswift", "/vsihdfs", "/vsiwebhdfs"}) {
      isNetwork = isNetwork || prefix.starts_with(start);
    }
    if (!isStream && !isNetwork) continue;
    VSIFilesystemHandler* const inner = VSIFileManager::GetHandler(prefixes[i]);
    VSIFileManager::InstallHandler(
        prefixes[i],
        new ClosedFiles(inner, isNetwork ? &AccessPolicy::network : &AccessPolicy::virtualFiles));
  }
}

void ForgetRefusals() {
  TakeRefusal();
}

bool WasRefusedNothing() {
  const String refusal = TakeRefusal();
  if (refusal.GetLength() != 0) SetFault(refusal);
  return refusal.GetLength() == 0;
}

bool MayReachAllFiles(GDALDatasetH dataset) {
  if (!AreFilesLimited()) return true;
  const CPLStringList files(GDALGetFileList(dataset));
  for (int i = 0; i < files.Count(); ++i) {
    const std::string_view file = files[i];
    if (!file.starts_with("/vsi") && !MayReachFile(files[i], false)) return false;
  }
  return true;
}

}  // namespace lumo::gdal
