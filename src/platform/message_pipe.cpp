#include "platform/message_pipe.h"

#include <algorithm>
#include <cerrno>
#include <poll.h>
#include <sys/inotify.h>
#include <sys/ioctl.h>

#include "platform/clock.h"
#include "platform/message_frame.h"
#include "platform/pipe_directory.h"

namespace lumo::platform {
namespace {

/// Watches for changes in the directory of the pipes.
class DirectoryWatch {
 public:
  DirectoryWatch() : events_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    const FileDescriptor directory = OpenPipeDirectory();  // so that there is one to watch
    watching_ =
        directory.IsOpen() && events_.IsOpen() &&
        inotify_add_watch(events_.Get(), PipeDirectory().c_str(), IN_CREATE | IN_MOVED_TO) >= 0;
  }

  /// Blocks for the next change, at most `seconds`.
  void Wait(double seconds) {
    constexpr double kWithoutEvents = 0.02;  // the system has no watch to give: look now and then
    if (!watching_) seconds = std::min(seconds, kWithoutEvents);
    pollfd entry{watching_ ? events_.Get() : -1, POLLIN, 0};
    poll(&entry, 1, static_cast<int>(std::min(seconds, 1e6) * 1000.0) + 1);
    char changes[4096];
    while (watching_ && read(events_.Get(), changes, sizeof changes) > 0) {
    }
  }

 private:
  FileDescriptor events_;
  bool watching_ = false;
};

/// True for a fault that a server's coming would mend.
bool IsAbsence(int fault) {
  return fault == ENOENT || fault == ECONNREFUSED || fault == EAGAIN;
}

bool ConnectInTime(const std::string& path, double seconds, FileDescriptor& socket) {
  const double deadline = MonotonicSeconds() + seconds;
  int fault = ConnectSocket(path, seconds, socket);
  if (fault == 0 || seconds <= 0.0 || !IsAbsence(fault)) return fault == 0;
  DirectoryWatch watch;
  while (true) {
    const double left = deadline - MonotonicSeconds();
    fault = ConnectSocket(path, std::max(left, 0.0), socket);
    if (fault == 0 || left <= 0.0 || !IsAbsence(fault)) return fault == 0;
    watch.Wait(left);
  }
}

}  // namespace

struct PipeConnection::Impl {
  FileDescriptor socket;
  FrameReader in;
};

PipeConnection::PipeConnection(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}

PipeConnection::~PipeConnection() = default;

std::unique_ptr<PipeConnection> PipeConnection::Connect(const std::string& name, double seconds) {
  const std::string path = PipePath(name);
  if (path.empty()) return nullptr;
  auto impl = std::make_unique<Impl>();
  if (!ConnectInTime(path, seconds, impl->socket)) return nullptr;
  if (!PeerIsOurs(impl->socket.Get())) return nullptr;
  return std::unique_ptr<PipeConnection>(new PipeConnection(std::move(impl)));
}

bool PipeConnection::Write(std::string_view message) {
  const std::string frame = MakeFrame(message);
  std::size_t sent = 0;
  return !frame.empty() && SendSome(impl_->socket.Get(), frame, sent) && sent == frame.size();
}

bool PipeConnection::Read(std::string& message) {
  auto status = impl_->in.IsWhole() ? FrameReader::Status::kWhole : FrameReader::Status::kMore;
  while (status == FrameReader::Status::kMore) status = impl_->in.Receive(impl_->socket.Get());
  if (status != FrameReader::Status::kWhole) return false;
  message = impl_->in.Take();
  return true;
}

std::size_t PipeConnection::BytesAvailable() {
  const int socket = impl_->socket.Get();
  pollfd entry{socket, POLLIN, 0};
  while (!impl_->in.IsWhole() && poll(&entry, 1, 0) == 1) {
    if (impl_->in.Receive(socket) == FrameReader::Status::kBroken) return 0;
  }
  return impl_->in.IsWhole() ? impl_->in.GetReceived() : 0;
}

}  // namespace lumo::platform
