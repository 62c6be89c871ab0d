#include "foundation/file_faults.h"

#include <cerrno>
#include <vector>

#include "platform/memory_shortage.h"

namespace lumo {
namespace {

/// Faults beyond these say nothing new.
constexpr std::size_t kMaxKept = 64;

thread_local std::vector<FileFault> tFaults;
thread_local unsigned tListeners = 0;

}  // namespace

std::string FileFault::Text() const {
  return platform::SystemErrorText(code);
}

FileFaults::FileFaults() : begin_(tFaults.size()) {
  ++tListeners;
}

FileFaults::~FileFaults() {
  if (--tListeners == 0) tFaults.clear();
}

const FileFault* FileFaults::First() const {
  return begin_ < tFaults.size() ? &tFaults[begin_] : nullptr;
}

const FileFault* FileFaults::FirstOf(const std::string& path) const {
  for (std::size_t i = begin_; i < tFaults.size(); ++i) {
    if (tFaults[i].path == path) return &tFaults[i];
  }
  return nullptr;
}

void FileFaults::Clear() {
  begin_ = tFaults.size();
}

void FileFaults::NoteUnread(const std::string& path) {
  const int code = errno;
  const bool isAbsent =
      code == 0 || code == ENOENT || code == ENOTDIR || code == EISDIR || code == ENAMETOOLONG;
  if (!isAbsent) Note(path, code);
}

void FileFaults::Note(const std::string& path, int code) {
  if (tListeners != 0 && tFaults.size() < kMaxKept) tFaults.push_back({path, code});
}

}  // namespace lumo
