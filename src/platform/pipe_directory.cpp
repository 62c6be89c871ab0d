#include "platform/pipe_directory.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

namespace lumo::platform {
namespace {

bool IsDirectory(const char* path) {
  struct stat status {};
  return stat(path, &status) == 0 && S_ISDIR(status.st_mode);
}

ucred PeerCredentials(int socket) {
  ucred peer{};
  socklen_t length = sizeof peer;
  if (getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &peer, &length) != 0) return {0, ~uid_t{0}, 0};
  return peer;
}

}  // namespace

std::string PipeDirectory() {
  const char* const runtime = std::getenv("XDG_RUNTIME_DIR");
  if (runtime != nullptr && runtime[0] == '/' && IsDirectory(runtime)) {
    return std::string(runtime) + "/vexg";
  }
  return "/tmp/vexg-" + std::to_string(geteuid());
}

FileDescriptor OpenPipeDirectory() {
  const std::string path = PipeDirectory();
  mkdir(path.c_str(), S_IRWXU);  // when it is there already, the checks below decide
  FileDescriptor directory(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  struct stat status {};
  const bool ours = directory.IsOpen() && fstat(directory.Get(), &status) == 0 &&
                    status.st_uid == geteuid() && (status.st_mode & (S_IRWXG | S_IRWXO)) == 0;
  return ours ? std::move(directory) : FileDescriptor();
}

std::string PipePath(const std::string& name) {
  const bool allowed = !name.empty() && name[0] != '.' && name.find('/') == std::string::npos &&
                       name.find('\0') == std::string::npos && name.find("..") == std::string::npos;
  if (!allowed) return {};
  std::string path = PipeDirectory() + "/" + name;
  return path.size() < sizeof sockaddr_un::sun_path ? path : std::string();
}

int ConnectSocket(const std::string& path, double seconds, FileDescriptor& socket) {
  const int kind = SOCK_STREAM | SOCK_CLOEXEC | (seconds > 0.0 ? 0 : SOCK_NONBLOCK);
  socket = FileDescriptor(::socket(AF_UNIX, kind, 0));
  if (!socket.IsOpen()) return errno;
  if (seconds > 0.0) {
    timeval limit{};
    limit.tv_sec = static_cast<time_t>(seconds);
    limit.tv_usec = static_cast<suseconds_t>((seconds - static_cast<double>(limit.tv_sec)) * 1e6);
    if (limit.tv_sec == 0 && limit.tv_usec == 0) limit.tv_usec = 1;  // 0 would mean "for ever"
    setsockopt(socket.Get(), SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
  }
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
  int failed = 0;
  do {
    failed = connect(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address);
  } while (failed != 0 && errno == EINTR);
  if (failed != 0) return errno;
  if (seconds > 0.0) {
    const timeval none{};
    setsockopt(socket.Get(), SOL_SOCKET, SO_SNDTIMEO, &none, sizeof none);
  } else {
    fcntl(socket.Get(), F_SETFL, fcntl(socket.Get(), F_GETFL) & ~O_NONBLOCK);
  }
  return 0;
}

bool PeerIsOurs(int socket) {
  return PeerCredentials(socket).uid == geteuid();
}

int PeerProcess(int socket) {
  return PeerCredentials(socket).pid;
}

}  // namespace lumo::platform
