#include "foundation/staged_files.h"

#include <cerrno>
#include <filesystem>
#include <utility>
#include <vector>

#include "platform/file_swap.h"
#include "platform/folder_lock.h"
#include "platform/random_access_file.h"
#include "platform/temporary_file.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

thread_local StagedFiles* tStaged = nullptr;

/// Makes a new file of what another holds. False with errno set.
bool Copy(const std::string& from, const std::string& to) {
  using platform::RandomAccessFile;
  const auto source = RandomAccessFile::Open(from, RandomAccessFile::Access::kRead);
  const auto target = source != nullptr ? RandomAccessFile::Create(to) : nullptr;
  if (target == nullptr) return false;
  constexpr std::size_t kPieceBytes = 1 << 20;
  std::vector<char> piece(kPieceBytes);
  std::uint64_t place = 0;
  for (std::size_t got = kPieceBytes; got == kPieceBytes; place += got) {
    if (!source->ReadUpTo(place, piece.data(), piece.size(), got) ||
        !target->Write(place, piece.data(), got)) {
      return false;
    }
  }
  return target->Close();
}

}  // namespace

StagedFiles::StagedFiles(std::string raster) : raster_(std::move(raster)) {
  tStaged = this;
}

StagedFiles::~StagedFiles() {
  tStaged = nullptr;
  std::error_code ignored;
  for (const auto& [path, entry] : entries_) fs::remove(entry.place, ignored);
}

StagedFiles* StagedFiles::OfThread() {
  return tStaged;
}

bool StagedFiles::Covers(const std::string& path) const {
  return path.size() > raster_.size() && path.starts_with(raster_) && path[raster_.size()] == '.';
}

StagedFiles::Entry& StagedFiles::EntryOf(const std::string& path) {
  const auto [at, isNew] = entries_.try_emplace(path);
  if (isNew) {
    platform::RemoveAbandonedFiles(path);
    at->second.place = platform::TemporaryPathBeside(path);
    at->second.older = platform::IdentifyFile(path);
  }
  return at->second;
}

std::string StagedFiles::PlaceOf(const std::string& path) const {
  const auto at = entries_.find(path);
  return at != entries_.end() ? at->second.place : path;
}

std::vector<std::string> StagedFiles::NamesIn(const std::string& folder) const {
  std::vector<std::string> names;
  std::error_code ignored;
  for (const auto& [path, entry] : entries_) {
    const fs::path file(path);
    const bool isThere =
        fs::equivalent(file.parent_path().empty() ? "." : file.parent_path(), folder, ignored);
    if (isThere && !entry.isRemoved && !entry.older.exists) names.push_back(file.filename());
  }
  return names;
}

std::string StagedFiles::Stage(const std::string& path, bool isNew) {
  const bool isKnown = entries_.contains(path);
  if (!isNew && !isKnown && !platform::IdentifyFile(path).exists) {
    errno = ENOENT;
    return {};
  }
  Entry& entry = EntryOf(path);
  if (isNew) entry.isRemoved = false;
  if (isNew || isKnown || Copy(path, entry.place)) return entry.place;
  const int code = errno;
  std::error_code ignored;
  fs::remove(entry.place, ignored);
  entries_.erase(path);
  errno = code;
  return {};
}

bool StagedFiles::Remove(const std::string& path) {
  std::error_code fault;
  if (!fs::exists(PlaceOf(path), fault)) {
    errno = ENOENT;
    return false;
  }
  Entry& entry = EntryOf(path);
  fs::remove(entry.place, fault);
  entry.isRemoved = true;
  errno = fault.value();
  return !fault;
}

bool StagedFiles::MoveIn(std::string& fault) {
  const platform::FolderLock lock(raster_);
  if (!lock.IsHeld(&fault)) return false;
  platform::FileSwap swap;
  for (const auto& [path, entry] : entries_) {
    if (platform::IdentifyFile(path) != entry.older) {
      fault = path + ": was changed by another program meanwhile";
      return false;
    }
    if (!(entry.isRemoved ? swap.MoveAside(path, &fault)
                          : swap.MoveIn(entry.place, path, &fault))) {
      return false;
    }
  }
  swap.Keep();
  entries_.clear();
  return true;
}

}  // namespace lumo
