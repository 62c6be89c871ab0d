#include "platform/interrupt.h"

#include <atomic>
#include <cerrno>
#include <poll.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <system_error>
#include <thread>
#include <unistd.h>

#include "platform/file_descriptor.h"

namespace lumo::platform {
namespace {

std::atomic<bool> gInterrupted{false};

sigset_t InterruptSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGINT);
  sigaddset(&signals, SIGTERM);
  return signals;
}

/// Ends the process the way `signal` does by itself.
void DieOf(int signal) {
  ::signal(signal, SIG_DFL);
  raise(signal);
  const sigset_t signals = InterruptSignals();
  pthread_sigmask(SIG_UNBLOCK, &signals, nullptr);
}

}  // namespace

struct InterruptWatch::Impl {
  std::function<void()> onInterrupt;
  sigset_t before{};
  FileDescriptor signals;
  FileDescriptor end;
  bool watchOutput = false;
  std::thread thread;

  void Run() {
    bool told = false;
    while (true) {
      pollfd entries[] = {{signals.Get(), POLLIN, 0},
                          {end.Get(), POLLIN, 0},
                          {watchOutput ? STDOUT_FILENO : -1, 0, 0}};
      if (poll(entries, 3, -1) < 0) continue;
      if (entries[1].revents != 0) return;
      if (entries[2].revents != 0) {
        watchOutput = false;  // it stays so
        if ((entries[2].revents & POLLERR) != 0) Tell();
      }
      if (entries[0].revents == 0) continue;
      signalfd_siginfo info{};
      if (read(signals.Get(), &info, sizeof info) != sizeof info) continue;
      if (told) DieOf(static_cast<int>(info.ssi_signo));
      told = true;
      Tell();
    }
  }

  void Tell() const {
    gInterrupted = true;
    onInterrupt();
  }
};

InterruptWatch::InterruptWatch(std::function<void()> onInterrupt, bool watchOutput)
    : impl_(new Impl) {
  impl_->onInterrupt = std::move(onInterrupt);
  impl_->watchOutput = watchOutput;
  const sigset_t signals = InterruptSignals();
  impl_->end = FileDescriptor(eventfd(0, EFD_CLOEXEC));
  impl_->signals = FileDescriptor(signalfd(-1, &signals, SFD_CLOEXEC));
  if (!impl_->end.IsOpen() || !impl_->signals.IsOpen()) {
    throw std::system_error(errno, std::generic_category());
  }
  pthread_sigmask(SIG_BLOCK, &signals, &impl_->before);
  impl_->thread = std::thread([impl = impl_.get()] { impl->Run(); });
}

InterruptWatch::~InterruptWatch() {
  eventfd_write(impl_->end.Get(), 1);
  impl_->thread.join();
  pthread_sigmask(SIG_SETMASK, &impl_->before, nullptr);
}

bool WasInterrupted() {
  return gInterrupted;
}

void IgnoreInterrupts() {
  for (const int number : {SIGINT, SIGTERM}) signal(number, SIG_IGN);
}

}  // namespace lumo::platform
