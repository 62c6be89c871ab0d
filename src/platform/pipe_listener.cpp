#include "platform/pipe_listener.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <compare>
#include <cstring>
#include <fcntl.h>
#include <list>
#include <mutex>
#include <poll.h>
#include <set>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <vector>

#include "platform/message_frame.h"
#include "platform/pipe_directory.h"

namespace lumo::platform {
namespace {

/// Number by which the file system knows the file at `path`; 0 when there is none.
ino_t FileNumber(const std::string& path) {
  struct stat status {};
  return lstat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

/// A socket in the file system, which is told from one that has taken its place.
struct PipeFile {
  std::string path;
  ino_t number = 0;

  friend auto operator<=>(const PipeFile&, const PipeFile&) = default;

  void Remove() const {
    if (FileNumber(path) == number) unlink(path.c_str());
  }
};

/// The pipes that this process has, for the end of the process.
class OwnPipes {
 public:
  static OwnPipes& Get() {
    static auto& pipes = *new OwnPipes;
    return pipes;
  }

  void Add(const PipeFile& pipe) {
    const std::lock_guard lock(mutex_);
    pipes_.insert(pipe);
  }

  void Remove(const PipeFile& pipe) {
    const std::lock_guard lock(mutex_);
    if (pipes_.erase(pipe) != 0) pipe.Remove();
  }

  void RemoveAll() {
    const std::lock_guard lock(mutex_);
    for (const PipeFile& pipe : pipes_) pipe.Remove();
    pipes_.clear();
  }

 private:
  std::mutex mutex_;
  std::set<PipeFile> pipes_;
};

/// A descriptor in reserve: when the process has none left, it is spent on taking a client off the
/// queue and closing it, since one that stays there would keep the server spinning.
class SpareDescriptor {
 public:
  static SpareDescriptor& Get() {
    static auto& spare = *new SpareDescriptor;
    return spare;
  }

  /// False when even that failed, as another thread was faster.
  bool RefuseClient(int listener) {
    const std::lock_guard lock(mutex_);
    spare_.Close();
    const bool taken = FileDescriptor(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC)).IsOpen();
    spare_ = Reserve();
    return taken;
  }

 private:
  static FileDescriptor Reserve() {
    return FileDescriptor(open("/dev/null", O_RDONLY | O_CLOEXEC));
  }

  std::mutex mutex_;
  FileDescriptor spare_ = Reserve();
};

/// A client between its connecting and the end of its answer.
struct Peer {
  FileDescriptor socket;
  FrameReader in;
  std::string out;
  std::size_t sent = 0;
  bool answered = false;

  bool IsSending() const { return sent < out.size(); }
};

/// A socket bound to a path that nothing looks for, ready for clients, or not open.
FileDescriptor ListenAt(const std::string& path) {
  FileDescriptor socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
  sockaddr_un address{};
  if (!socket.IsOpen() || path.size() >= sizeof address.sun_path) return {};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
  fchmod(socket.Get(), S_IRUSR | S_IWUSR);  // what the socket's file will have
  if (bind(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    return {};
  }
  if (listen(socket.Get(), SOMAXCONN) == 0) return socket;
  unlink(path.c_str());
  return {};
}

bool HasLivingServer(const std::string& path) {
  FileDescriptor probe;
  const int fault = ConnectSocket(path, 0.0, probe);
  return fault == 0 || fault == EAGAIN;
}

/// Makes the socket of `path`, in place of one that a dead server left. It appears there when it is
/// ready for clients, not before.
FileDescriptor TakeName(const std::string& path, PipeFault& fault) {
  static std::atomic<unsigned> counter{0};
  fault = PipeFault::kBadDirectory;
  const FileDescriptor directory = OpenPipeDirectory();
  if (!directory.IsOpen()) return {};
  fault = PipeFault::kSystem;
  if (flock(directory.Get(), LOCK_EX) != 0) return {};  // one at a time; ends with the descriptor
  if (HasLivingServer(path)) {
    fault = PipeFault::kTaken;
    return {};
  }
  const std::string fresh =
      PipeDirectory() + "/." + std::to_string(getpid()) + "-" + std::to_string(counter++);
  FileDescriptor socket = ListenAt(fresh);
  if (!socket.IsOpen()) return {};
  if (rename(fresh.c_str(), path.c_str()) != 0) {
    unlink(fresh.c_str());
    return {};
  }
  fault = PipeFault::kNone;
  return socket;
}

}  // namespace

struct PipeListener::Impl {
  PipeFile file;
  FileDescriptor socket;
  FileDescriptor watched;  // a process whose end ends the waiting
  std::atomic<bool> stopped{false};
  std::list<Peer> peers;        // all but the current one
  std::list<Peer> current;      // the client of the exchange, or none
  std::vector<pollfd> entries;  // kept from round to round

