// Runs a program and makes one of its system calls on files below a folder go wrong.
//
//   vexg_fault_supervisor --below DIR [--call KIND --nth N --fault FAULT [--from]]
//                         [--seconds S] --report FILE -- PROGRAM [ARGUMENT…]
//
// KIND   open, read, write, sync, truncate, rename, unlink, stat, mkdir, allocate, seek, map
// N      the call that goes wrong, counted from 1 among those of its kind on files below DIR
// FAULT  an errno's name (EIO, ENOSPC, EINTR …), short (half of the bytes are read or written) or
//        kill (the program dies before the call)
//        With a KIND only calls of it are watched and counted.
// --from all calls from the N-th on go wrong, as on a disk that stays full
//
// The report is JSON: how often each kind was called, which call went wrong and on which file, how
// the program ended. The kernel notifies the supervisor of the calls (seccomp), so those of every
// library in the program are seen, however they are made. Exit 0 when the program could be watched
// to its end, 2 for a wrong command line, 77 where the kernel does not allow it.

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <map>
#include <optional>
#include <poll.h>
#include <signal.h>
#include <string>
#include <string_view>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

namespace {

constexpr int kExitUsage = 2;
constexpr int kExitNotAllowed = 77;

/// How a call names its file.
enum class Named { kDescriptor, kPath, kPathAt, kMapped };

/// The flag of a mapping without a file.
constexpr unsigned kAnonymous = 0x20;

/// One system call that is watched.
struct Watched {
  int number;
  const char* kind;
  Named named;
};

constexpr Watched kWatched[] = {
    {SYS_open, "open", Named::kPath},
    {SYS_creat, "open", Named::kPath},
    {SYS_openat, "open", Named::kPathAt},
    {SYS_read, "read", Named::kDescriptor},
    {SYS_pread64, "read", Named::kDescriptor},
    {SYS_readv, "read", Named::kDescriptor},
    {SYS_preadv, "read", Named::kDescriptor},
    {SYS_write, "write", Named::kDescriptor},
    {SYS_pwrite64, "write", Named::kDescriptor},
    {SYS_writev, "write", Named::kDescriptor},
    {SYS_pwritev, "write", Named::kDescriptor},
    {SYS_copy_file_range, "write", Named::kDescriptor},
    {SYS_fsync, "sync", Named::kDescriptor},
    {SYS_fdatasync, "sync", Named::kDescriptor},
    {SYS_sync_file_range, "sync", Named::kDescriptor},
    {SYS_truncate, "truncate", Named::kPath},
    {SYS_ftruncate, "truncate", Named::kDescriptor},
    {SYS_rename, "rename", Named::kPath},
    {SYS_renameat, "rename", Named::kPathAt},
    {SYS_renameat2, "rename", Named::kPathAt},
    {SYS_link, "rename", Named::kPath},
    {SYS_linkat, "rename", Named::kPathAt},
    {SYS_unlink, "unlink", Named::kPath},
    {SYS_unlinkat, "unlink", Named::kPathAt},
    {SYS_rmdir, "unlink", Named::kPath},
    {SYS_stat, "stat", Named::kPath},
    {SYS_lstat, "stat", Named::kPath},
    {SYS_fstat, "stat", Named::kDescriptor},
    {SYS_newfstatat, "stat", Named::kPathAt},
    {SYS_statx, "stat", Named::kPathAt},
    {SYS_mkdir, "mkdir", Named::kPath},
    {SYS_mkdirat, "mkdir", Named::kPathAt},
    {SYS_fallocate, "allocate", Named::kDescriptor},
    {SYS_lseek, "seek", Named::kDescriptor},
    {SYS_mmap, "map", Named::kMapped},
};

const Watched* FindWatched(int number) {
  const auto found = std::find_if(std::begin(kWatched), std::end(kWatched),
                                  [&](const Watched& entry) { return entry.number == number; });
  return found != std::end(kWatched) ? found : nullptr;
}

/// An errno by its name; 0 for an unknown one.
int ErrnoByName(std::string_view name) {
  static const std::map<std::string_view, int> kNames{
      {"EIO", EIO},       {"ENOSPC", ENOSPC}, {"EACCES", EACCES}, {"EPERM", EPERM},
      {"EINTR", EINTR},   {"EMFILE", EMFILE}, {"ENOMEM", ENOMEM}, {"EDQUOT", EDQUOT},
      {"EROFS", EROFS},   {"EBUSY", EBUSY},   {"EXDEV", EXDEV},   {"ENOENT", ENOENT},
      {"EEXIST", EEXIST}, {"EFBIG", EFBIG},   {"ESTALE", ESTALE}, {"EINVAL", EINVAL}};
  const auto found = kNames.find(name);
  return found != kNames.end() ? found->second : 0;
}

struct Options {
  std::string below;
  std::string kind;
  std::uint64_t nth = 0;  // 0: nothing goes wrong
  std::string fault;
  bool stays = false;
  int seconds = 60;
  std::string report;
  std::vector<char*> program;
};

bool ParseOptions(int count, char** words, Options& options) {
  int at = 1;
  for (; at < count && std::string_view(words[at]) != "--"; ++at) {
    const std::string_view word = words[at];
    if (word == "--from") {
      options.stays = true;
      continue;
    }
    if (at + 1 >= count) return false;
    const char* const value = words[++at];
    if (word == "--below") {
      options.below = value;
    } else if (word == "--call") {
      options.kind = value;
    } else if (word == "--nth") {
      options.nth = std::strtoull(value, nullptr, 10);
    } else if (word == "--fault") {
      options.fault = value;
    } else if (word == "--seconds") {
      options.seconds = std::atoi(value);
    } else if (word == "--report") {
      options.report = value;
    } else {
      return false;
    }
  }
  for (++at; at < count; ++at) options.program.push_back(words[at]);
  options.program.push_back(nullptr);
  const bool knowsFault = options.nth == 0 || options.fault == "short" || options.fault == "kill" ||
                          ErrnoByName(options.fault) != 0;
  return knowsFault && !options.below.empty() && !options.report.empty() &&
         options.program.size() > 1;
}

/// Asks the kernel to notify of the watched calls of this process and what it starts. Each
/// notification costs two changes of processes, so memory that no file is behind is left out.
/// @param kind  of the calls; empty for all of them.
/// @return the descriptor on which the notifications come, or -1.
int WatchThisProcess(std::string_view kind) {
  std::vector<Watched> watched;
  std::copy_if(std::begin(kWatched), std::end(kWatched), std::back_inserter(watched),
               [&](const Watched& entry) { return kind.empty() || entry.kind == kind; });
  // For each call: is it this one? Then notify, but not of a mapping without a file.
  std::vector<sock_filter> filter;
  for (const Watched& entry : watched) {
    const bool isMapped = entry.named == Named::kMapped;
    const std::uint8_t past = isMapped ? 3 : 1;
    filter.push_back(BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)));
    filter.push_back(
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(entry.number), 0, past));
    if (isMapped) {
      filter.push_back(BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, args[3])));
      filter.push_back(BPF_JUMP(BPF_JMP | BPF_JSET | BPF_K, kAnonymous, 1, 0));
    }
    filter.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_USER_NOTIF));
  }
  filter.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
  sock_fprog program{static_cast<unsigned short>(filter.size()), filter.data()};
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) return -1;
  return static_cast<int>(
      syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, SECCOMP_FILTER_FLAG_NEW_LISTENER, &program));
}

