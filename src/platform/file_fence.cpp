#include "platform/file_fence.h"

#include <cerrno>
#include <cstdint>
#include <fcntl.h>
#include <filesystem>
#include <iterator>
#include <linux/landlock.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <system_error>
#include <unistd.h>

#include "platform/file_descriptor.h"
#include "platform/pipe_directory.h"

// By Landlock, through the system calls themselves: the C library has no functions for them, and
// the headers of a system may be older than its kernel.

namespace lumo::platform {
namespace {

constexpr std::uint64_t kTruncate = std::uint64_t{1} << 14;   // since version 3
constexpr std::uint64_t kConnectTcp = std::uint64_t{1} << 1;  // since version 4, of the network

constexpr std::uint64_t kReadFile = LANDLOCK_ACCESS_FS_READ_FILE | LANDLOCK_ACCESS_FS_EXECUTE;
constexpr std::uint64_t kReadFolder = kReadFile | LANDLOCK_ACCESS_FS_READ_DIR;
constexpr std::uint64_t kWriteFile = LANDLOCK_ACCESS_FS_WRITE_FILE | kTruncate;
constexpr std::uint64_t kWriteFolder =
    kWriteFile | LANDLOCK_ACCESS_FS_REMOVE_DIR | LANDLOCK_ACCESS_FS_REMOVE_FILE |
    LANDLOCK_ACCESS_FS_MAKE_CHAR | LANDLOCK_ACCESS_FS_MAKE_DIR | LANDLOCK_ACCESS_FS_MAKE_REG |
    LANDLOCK_ACCESS_FS_MAKE_SOCK | LANDLOCK_ACCESS_FS_MAKE_FIFO | LANDLOCK_ACCESS_FS_MAKE_BLOCK |
    LANDLOCK_ACCESS_FS_MAKE_SYM | LANDLOCK_ACCESS_FS_REFER;

/// The set of rules as the kernel takes it; the second field since version 4.
struct RulesetAttributes {
  std::uint64_t files;
  std::uint64_t network;
};

int KernelVersion() {
  return static_cast<int>(
      syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION));
}

/// The rights over files that a kernel of this version knows.
std::uint64_t KnownRights(int version) {
  std::uint64_t rights = kReadFolder | kWriteFolder;
  if (version < 2) rights &= ~std::uint64_t{LANDLOCK_ACCESS_FS_REFER};
  if (version < 3) rights &= ~kTruncate;
  return rights;
}

class Ruleset {
 public:
  Ruleset(int version, bool network) : rights_(KnownRights(version)) {
    const RulesetAttributes attributes{rights_, network ? 0 : kConnectTcp};
    const std::size_t size = version < 4 ? sizeof attributes.files : sizeof attributes;
    rules_ = FileDescriptor(
        static_cast<int>(syscall(SYS_landlock_create_ruleset, &attributes, size, 0)));
  }

  bool IsMade() const { return rules_.IsOpen(); }

  /// Allows what `rights` names beneath a path, as far as it goes for what stands there. True also
  /// for a path that isn't there.
  bool Allow(const std::string& path, std::uint64_t rights) {
    const FileDescriptor place(open(path.c_str(), O_PATH | O_CLOEXEC));
    if (!place.IsOpen()) return true;
    struct stat status {};
    if (fstat(place.Get(), &status) != 0) return false;
    if (!S_ISDIR(status.st_mode)) rights &= kReadFile | kWriteFile;
    landlock_path_beneath_attr rule{};
    rule.allowed_access = rights & rights_;
    rule.parent_fd = place.Get();
    return syscall(SYS_landlock_add_rule, rules_.Get(), LANDLOCK_RULE_PATH_BENEATH, &rule, 0) == 0;
  }

  bool Enforce() const {
    return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
           syscall(SYS_landlock_restrict_self, rules_.Get(), 0) == 0;
  }

 private:
  const std::uint64_t rights_;
  FileDescriptor rules_;
};

bool AllowAll(Ruleset& rules, const std::vector<std::string>& paths, std::uint64_t rights) {
  bool allowed = true;
  for (const std::string& path : paths) allowed = rules.Allow(path, rights) && allowed;
  return allowed;
}

/// Places that libraries of the system read, and that the process shares with its clients.
bool AllowSystem(Ruleset& rules, bool network) {
  std::vector<std::string> read{
      "/usr",          "/lib",          "/lib64",        "/etc/ld.so.cache", "/etc/localtime",
      "/proc/self",    "/proc/cpuinfo", "/proc/meminfo", "/proc/sys/vm",     "/sys/devices/system",
      "/sys/fs/cgroup"};
  if (network) {
    for (const char* const file :
         {"/etc/resolv.conf", "/etc/hosts", "/etc/nsswitch.conf", "/etc/host.conf", "/etc/gai.conf",
          "/etc/ssl", "/etc/ca-certificates", "/run/systemd/resolve"}) {
      read.emplace_back(file);
    }
  }
  return AllowAll(rules, read, kReadFolder) &&
         AllowAll(rules, {"/dev/null", "/dev/urandom"}, kReadFile | kWriteFile) &&
         AllowAll(rules, {"/dev/shm"}, kReadFile | kWriteFile | LANDLOCK_ACCESS_FS_READ_DIR) &&
         AllowAll(rules, {PipeDirectory()}, kReadFolder | kWriteFolder);
}

bool IsOnlyThread() {
  std::error_code fault;
  const std::filesystem::directory_iterator threads("/proc/self/task", fault);
  return !fault && std::distance(begin(threads), end(threads)) == 1;
}

}  // namespace

bool RaiseFileFence(const FileFence& fence, std::string& fault) {
  const int version = KernelVersion();
  if (version < 1) {
    fault = errno == EOPNOTSUPP ? "this kernel has Landlock switched off"
                                : "this kernel has no Landlock";
    return false;
  }
  if (!IsOnlyThread()) {
    fault = "threads are running already";
    return false;
  }
  OpenPipeDirectory();  // so that it is there
  Ruleset rules(version, fence.network);
  if (rules.IsMade() && AllowSystem(rules, fence.network) &&
      AllowAll(rules, fence.readable, kReadFolder) &&
      AllowAll(rules, fence.writable, kReadFolder | kWriteFolder) && rules.Enforce()) {
    return true;
  }
  fault = std::generic_category().message(errno);
  return false;
}

}  // namespace lumo::platform