  bool PollRound();
  void AcceptAll();
  void Serve(std::list<Peer>::iterator peer, short events);
  void LimitUnread();
  void EndExchange();
};

PipeListener::PipeListener(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}

PipeListener::~PipeListener() {
  OwnPipes::Get().Remove(impl_->file);
}

std::unique_ptr<PipeListener> PipeListener::Open(const std::string& name, PipeFault& fault) {
  auto impl = std::make_unique<Impl>();
  impl->file.path = PipePath(name);
  fault = PipeFault::kBadName;
  if (impl->file.path.empty()) return nullptr;
  SpareDescriptor::Get();  // taken while there is one
  impl->socket = TakeName(impl->file.path, fault);
  if (!impl->socket.IsOpen()) return nullptr;
  impl->file.number = FileNumber(impl->file.path);
  OwnPipes::Get().Add(impl->file);
  return std::unique_ptr<PipeListener>(new PipeListener(std::move(impl)));
}

bool PipeListener::Wait(std::string& message) {
  impl_->EndExchange();
  while (!impl_->stopped) {
    const auto whole = std::find_if(impl_->peers.begin(), impl_->peers.end(),
                                    [](const Peer& p) { return !p.answered && p.in.IsWhole(); });
    if (whole != impl_->peers.end()) {
      impl_->current.splice(impl_->current.end(), impl_->peers, whole);
      message = impl_->current.front().in.Take();
      return true;
    }
    if (!impl_->PollRound()) return false;
  }
  return false;
}

bool PipeListener::Reply(std::string_view message) {
  if (impl_->current.empty()) return false;
  Peer& peer = impl_->current.front();
  peer.out = MakeFrame(message);
  peer.sent = 0;
  return !peer.out.empty() && SendSome(peer.socket.Get(), peer.out, peer.sent);
}

int PipeListener::GetClientProcess() const {
  return impl_->current.empty() ? 0 : PeerProcess(impl_->current.front().socket.Get());
}

bool PipeListener::EndWithProcess(int process) {
  if (process == getpid()) return true;
  impl_->watched = FileDescriptor(static_cast<int>(syscall(SYS_pidfd_open, process, 0)));
  return impl_->watched.IsOpen();
}

void PipeListener::Stop() {
  impl_->stopped = true;
  shutdown(impl_->socket.Get(), SHUT_RD);  // wakes the poll
}

/// Puts the client of the exchange before among those whose answers are still being sent.
void PipeListener::Impl::EndExchange() {
  if (current.empty()) return;
  Peer& peer = current.front();
  peer.answered = true;
  if (peer.IsSending()) {
    peers.splice(peers.end(), current);
    LimitUnread();
  }
  current.clear();
}

/// Bounds the memory that clients can hold by not reading: the oldest answers are given up.
void PipeListener::Impl::LimitUnread() {
  constexpr std::size_t kMaxUnread = 2 * kMaxMessageBytes;
  std::size_t unread = 0;
  for (const Peer& peer : peers) unread += peer.out.size();
  for (auto peer = peers.begin(); peer != peers.end() && unread > kMaxUnread;) {
    const auto next = std::next(peer);
    unread -= peer->out.size();
    if (peer->answered) peers.erase(peer);
    peer = next;
  }
}

/// Waits for one round of events and serves them; false when the waiting is at its end.
bool PipeListener::Impl::PollRound() {
  entries.clear();
  entries.push_back({socket.Get(), POLLIN, 0});
  entries.push_back({watched.IsOpen() ? watched.Get() : -1, POLLIN, 0});
  for (const Peer& peer : peers) {
    entries.push_back({peer.socket.Get(), static_cast<short>(peer.answered ? POLLOUT : POLLIN), 0});
  }
  if (poll(entries.data(), entries.size(), -1) < 0) return errno == EINTR;
  if (stopped || entries[1].revents != 0) return false;
  std::size_t index = 2;
  for (auto peer = peers.begin(); peer != peers.end(); ++index) {
    const auto next = std::next(peer);
    if (entries[index].revents != 0) Serve(peer, entries[index].revents);
    peer = next;
  }
  if (entries[0].revents != 0) AcceptAll();
  return true;
}

void PipeListener::Impl::Serve(std::list<Peer>::iterator peer, short events) {
  bool keep = false;
  if (peer->answered) {
    keep = (events & (POLLERR | POLLHUP)) == 0 &&
           SendSome(peer->socket.Get(), peer->out, peer->sent) && peer->IsSending();
  } else {
    keep =
        peer->in.IsWhole() || peer->in.Receive(peer->socket.Get()) != FrameReader::Status::kBroken;
  }
  if (!keep) peers.erase(peer);
}

void PipeListener::Impl::AcceptAll() {
  while (true) {
    FileDescriptor client(accept4(socket.Get(), nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC));
    if (!client.IsOpen()) {
      if (errno == EINTR || errno == ECONNABORTED) continue;
      if (errno != EMFILE && errno != ENFILE) return;
      if (SpareDescriptor::Get().RefuseClient(socket.Get())) continue;
      constexpr int kBreather = 10;  // ms, for descriptors to come back
      poll(nullptr, 0, kBreather);
      return;
    }
    if (!PeerIsOurs(client.Get())) continue;
    peers.emplace_back();
    peers.back().socket = std::move(client);
    // What a client sends right away is mostly there by now.
    Serve(std::prev(peers.end()), POLLIN);
  }
}

void RemoveOwnPipes() {
  OwnPipes::Get().RemoveAll();
}

}  // namespace lumo::platform
