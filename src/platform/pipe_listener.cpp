#include "platform/pipe_listener.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <compare>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <limits>
#include <list>
#include <mutex>
#include <new>
#include <poll.h>
#include <set>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <utility>
#include <vector>

#include "platform/clock.h"
#include "platform/message_frame.h"
#include "platform/pipe_directory.h"

namespace lumo::platform {
namespace {

/// Number by which the file system knows the file at `path`; 0 when there is none.
ino_t FileNumber(const std::string& path) {
  struct stat status {};
  return lstat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

/// A socket in the file system, distinguished from one that has taken its place.
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

/// The bytes of the messages that clients have sent to the listeners of the process and that are
/// not answered yet.
std::atomic<std::size_t> gIncoming{0};

/// A message's share of gIncoming.
class IncomingShare {
 public:
  IncomingShare() = default;
  ~IncomingShare() { Clear(); }
  IncomingShare(const IncomingShare&) = delete;
  IncomingShare& operator=(const IncomingShare&) = delete;

  /// False when the message is one too many.
  bool Set(std::size_t bytes, std::size_t limit) {
    constexpr std::size_t kSmall = std::size_t{64} << 10;  // so that a word gets in at any time
    gIncoming += bytes - bytes_;
    bytes_ = bytes;
    return bytes <= kSmall || gIncoming <= limit;
  }

  void Clear() {
    gIncoming -= bytes_;
    bytes_ = 0;
  }

 private:
  std::size_t bytes_ = 0;
};

/// A client between its connecting and the end of its answer.
struct Peer {
  FileDescriptor socket;
  FrameReader in;
  IncomingShare share;
  std::string out;
  std::size_t sent = 0;
  bool answered = false;
  double lastByte = MonotonicSeconds();  // or when somebody began to listen again

  bool IsSending() const { return sent < out.size(); }
  bool IsIncomplete() const { return !answered && !in.IsWhole(); }
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

/// The socket of `path` that a service manager has opened for this process, which takes it over, as
/// sd_listen_fds(3) describes; not open when there is none.
FileDescriptor TakeInherited(const std::string& path) {
  constexpr int kFirst = 3;
  const char* const process = std::getenv("LISTEN_PID");
  const char* const count = std::getenv("LISTEN_FDS");
  if (process == nullptr || count == nullptr || std::to_string(getpid()) != process) return {};
  for (int socket = kFirst; socket < kFirst + std::atoi(count); ++socket) {
    sockaddr_un address{};
    socklen_t length = sizeof address - 1;  // a zero stands behind every path
    int listens = 0;
    socklen_t size = sizeof listens;
    const bool isIt = getsockname(socket, reinterpret_cast<sockaddr*>(&address), &length) == 0 &&
                      address.sun_family == AF_UNIX && path == address.sun_path &&
                      getsockopt(socket, SOL_SOCKET, SO_ACCEPTCONN, &listens, &size) == 0 &&
                      listens != 0;
    if (!isIt) continue;
    fcntl(socket, F_SETFD, FD_CLOEXEC);
    fcntl(socket, F_SETFL, fcntl(socket, F_GETFL) | O_NONBLOCK);
    return FileDescriptor(socket);
  }
  return {};
}

/// How many clients one listener may have at a time, so that most of the descriptors of the process
/// are left for what it does.
unsigned MostClients() {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return std::numeric_limits<unsigned>::max();
  constexpr rlim_t kShare = 4;
  const rlim_t share = std::max<rlim_t>(limit.rlim_cur / kShare, 1);
  return static_cast<unsigned>(std::min<rlim_t>(share, std::numeric_limits<int>::max()));
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
  ListenerLimits limits;
  PipeFile file;
  FileDescriptor socket;
  FileDescriptor watched;  // a process whose end ends the waiting
  FileDescriptor wake{eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)};  // ready once there is a stop
  std::atomic<bool> stopped{false};
  std::list<Peer> peers;        // all but the current one
  std::list<Peer> current;      // the client of the exchange, or none
  std::vector<pollfd> entries;  // kept from round to round
  double waitEnd = MonotonicSeconds();

  bool PollRound();
  int NextTimeout() const;
  void AcceptAll();
  bool MakeRoom();
  bool CloseMostSilent();
  void Serve(std::list<Peer>::iterator peer, short events);
  bool Receive(Peer& peer) const;
  void CloseIdle();
  void LimitUnread();
  void EndExchange();
  void Drain();
};

PipeListener::PipeListener(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}

PipeListener::~PipeListener() {
  OwnPipes::Get().Remove(impl_->file);
}

std::unique_ptr<PipeListener> PipeListener::Open(const std::string& name, PipeFault& fault,
                                                 const ListenerLimits& limits) {
  auto impl = std::make_unique<Impl>();
  impl->limits = limits;
  impl->limits.clients = std::min(limits.clients, MostClients());
  impl->file.path = PipePath(name);
  fault = PipeFault::kBadName;
  if (impl->file.path.empty()) return nullptr;
  SpareDescriptor::Get();  // taken while there is one
  fault = PipeFault::kSystem;
  if (!impl->wake.IsOpen()) return nullptr;
  impl->socket = TakeInherited(impl->file.path);
  if (impl->socket.IsOpen()) {  // its file stays, for the next process that is started with it
    fault = PipeFault::kNone;
    return std::unique_ptr<PipeListener>(new PipeListener(std::move(impl)));
  }
  impl->socket = TakeName(impl->file.path, fault);
  if (!impl->socket.IsOpen()) return nullptr;
  impl->file.number = FileNumber(impl->file.path);
  OwnPipes::Get().Add(impl->file);
  return std::unique_ptr<PipeListener>(new PipeListener(std::move(impl)));
}

bool PipeListener::Wait(std::string& message) {
  // The time of an exchange, in which nobody listens, is nobody's silence.
  const double unheard = MonotonicSeconds() - impl_->waitEnd;
  for (Peer& peer : impl_->peers) peer.lastByte += unheard;
  impl_->EndExchange();
  while (!impl_->stopped) {
    const auto whole = std::find_if(impl_->peers.begin(), impl_->peers.end(),
                                    [](const Peer& p) { return !p.answered && p.in.IsWhole(); });
    if (whole != impl_->peers.end()) {
      impl_->current.splice(impl_->current.end(), impl_->peers, whole);
      message = impl_->current.front().in.Take();
      impl_->waitEnd = MonotonicSeconds();
      return true;
    }
    if (!impl_->PollRound()) return false;
  }
  return false;
}

void PipeListener::Finish() {
  impl_->EndExchange();
  impl_->Drain();
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
  const std::uint64_t one = 1;
  static_cast<void>(write(impl_->wake.Get(), &one, sizeof one) == sizeof one);
  // Clients look elsewhere at once; those of a service manager wait for the next server.
  if (impl_->file.number != 0) shutdown(impl_->socket.Get(), SHUT_RD);
}

/// Puts the client of the exchange before among those whose answers are still being sent.
void PipeListener::Impl::EndExchange() {
  if (current.empty()) return;
  Peer& peer = current.front();
  peer.answered = true;
  peer.lastByte = MonotonicSeconds();
  peer.share.Clear();
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

/// Gives what is left of answers to clients that go on reading, for the end of the listener.
void PipeListener::Impl::Drain() {
  peers.remove_if([](const Peer& peer) { return !peer.answered || !peer.IsSending(); });
  while (!peers.empty()) {
    entries.clear();
    for (const Peer& peer : peers) entries.push_back({peer.socket.Get(), POLLOUT, 0});
    const int ready =
        poll(entries.data(), entries.size(), static_cast<int>(limits.drainSeconds * 1000.0));
    if (ready == 0 || (ready < 0 && errno != EINTR)) return;
    std::size_t index = 0;
    for (auto peer = peers.begin(); peer != peers.end(); ++index) {
      const auto next = std::next(peer);
      if (entries[index].revents != 0) Serve(peer, entries[index].revents);
      peer = next;
    }
  }
}

/// Closes the clients that have been silent for too long.
void PipeListener::Impl::CloseIdle() {
  const double since = MonotonicSeconds() - limits.idleSeconds;
  peers.remove_if([&](const Peer& peer) { return peer.IsIncomplete() && peer.lastByte <= since; });
}

/// Milliseconds until a silent client is to be closed; -1 without one.
int PipeListener::Impl::NextTimeout() const {
  const bool isFull = peers.size() >= limits.clients;
  double first = isFull ? MonotonicSeconds() + 1.0 : -1.0;
  for (const Peer& peer : peers) {
    const double end = peer.lastByte + limits.idleSeconds;
    if (peer.IsIncomplete() && (first < 0.0 || end < first)) first = end;
  }
  if (first < 0.0) return -1;
  return static_cast<int>(std::clamp(first - MonotonicSeconds(), 0.0, 1e6) * 1000.0) + 1;
}

/// Sees to it that one more client can come in; false when all those that are there are busy.
bool PipeListener::Impl::MakeRoom() {
  return peers.size() < limits.clients || CloseMostSilent();
}

/// Closes the client that has been silent for longest, or has not read its answer; false when there
/// is none that does so for long.
bool PipeListener::Impl::CloseMostSilent() {
  constexpr double kPatience = 1.0;  // s, for a client that has only just connected
  const double now = MonotonicSeconds();
  auto most = peers.end();
  for (auto peer = peers.begin(); peer != peers.end(); ++peer) {
    if (peer->in.IsWhole()) continue;  // waits for its turn
    const double patience = peer->answered ? limits.idleSeconds : kPatience;
    if (now - peer->lastByte < patience) continue;
    if (most == peers.end() || peer->lastByte < most->lastByte) most = peer;
  }
  if (most == peers.end()) return false;
  peers.erase(most);
  return true;
}

/// Waits for one round of events and serves them; false when the waiting is at its end.
bool PipeListener::Impl::PollRound() {
  entries.clear();
  entries.push_back({MakeRoom() ? socket.Get() : -1, POLLIN, 0});
  entries.push_back({watched.IsOpen() ? watched.Get() : -1, POLLIN, 0});
  entries.push_back({wake.Get(), POLLIN, 0});
  for (const Peer& peer : peers) {
    entries.push_back({peer.socket.Get(), static_cast<short>(peer.answered ? POLLOUT : POLLIN), 0});
  }
  if (poll(entries.data(), entries.size(), NextTimeout()) < 0) return errno == EINTR;
  if (stopped || entries[1].revents != 0) return false;
  std::size_t index = 3;
  for (auto peer = peers.begin(); peer != peers.end(); ++index) {
    const auto next = std::next(peer);
    if (entries[index].revents != 0) Serve(peer, entries[index].revents);
    peer = next;
  }
  if (entries[0].revents != 0) AcceptAll();
  CloseIdle();
  return true;
}

void PipeListener::Impl::Serve(std::list<Peer>::iterator peer, short events) {
  bool keep = false;
  if (peer->answered) {
    const std::size_t before = peer->sent;
    keep = (events & (POLLERR | POLLHUP)) == 0 &&
           SendSome(peer->socket.Get(), peer->out, peer->sent) && peer->IsSending();
    if (peer->sent != before) peer->lastByte = MonotonicSeconds();
  } else {
    keep = peer->in.IsWhole() || Receive(*peer);
  }
  if (!keep) peers.erase(peer);
}

/// Takes in what a client has sent; false when it is to be closed.
bool PipeListener::Impl::Receive(Peer& peer) const {
  try {
    if (peer.in.Receive(peer.socket.Get()) == FrameReader::Status::kBroken) return false;
    peer.lastByte = MonotonicSeconds();
    return peer.share.Set(peer.in.GetReceived(), limits.incomingBytes);
  } catch (const std::bad_alloc&) {
    return false;  // the others go on
  }
}

void PipeListener::Impl::AcceptAll() {
  while (MakeRoom()) {
    FileDescriptor client(accept4(socket.Get(), nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC));
    if (!client.IsOpen()) {
      if (errno == EINTR || errno == ECONNABORTED) continue;
      if (errno != EMFILE && errno != ENFILE) return;
      if (CloseMostSilent()) continue;
      if (SpareDescriptor::Get().RefuseClient(socket.Get())) continue;
      constexpr int kBreather = 10;  // ms, for descriptors to come back
      poll(nullptr, 0, kBreather);
      return;
    }
    if (!PeerIsOurs(client.Get())) continue;
    peers.emplace_back();
    peers.back().socket = std::move(client);
    // A message that a client sends right away is mostly there by now.
    Serve(std::prev(peers.end()), POLLIN);
  }
}

void RemoveOwnPipes() {
  OwnPipes::Get().RemoveAll();
}

}  // namespace lumo::platform