/// Sends a descriptor, or that there is none, over a socket.
void SendDescriptor(int socket, int descriptor) {
  char none = descriptor < 0 ? 1 : 0;
  iovec data{&none, 1};
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
  msghdr message{};
  message.msg_iov = &data;
  message.msg_iovlen = 1;
  if (descriptor >= 0) {
    message.msg_control = control.data();
    message.msg_controllen = control.size();
    cmsghdr* const header = CMSG_FIRSTHDR(&message);
    header->cmsg_level = SOL_SOCKET;
    header->cmsg_type = SCM_RIGHTS;
    header->cmsg_len = CMSG_LEN(sizeof(int));
    std::memcpy(CMSG_DATA(header), &descriptor, sizeof(int));
  }
  sendmsg(socket, &message, 0);
}

/// The descriptor that SendDescriptor sent, or -1.
int ReceiveDescriptor(int socket) {
  char none = 1;
  iovec data{&none, 1};
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
  msghdr message{};
  message.msg_iov = &data;
  message.msg_iovlen = 1;
  message.msg_control = control.data();
  message.msg_controllen = control.size();
  if (recvmsg(socket, &message, 0) != 1 || none != 0) return -1;
  const cmsghdr* const header = CMSG_FIRSTHDR(&message);
  if (header == nullptr) return -1;
  int descriptor = -1;
  std::memcpy(&descriptor, CMSG_DATA(header), sizeof(int));
  return descriptor;
}

