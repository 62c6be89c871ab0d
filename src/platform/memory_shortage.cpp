#include "platform/memory_shortage.h"

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <execinfo.h>
#include <new>
#include <signal.h>
#include <system_error>
#include <unistd.h>

#include "platform/unfinished_folders.h"

namespace lumo::platform {
namespace {

// Counted while other libraries are still being loaded: no constructor at run time.
constinit std::atomic<unsigned long> gShortages{0};

const char* gProgram = "";
int gCode = 1;

/// Writes the line and ends the process. Only the system is called, as memory may be in any state.
[[noreturn]] void EndShort() {
  RemoveUnfinishedFolders();
  for (const char* const piece : {gProgram, ": ", kOutOfMemory, "\n"}) {
    if (write(STDERR_FILENO, piece, std::strlen(piece)) < 0) break;
  }
  _exit(gCode);
}

void OnCrash(int signal) {
  if (CountMemoryShortages() != 0) EndShort();
  ::signal(signal, SIG_DFL);
  raise(signal);
}

/// An exception that nobody takes: one of memory's is a shortage, noted or not.
void OnTerminate() {
  try {
    if (const std::exception_ptr thrown = std::current_exception()) std::rethrow_exception(thrown);
  } catch (const std::bad_alloc&) {
    EndShort();
  } catch (...) {
    // It ends below, or by the handler of SIGABRT where memory was short.
  }
  std::abort();
}

}  // namespace

void NoteMemoryShortage() noexcept {
  gShortages.fetch_add(1, std::memory_order_relaxed);
}

unsigned long CountMemoryShortages() noexcept {
  return gShortages.load(std::memory_order_relaxed);
}

void EndInOrderWhenMemoryIsShort(const char* program, int code) {
  gProgram = program;
  gCode = code;
  std::set_terminate(OnTerminate);
  void* none[1];
  backtrace(none, 1);  // so that the C library has by now what unwinding takes
  struct sigaction action {};
  action.sa_handler = OnCrash;
  action.sa_flags = SA_NODEFER;
  sigemptyset(&action.sa_mask);
  sigaction(SIGSEGV, &action, nullptr);
  sigaction(SIGABRT, &action, nullptr);
}

std::string SystemErrorText(int code) {
  if (code != ENOMEM) return std::generic_category().message(code);
  NoteMemoryShortage();
  return kOutOfMemory;
}

}  // namespace lumo::platform
