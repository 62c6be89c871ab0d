#include "mosaic/owner_file.h"

#include <chrono>
#include <filesystem>
#include <fstream>
#include <thread>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "platform/folder_lock.h"
#include "platform/owned_name.h"
#include "platform/random_access_file.h"

namespace lumo {

namespace fs = std::filesystem;

OwnerFile::~OwnerFile() {
  std::error_code ignored;
  if (isOurs_) fs::remove(path_, ignored);
}

bool OwnerFile::Take(std::string& fault) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
  for (;;) {
    std::string owner;
    if (!TryTake(owner, fault)) return false;
    if (isOurs_) return true;
    if (std::chrono::steady_clock::now() > end) {
      fault = fmt::format("{}: held by {}", path_, Printable(owner, 80));
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
}

/// Takes the file unless a process that runs has it.
bool OwnerFile::TryTake(std::string& owner, std::string& fault) {
  const platform::FolderLock folder(path_);
  if (!folder.IsHeld(&fault)) return false;
  std::error_code missing;
  if (fs::exists(path_, missing)) {
    std::ifstream(path_) >> owner;
    // One that is empty, or has no mark, was cut off: its writer held the folder too.
    const std::size_t dot = owner.find('.');
    const bool isMarked = dot != owner.npos && platform::OwnerMarkLength(owner.substr(dot)) != 0;
    const bool isHeld = isMarked && !platform::IsAbandoned(owner) && !platform::IsOwned(owner);
    if (isHeld) return true;
    fs::remove(path_, missing);
  }
  isOurs_ = platform::WriteNewFile(path_, platform::OwnedName("vexg"), &fault);
  return isOurs_;
}

}  // namespace lumo
