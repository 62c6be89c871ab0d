#include "platform/file_moves.h"

#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <linux/fs.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/durability.h"
#include "platform/file_descriptor.h"
#include "platform/memory_shortage.h"

namespace lumo::platform {
namespace {

/// Says why a call on `path` failed; errno stays.
bool FailOn(const std::string& path, std::string* fault) {
  const int code = errno;
  if (fault != nullptr) *fault = path + ": " + SystemErrorText(code);
  errno = code;
  return false;
}

bool Rename(const std::string& from, const std::string& to, unsigned flags) {
  return syscall(SYS_renameat2, AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), flags) == 0;
}

/// File systems that know no flags say that they are invalid.
bool LacksFlags() {
  return errno == EINVAL || errno == ENOSYS;
}

std::string FolderOf(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  return slash == std::string::npos ? "." : slash == 0 ? "/" : path.substr(0, slash);
}

bool MoveToNew(const std::string& from, const std::string& to, std::string* fault) {
  if (Rename(from, to, RENAME_NOREPLACE)) return true;
  if (!LacksFlags()) return FailOn(to, fault);
  // A second name can't replace anything either.
  if (link(from.c_str(), to.c_str()) != 0) return FailOn(to, fault);
  return unlink(from.c_str()) == 0 || FailOn(from, fault);
}

}  // namespace

bool RenameFile(const std::string& from, const std::string& to, std::string* fault) {
  if (!IsDurable()) return std::rename(from.c_str(), to.c_str()) == 0 || FailOn(to, fault);
  if (!SyncPath(from, fault)) return false;
  // The older file keeps a name until the move is on the disk, so that it can be taken back.
  const bool isExchanged = Rename(from, to, RENAME_EXCHANGE);
  if (!isExchanged && std::rename(from.c_str(), to.c_str()) != 0) return FailOn(to, fault);
  if (SyncPath(FolderOf(to), fault)) {
    if (isExchanged) unlink(from.c_str());
    return true;
  }
  const int code = errno;
  Rename(to, from, isExchanged ? RENAME_EXCHANGE : RENAME_NOREPLACE);
  errno = code;
  return false;
}

bool RenameToNew(const std::string& from, const std::string& to, std::string* fault,
                 MoveSync sync) {
  const bool isDurable = sync == MoveSync::kWhereDurable && IsDurable();
  if (isDurable && !SyncPath(from, fault)) return false;
  if (!MoveToNew(from, to, fault)) return false;
  if (!isDurable || SyncPath(FolderOf(to), fault)) return true;
  const int code = errno;
  Rename(to, from, RENAME_NOREPLACE);
  errno = code;
  return false;
}

bool ExchangeFiles(const std::string& a, const std::string& b, std::string* fault) {
  if (IsDurable() && !SyncPath(a, fault)) return false;
  if (!Rename(a, b, RENAME_EXCHANGE)) return FailOn(b, fault);
  if (!IsDurable() || SyncPath(FolderOf(b), fault)) return true;
  const int code = errno;
  Rename(a, b, RENAME_EXCHANGE);
  errno = code;
  return false;
}

bool SyncPath(const std::string& path, std::string* fault) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file.IsOpen()) return FailOn(path, fault);
  // Some file systems have nothing to do for folders and say so.
  return fsync(file.Get()) == 0 || errno == EINVAL || FailOn(path, fault);
}

}  // namespace lumo::platform
