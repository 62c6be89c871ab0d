#include "stats/turn.h"

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <set>
#include <thread>

namespace lumo {
namespace {

// The abort flag lies in memory of another process: nothing wakes a sleeper when it goes up.
constexpr std::chrono::milliseconds kLook{20};

struct Turns {
  std::mutex mutex;
  std::condition_variable ended;
  std::set<const BasicRaster*> taken;
};

Turns& AllTurns() {
  static auto& turns = *new Turns;
  return turns;
}

bool AwaitRun(const AsyncPtr& run, const IPC& ipc) {
  while (!run->IsFinished()) {
    if (ipc.abort->IsSet()) return false;
    std::this_thread::sleep_for(kLook);
  }
  return true;
}

}  // namespace

std::span<const EnumWord<Waiting>> WordsOf(Waiting) {
  static constexpr EnumWord<Waiting> kWords[] = {{"Told", Waiting::kTold},
                                                 {"Always", Waiting::kAlways}};
  return kWords;
}

InputDeclaration WaitInput() {
  return {"Wait",
          Presence::kOptional,
          ValueKind::kWord,
          "Told: a computation that another command runs over the raster makes this one fail, or "
          "leaves what it sets without effect; Always: it waits its turn",
          "",
          &WordsIn<Waiting>};
}

Turn::Turn(const BasicRasterPtr& raster, Waiting waiting, const IPC& ipc)
    : raster_(raster), waits_(waiting == Waiting::kAlways), ipc_(ipc) {
  if (!waits_) return;
  Turns& turns = AllTurns();
  {
    std::unique_lock lock(turns.mutex);
    while (turns.taken.contains(raster_.Get())) {
      if (ipc_.abort->IsSet()) return;
      turns.ended.wait_for(lock, kLook);
    }
    turns.taken.insert(raster_.Get());
    has_ = true;
  }
  AwaitRuns();
}

Turn::~Turn() {
  if (!has_) return;
  Turns& turns = AllTurns();
  const std::lock_guard lock(turns.mutex);
  turns.taken.erase(raster_.Get());
  turns.ended.notify_all();
}

bool Turn::AwaitRuns() const {
  if (!waits_) return false;
  while (const AsyncPtr run = raster_->StatsAsync()) {
    if (!AwaitRun(run, ipc_)) return false;
  }
  while (const AsyncPtr run = raster_->HistogramAsync()) {
    if (!AwaitRun(run, ipc_)) return false;
  }
  return !ipc_.abort->IsSet();
}

}  // namespace lumo