std::string ReadLink(const std::string& link) {
  std::array<char, 4096> text{};
  const ssize_t length = readlink(link.c_str(), text.data(), text.size());
  return length > 0 ? std::string(text.data(), static_cast<std::size_t>(length)) : std::string();
}

/// The memory and descriptors of a thread whose call waits for an answer.
class Caller {
 public:
  explicit Caller(pid_t thread) : thread_(thread), proc_("/proc/" + std::to_string(thread)) {}

  bool Read(std::uint64_t address, void* to, std::size_t bytes) const {
    iovec here{to, bytes};
    iovec there{reinterpret_cast<void*>(address), bytes};
    return process_vm_readv(thread_, &here, 1, &there, 1, 0) == static_cast<ssize_t>(bytes);
  }

  bool Write(std::uint64_t address, void* from, std::size_t bytes) const {
    iovec here{from, bytes};
    iovec there{reinterpret_cast<void*>(address), bytes};
    return process_vm_writev(thread_, &here, 1, &there, 1, 0) == static_cast<ssize_t>(bytes);
  }

  std::string TextAt(std::uint64_t address) const {
    std::string text;
    constexpr std::size_t kMost = 4096, kPiece = 256;  // pieces do not reach over a page
    std::array<char, kPiece> piece{};
    while (text.size() < kMost) {
      const std::uint64_t next = address + text.size();
      const std::size_t bytes = kPiece - next % kPiece;
      if (!Read(next, piece.data(), bytes)) break;
      const auto end = std::find(piece.begin(), piece.begin() + std::ptrdiff_t(bytes), '\0');
      text.append(piece.begin(), end);
      if (end != piece.begin() + std::ptrdiff_t(bytes)) break;
    }
    return text;
  }

  std::string PathOfDescriptor(int descriptor) const {
    return ReadLink(proc_ + "/fd/" + std::to_string(descriptor));
  }

  std::string PathAt(int folder, std::uint64_t address) const {
    const std::string path = TextAt(address);
    if (path.empty() && folder != AT_FDCWD) return PathOfDescriptor(folder);
    if (path.starts_with('/')) return path;
    const std::string base =
        folder == AT_FDCWD ? ReadLink(proc_ + "/cwd") : PathOfDescriptor(folder);
    return base + "/" + path;
  }

  /// A descriptor of ours on what the caller's descriptor is on, or -1.
  int TakeDescriptor(int descriptor) const {
    const int process = static_cast<int>(syscall(SYS_pidfd_open, Process(), 0));
    if (process < 0) return -1;
    const int taken = static_cast<int>(syscall(SYS_pidfd_getfd, process, descriptor, 0));
    close(process);
    return taken;
  }

  /// The process that the thread belongs to.
  pid_t Process() const {
    std::ifstream status(proc_ + "/status");
    for (std::string line; std::getline(status, line);) {
      if (line.starts_with("Tgid:")) return std::atoi(line.c_str() + 5);
    }
    return thread_;
  }

