#include "proj_context.h"

#include <mutex>
#include <new>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "georef/coordsys_log.h"
#include "platform/memory_shortage.h"

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

/// The context and the transforms of a thread. The transforms go before the context that they
/// belong to.
struct ThreadState {
  ThreadState() : context(proj_context_create()) {
    if (context == nullptr) throw std::bad_alloc();
    proj_context_set_enable_network(context, 0);
    proj_context_use_proj4_init_rules(context, 1);
    proj_log_func(context, nullptr, LogFromProj);
    const std::lock_guard lock(gDirectoryMutex);
    if (gDirectory.empty()) return;
    // The standard places stay in the list behind the directory.
    const PJ_INFO info = proj_info();
    std::vector<const char*> paths{gDirectory.c_str()};
    for (std::size_t i = 0; i < info.path_count; ++i) paths.push_back(info.paths[i]);
    proj_context_set_search_paths(context, static_cast<int>(paths.size()), paths.data());
  }
  ~ThreadState() {
    transforms.clear();
    proj_context_destroy(context);
  }
  ThreadState(const ThreadState&) = delete;
  ThreadState& operator=(const ThreadState&) = delete;

  PJ_CONTEXT* context;
  std::unordered_map<std::string, PjPtr> transforms;
};

ThreadState& State() {
  thread_local ThreadState state;
  return state;
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
  ThreadState& state = State();
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
