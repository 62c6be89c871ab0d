#include "platform/process_watch.h"

#include <cerrno>
#include <map>
#include <mutex>
#include <sys/epoll.h>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>

#include "platform/file_descriptor.h"

namespace lumo::platform {
namespace {

/// The thread that waits for the ends of processes, and what is to be called then.
class ProcessEnds {
 public:
  static ProcessEnds& Get() {
    static auto& ends = *new ProcessEnds;
    return ends;
  }

  /// @return the number of the watch, 0 when the system gives none.
  unsigned long Add(FileDescriptor process, std::function<void()> onEnd) {
    const std::lock_guard lock(mutex_);
    if (!StartThread()) return 0;
    const unsigned long number = ++last_;
    epoll_event event{};
    event.events = EPOLLIN | EPOLLONESHOT;
    event.data.u64 = number;
    if (epoll_ctl(events_.Get(), EPOLL_CTL_ADD, process.Get(), &event) != 0) return 0;
    watches_.emplace(number, Watch{std::move(process), std::move(onEnd)});
    return number;
  }

  void Remove(unsigned long number) {
    const std::lock_guard lock(mutex_);
    watches_.erase(number);  // the closing of its descriptor takes it out of the wait
  }

 private:
  struct Watch {
    FileDescriptor process;
    std::function<void()> onEnd;
  };

  bool StartThread() {
    if (running_) return true;
    events_ = FileDescriptor(epoll_create1(EPOLL_CLOEXEC));
    if (!events_.IsOpen()) return false;
    try {
      std::thread([this] { Run(); }).detach();
      running_ = true;
    } catch (...) {
      events_.Close();
    }
    return running_;
  }

  void Run() {
    while (true) {
      epoll_event event{};
      if (epoll_wait(events_.Get(), &event, 1, -1) != 1) continue;
      const std::lock_guard lock(mutex_);
      const auto watch = watches_.find(static_cast<unsigned long>(event.data.u64));
      if (watch != watches_.end()) watch->second.onEnd();
    }
  }

  std::mutex mutex_;
  FileDescriptor events_;
  bool running_ = false;
  unsigned long last_ = 0;
  std::map<unsigned long, Watch> watches_;
};

}  // namespace

ProcessWatch::ProcessWatch(int process, std::function<void()> onEnd) {
  if (process <= 0 || process == getpid()) return;
  FileDescriptor file(static_cast<int>(syscall(SYS_pidfd_open, process, 0)));
  if (file.IsOpen()) {
    number_ = ProcessEnds::Get().Add(std::move(file), std::move(onEnd));
  } else if (errno == ESRCH) {
    onEnd();
  }
}

ProcessWatch::~ProcessWatch() {
  if (number_ != 0) ProcessEnds::Get().Remove(number_);
}

}  // namespace lumo::platform