 private:
  pid_t thread_;
  std::string proc_;
};

std::string FileOf(const Caller& caller, const Watched& call, const seccomp_data& data) {
  switch (call.named) {
    case Named::kDescriptor:
      return caller.PathOfDescriptor(static_cast<int>(data.args[0]));
    case Named::kPath:
      return caller.PathAt(AT_FDCWD, data.args[0]);
    case Named::kPathAt:
      return caller.PathAt(static_cast<int>(data.args[0]), data.args[1]);
    case Named::kMapped:
      return caller.PathOfDescriptor(static_cast<int>(data.args[4]));
  }
  return {};
}

/// The buffer of a call that reads or writes: its first one, where it has several.
struct CallBuffer {
  std::uint64_t address = 0;
  std::size_t bytes = 0;
};

std::optional<CallBuffer> BufferOf(const Caller& caller, const seccomp_data& data) {
  switch (data.nr) {
    case SYS_read:
    case SYS_pread64:
    case SYS_write:
    case SYS_pwrite64:
      return CallBuffer{data.args[1], data.args[2]};
    case SYS_readv:
    case SYS_preadv:
    case SYS_writev:
    case SYS_pwritev: {
      iovec first{};
      if (data.args[2] == 0 || !caller.Read(data.args[1], &first, sizeof(first))) return {};
      return CallBuffer{reinterpret_cast<std::uint64_t>(first.iov_base), first.iov_len};
    }
    default:
      return {};
  }
}

/// Does half of a call that reads or writes in the caller's place.
/// @return the bytes done or -errno; none when there is nothing to halve.
std::optional<std::int64_t> DoHalf(const Caller& caller, const seccomp_data& data) {
  const auto buffer = BufferOf(caller, data);
  if (!buffer || buffer->bytes < 2) return {};
  const int descriptor = caller.TakeDescriptor(static_cast<int>(data.args[0]));
  if (descriptor < 0) return {};
  const bool isPlaced = data.nr == SYS_pread64 || data.nr == SYS_preadv ||
                        data.nr == SYS_pwrite64 || data.nr == SYS_pwritev;
  const bool isRead = std::string_view(FindWatched(data.nr)->kind) == "read";
  const auto place = static_cast<off_t>(data.args[3]);
  std::vector<char> bytes(buffer->bytes / 2);
  ssize_t done = -1;
  if (isRead) {
    done = isPlaced ? pread(descriptor, bytes.data(), bytes.size(), place)
                    : read(descriptor, bytes.data(), bytes.size());
    if (done > 0) caller.Write(buffer->address, bytes.data(), static_cast<std::size_t>(done));
  } else if (caller.Read(buffer->address, bytes.data(), bytes.size())) {
    done = isPlaced ? pwrite(descriptor, bytes.data(), bytes.size(), place)
                    : write(descriptor, bytes.data(), bytes.size());
  }
  const std::int64_t result = done < 0 ? -errno : done;
  close(descriptor);
  return result;
}

/// Answers the watched calls, counts them and lets the chosen one go wrong.
class Supervisor {
 public:
  Supervisor(const Options& options, int listener) : options_(options), listener_(listener) {}

  /// Takes one notification and answers it.
  void Answer() {
    seccomp_notif request{};
    if (ioctl(listener_, SECCOMP_IOCTL_NOTIF_RECV, &request) != 0) return;
    seccomp_notif_resp response{};
    response.id = request.id;
    response.flags = SECCOMP_USER_NOTIF_FLAG_CONTINUE;
    const Watched* const call = FindWatched(request.data.nr);
    const Caller caller(static_cast<pid_t>(request.pid));
    const std::string file = call != nullptr ? FileOf(caller, *call, request.data) : std::string();
    if (IsBelow(file) && GoesWrong(*call)) {
      Spoil(caller, request.data, response);
      if (faultedFile_.empty()) faultedFile_ = file;
    }
    ioctl(listener_, SECCOMP_IOCTL_NOTIF_SEND, &response);
  }

