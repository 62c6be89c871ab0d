#include "platform/unfinished_folders.h"

#include <array>
#include <atomic>
#include <climits>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace lumo::platform {
namespace {

constexpr std::size_t kMostFolders = 8;
constexpr const char* kOlderOutput = ".old";

struct FolderSlot {
  std::atomic<bool> isWhole{false};
  char path[PATH_MAX] = {};
};

// No constructor at run time: a handler may read it at any moment.
constinit std::array<FolderSlot, kMostFolders> gFolders{};
std::atomic<std::size_t> gNext{0};

/// Removes the files of a folder; false when it holds what is to stay.
bool RemoveFiles(int folder) {
  if (faccessat(folder, kOlderOutput, F_OK, AT_SYMLINK_NOFOLLOW) == 0) return false;
  alignas(dirent64) char entries[4096];
  while (true) {
    const long bytes = syscall(SYS_getdents64, folder, entries, sizeof entries);
    if (bytes <= 0) return bytes == 0;
    for (long at = 0; at < bytes;) {
      const auto* const entry = reinterpret_cast<const dirent64*>(entries + at);
      if (entry->d_type == DT_REG) unlinkat(folder, entry->d_name, 0);
      at += entry->d_reclen;
    }
  }
}

}  // namespace

void KeepUnfinishedFolder(const std::string& path) noexcept {
  if (path.size() >= sizeof(FolderSlot::path)) return;
  FolderSlot& slot = gFolders[gNext.fetch_add(1) % kMostFolders];
  slot.isWhole = false;
  std::memcpy(slot.path, path.c_str(), path.size() + 1);
  slot.isWhole = true;
}

void RemoveUnfinishedFolders() noexcept {
  for (const FolderSlot& slot : gFolders) {
    if (!slot.isWhole) continue;
    const int folder = open(slot.path, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    if (folder < 0) continue;
    const bool isEmpty = RemoveFiles(folder);
    close(folder);
    if (isEmpty) rmdir(slot.path);
  }
}

}  // namespace lumo::platform
