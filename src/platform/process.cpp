#include "platform/process.h"

#include <cstdio>
#include <poll.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/resource.h>
#include <unistd.h>

namespace lumo::platform {

bool ErrorOutputIsTerminal() {
  return isatty(STDERR_FILENO) == 1;
}

bool OutputIsTerminal() {
  return isatty(STDOUT_FILENO) == 1;
}

unsigned TerminalColumns() {
  constexpr unsigned kUsual = 80;
  winsize size{};
  const bool told = ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col != 0;
  return told ? size.ws_col : kUsual;
}

void RaiseDescriptorLimit() {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_NOFILE, &limit);
}

int ProcessNumber() {
  return getpid();
}

void SurviveFailedWrites() {
  signal(SIGPIPE, SIG_IGN);
  signal(SIGXFSZ, SIG_IGN);
}

bool OutputIsClosed() {
  pollfd entry{STDOUT_FILENO, 0, 0};
  return poll(&entry, 1, 0) == 1 && (entry.revents & POLLERR) != 0;
}

void EndOfClosedPipe() {
  signal(SIGPIPE, SIG_DFL);
  raise(SIGPIPE);
  EndProcess(1);
}

void EndProcess(int code) {
  std::fflush(nullptr);
  _exit(code);
}

void DropProcess(int code) {
  _exit(code);
}

}  // namespace lumo::platform