  void Report(std::ostream& out) const {
    out << "\"faulted\": \"" << faultedFile_ << "\", \"calls\": {";
    const char* separator = "";
    for (const auto& [kind, count] : counts_) {
      out << separator << '"' << kind << "\": " << count;
      separator = ", ";
    }
    out << '}';
  }

 private:
  bool IsBelow(const std::string& file) const {
    return file.starts_with(options_.below) &&
           (file.size() == options_.below.size() || file[options_.below.size()] == '/');
  }

  bool GoesWrong(const Watched& call) {
    const std::uint64_t number = ++counts_[call.kind];
    if (options_.nth == 0 || options_.kind != call.kind) return false;
    return number == options_.nth || (options_.stays && number > options_.nth);
  }

  void Spoil(const Caller& caller, const seccomp_data& data, seccomp_notif_resp& response) const {
    if (options_.fault == "kill") {
      kill(caller.Process(), SIGKILL);
      return;
    }
    if (options_.fault == "short") {
      const auto done = DoHalf(caller, data);
      if (!done) return;
      response.flags = 0;
      response.error = *done < 0 ? static_cast<int>(*done) : 0;
      response.val = *done < 0 ? 0 : *done;
      return;
    }
    response.flags = 0;
    response.error = -ErrnoByName(options_.fault);
  }

  const Options& options_;
  int listener_;
  std::map<std::string, std::uint64_t> counts_;
  std::string faultedFile_;
};

/// Starts the program; it waits for the answers to its watched calls from its first one on.
pid_t Start(const Options& options, int socket) {
  const pid_t child = fork();
  if (child != 0) return child;
  prctl(PR_SET_PDEATHSIG, SIGKILL);  // nobody would answer its calls any more
  const int listener = WatchThisProcess(options.kind);
  SendDescriptor(socket, listener);
  if (listener >= 0) execv(options.program[0], options.program.data());
  _exit(127);
}

/// Answers until the program has ended. Gives its wait status, none when its time was over.
std::optional<int> Watch(Supervisor& supervisor, int listener, pid_t child, int seconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
  bool isLate = false;
  int status = 0;
  while (waitpid(child, &status, WNOHANG) != child) {
    pollfd entry{listener, POLLIN, 0};
    poll(&entry, 1, 20);
    if ((entry.revents & POLLIN) != 0) supervisor.Answer();
    if (!isLate && std::chrono::steady_clock::now() > end) {
      isLate = true;
      kill(child, SIGKILL);
    }
  }
  return isLate ? std::nullopt : std::optional<int>(status);
}

}  // namespace

int main(int count, char** words) {
  Options options;
  if (!ParseOptions(count, words, options)) {
    std::fprintf(stderr, "see the head of fault_supervisor.cpp for the command line\n");
    return kExitUsage;
  }
  std::array<int, 2> sockets{};
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets.data()) != 0) return kExitUsage;
  const pid_t child = Start(options, sockets[1]);
  const int listener = ReceiveDescriptor(sockets[0]);
  if (child < 0 || listener < 0) {
    std::fprintf(stderr, "the kernel does not let this process watch system calls\n");
    return kExitNotAllowed;
  }
  Supervisor supervisor(options, listener);
  const auto status = Watch(supervisor, listener, child, options.seconds);
  std::ofstream report(options.report);
  report << '{';
  supervisor.Report(report);
  if (!status) {
    report << ", \"end\": \"late\"";
  } else if (WIFSIGNALED(*status)) {
    report << ", \"end\": \"signal\", \"signal\": " << WTERMSIG(*status);
  } else {
    report << ", \"end\": \"exit\", \"exit\": " << WEXITSTATUS(*status);
  }
  report << "}\n";
  return report.good() ? 0 : 1;
}
