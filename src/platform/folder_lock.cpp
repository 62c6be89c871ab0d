#include "platform/folder_lock.h"

#include <cerrno>
#include <chrono>
#include <fcntl.h>
#include <filesystem>
#include <sys/file.h>
#include <thread>

#include "platform/file_descriptor.h"

namespace lumo::platform {
namespace {

constexpr std::chrono::milliseconds kLook{5};
constexpr std::chrono::seconds kLongest{30};

}  // namespace

FolderLock::FolderLock(const std::string& path) : path_(path) {
  const std::filesystem::path folder = std::filesystem::path(path).parent_path();
  folder_ = std::make_unique<FileDescriptor>(
      open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder_->IsOpen()) return;
  const auto end = std::chrono::steady_clock::now() + kLongest;
  // A lock that is waited for in the system could be waited for without an end.
  while (flock(folder_->Get(), LOCK_EX | LOCK_NB) != 0) {
    if (errno == EINTR) continue;
    if (errno != EWOULDBLOCK) return;
    isHeld_ = std::chrono::steady_clock::now() < end;
    if (!isHeld_) return;
    std::this_thread::sleep_for(kLook);
  }
}

FolderLock::~FolderLock() = default;

bool FolderLock::IsHeld(std::string* fault) const {
  if (!isHeld_ && fault != nullptr) *fault = path_ + ": another program is writing beside it";
  return isHeld_;
}

}  // namespace lumo::platform
