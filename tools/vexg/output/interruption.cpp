#include "output/interruption.h"

#include <chrono>
#include <filesystem>

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "jobs/progress_view.h"
#include "platform/process.h"
#include "platform/shared_memory.h"
#include "platform/temporary_file.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr std::chrono::milliseconds kPatience{60};  // for what ends by itself

}  // namespace

Interruption::Interruption(std::function<void()> abort)
    : abort_(std::move(abort)), watch_([this] { OnInterrupt(); }) {}

Interruption::~Interruption() {
  {
    const std::lock_guard lock(mutex_);
    isOver_ = true;
  }
  wake_.notify_all();
  if (isLast_) platform::IgnoreInterrupts();
}

void Interruption::Watch(const std::string& path, const std::string& shown) {
  const std::lock_guard lock(mutex_);
  places_.push_back({path, shown, platform::IdentifyFile(path)});
}

void Interruption::AddRemains(const std::string& folder) {
  const std::lock_guard lock(mutex_);
  remains_.insert(folder);
}

void Interruption::DropRemains(const std::string& folder) {
  const std::lock_guard lock(mutex_);
  remains_.erase(folder);
}

void Interruption::AddTemporariesOf(const std::string& path) {
  const std::lock_guard lock(mutex_);
  temporaries_.push_back(path);
}

void Interruption::SetDone() {
  const std::lock_guard lock(mutex_);
  isDone_ = true;
}

bool Interruption::IsDone() const {
  const std::lock_guard lock(mutex_);
  return isDone_;
}

void Interruption::SetLast() {
  const std::lock_guard lock(mutex_);
  isLast_ = true;
}

std::string Interruption::Describe(const char* how) const {
  const std::lock_guard lock(mutex_);
  std::vector<std::string> changes;
  for (const Place& place : places_) {
    const platform::FileIdentity now = platform::IdentifyFile(place.path);
    if (now != place.before) {
      changes.push_back(place.shown + (now.exists ? " was written" : " was removed"));
    }
  }
  const std::string end = std::string(how) + (isDone_ ? " too late" : "");
  if (!changes.empty()) return fmt::format("{}; {} before", end, fmt::join(changes, ", "));
  return isDone_ ? end : end + "; nothing was written";
}

void Interruption::OnInterrupt() {
  abort_();
  {
    std::unique_lock lock(mutex_);
    if (wake_.wait_for(lock, kPatience, [this] { return isOver_; })) return;
  }
  const std::lock_guard held(held_);
  {
    const std::lock_guard lock(mutex_);
    if (isOver_) return;
  }
  EndNow();
}

/// Ends the process around whatever its threads are doing. They go on until then, so that a file
/// may appear while others are removed.
void Interruption::EndNow() {
  ProgressView::EndAllShown();
  const std::string line = Describe();
  std::unique_lock lock(mutex_);  // who ends by himself now waits here for the end
  constexpr int kTries = 3;
  for (int i = 0; i < kTries; ++i) {
    std::error_code ignored;
    for (const std::string& folder : remains_) std::filesystem::remove_all(folder, ignored);
  }
  for (const std::string& path : temporaries_) platform::RemoveOwnFiles(path);
  platform::RemoveOwnSharedMemory();
  Say(line);
  if (isDone_) platform::EndProcess(kExitSuccess);
  platform::DropProcess(kExitFailed);
}

}  // namespace lumo::host
