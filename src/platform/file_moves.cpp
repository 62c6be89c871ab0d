#include "platform/file_moves.h"

#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <linux/fs.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/file_descriptor.h"
#include "platform/memory_shortage.h"

namespace lumo::platform {
namespace {

/// Tells why a call on `path` failed; errno stays.
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

}  // namespace

bool RenameFile(const std::string& from, const std::string& to, std::string* fault) {
  return std::rename(from.c_str(), to.c_str()) == 0 || FailOn(to, fault);
}

bool RenameToNew(const std::string& from, const std::string& to, std::string* fault) {
  if (Rename(from, to, RENAME_NOREPLACE)) return true;
  if (!LacksFlags()) return FailOn(to, fault);
  // A second name can't replace anything either.
  if (link(from.c_str(), to.c_str()) != 0) return FailOn(to, fault);
  return unlink(from.c_str()) == 0 || FailOn(from, fault);
}

bool ExchangeFiles(const std::string& a, const std::string& b, std::string* fault) {
  return Rename(a, b, RENAME_EXCHANGE) || FailOn(b, fault);
}

bool SyncPath(const std::string& path, std::string* fault) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file.IsOpen()) return FailOn(path, fault);
  // Some file systems have nothing to do for folders and say so.
  return fsync(file.Get()) == 0 || errno == EINVAL || FailOn(path, fault);
}

}  // namespace lumo::platform
