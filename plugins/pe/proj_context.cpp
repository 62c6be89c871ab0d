#include "proj_context.h"

#include <memory>
#include <mutex>
#include <new>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "georef/coordsys_log.h"
#include "platform/memory_shortage.h"
#include "platform/process.h"
#include "platform/system_memory.h"

namespace lumo::pe {
namespace {

constexpr std::size_t kMostTransforms = 128;  // a thread keeps

std::mutex gDirectoryMutex;
std::string gDirectory;

/// PROJ says in words alone that it was short of memory.
void LogFromProj(void*, int, const char* text) {
  const std::string_view words = text;
  if (words.find("bad_alloc") != words.npos || words.find("out of memory") != words.npos) {
    platform::NoteMemoryShortage();
  }
  LogCoordSys(CoordSysLog::kErrors, "%s", text);
}

PJ_CONTEXT* MakeContext() {
  constexpr std::size_t kOfDatabase = 4 << 20;  // what a first coordinate system takes
  platform::GrowHeap(kOfDatabase);
  return proj_context_create();
}

/// A context, and the transforms that belong to it and go before it. One thread has it at a time.
struct ProjState {
  explicit ProjState(const std::string& givenDirectory)
      : directory(givenDirectory), context(MakeContext()) {
    if (context == nullptr) throw std::bad_alloc();
    proj_context_set_enable_network(context, 0);
    proj_context_use_proj4_init_rules(context, 1);
    proj_log_func(context, nullptr, LogFromProj);
    if (directory.empty()) return;
    // The standard places stay in the list behind the directory.
    const PJ_INFO info = proj_info();
    std::vector<const char*> paths{directory.c_str()};
    for (std::size_t i = 0; i < info.path_count; ++i) paths.push_back(info.paths[i]);
    proj_context_set_search_paths(context, static_cast<int>(paths.size()), paths.data());
  }
  ~ProjState() {
    transforms.clear();
    proj_context_destroy(context);
  }
  ProjState(const ProjState&) = delete;
  ProjState& operator=(const ProjState&) = delete;

  const std::string directory;  // of the database
  PJ_CONTEXT* const context;
  std::unordered_map<std::string, PjPtr> transforms;
};

/// The states that no thread has. Each source is opened on a thread of its own, and a new context
/// would read the database, and make the same transforms, each time.
///
/// A process that was forked off begins with none: what its parent's threads held at that moment is
/// left alone. Nobody waits for the lock, which one of them may have held.
class ProjPool {
 public:
  static ProjPool& Get() {
    static auto& pool = *new ProjPool;  // threads may end after all that is static
    return pool;
  }

  std::unique_ptr<ProjState> Take(const std::string& directory) {
    if (const std::unique_lock lock(mutex_, std::try_to_lock); lock.owns_lock()) {
      ForgetParents();
      for (auto at = idle_.rbegin(); at != idle_.rend(); ++at) {
        if ((*at)->directory != directory) continue;
        std::unique_ptr<ProjState> state = std::move(*at);
        idle_.erase(std::next(at).base());
        return state;
      }
    }
    return std::make_unique<ProjState>(directory);
  }

  void GiveBack(std::unique_ptr<ProjState> state) {
    constexpr std::size_t kMostIdle = 16;
    const std::unique_lock lock(mutex_, std::try_to_lock);
    if (!lock.owns_lock()) return;
    ForgetParents();
    if (idle_.size() < kMostIdle) idle_.push_back(std::move(state));
  }

 private:
  void ForgetParents() {
    if (process_ == platform::ProcessNumber()) return;
    process_ = platform::ProcessNumber();
    for (std::unique_ptr<ProjState>& state : idle_) static_cast<void>(state.release());
    idle_.clear();
  }

  std::mutex mutex_;
  int process_ = platform::ProcessNumber();
  std::vector<std::unique_ptr<ProjState>> idle_;  // the latest last
};

std::string DataDirectory() {
  const std::lock_guard lock(gDirectoryMutex);
  return gDirectory;
}

/// The state that a thread has from its first use on until it ends.
struct Borrowed {
  Borrowed() : state(ProjPool::Get().Take(DataDirectory())) {}
  ~Borrowed() { ProjPool::Get().GiveBack(std::move(state)); }
  Borrowed(const Borrowed&) = delete;
  Borrowed& operator=(const Borrowed&) = delete;

  std::unique_ptr<ProjState> state;
};

ProjState& State() {
  thread_local Borrowed borrowed;
  return *borrowed.state;
}

}  // namespace

void SetDataDirectory(const std::string& directory) {
  const std::lock_guard lock(gDirectoryMutex);
  gDirectory = directory;
}

PJ_CONTEXT* ThreadContext() {
  return State().context;
}

PJ* CachedTransform(const std::string& key, const std::function<PjPtr(PJ_CONTEXT*)>& make) {
  ProjState& state = State();
  const auto at = state.transforms.find(key);
  if (at != state.transforms.end()) return at->second.get();
  if (state.transforms.size() >= kMostTransforms) state.transforms.clear();
  const platform::MemoryWatch memory;
  PjPtr made = make(state.context);
  // A transform that memory was too short for is not one that can't be made.
  if (made == nullptr && memory.WasShort()) throw std::bad_alloc();
  return state.transforms.emplace(key, std::move(made)).first->second.get();
}

}  // namespace lumo::pe
