#include "foundation/thread_roll.h"

#include <algorithm>
#include <chrono>
#include <iterator>

#include "platform/per_process.h"

namespace lumo {
namespace {

/// Joins what has left when the library goes: no later thread comes that would.
struct JoinAtEnd {
  ~JoinAtEnd() { ThreadRoll::Get().JoinLeft(); }
};
const JoinAtEnd gJoinAtEnd;

}  // namespace

ThreadRoll& ThreadRoll::Get() {
  static platform::PerProcess<ThreadRoll> roll;
  return roll.Get();
}

/// The kept threads that have left; under the lock.
std::vector<std::thread> ThreadRoll::TakeLeft() {
  std::vector<std::thread> taken;
  for (auto thread = kept_.begin(); thread != kept_.end();) {
    if (left_.erase(thread->get_id()) == 0) {
      ++thread;
      continue;
    }
    taken.push_back(std::move(*thread));
    thread = kept_.erase(thread);
  }
  return taken;
}

void ThreadRoll::Keep(std::thread thread) {
  {
    const std::lock_guard lock(mutex_);
    kept_.push_back(std::move(thread));
    changed_.notify_all();
  }
  JoinLeft();
}

void ThreadRoll::JoinLeft() {
  std::vector<std::thread> left;
  {
    const std::lock_guard lock(mutex_);
    left = TakeLeft();
  }
  for (std::thread& one : left) one.join();
}

bool ThreadRoll::AllStay() const {
  return std::all_of(kept_.begin(), kept_.end(), [this](const std::thread& thread) {
    return staying_.count(thread.get_id()) != 0;
  });
}

void ThreadRoll::Stay() {
  const std::lock_guard lock(mutex_);
  staying_.insert(std::this_thread::get_id());
  changed_.notify_all();
}

void ThreadRoll::Leave() {
  const std::lock_guard lock(mutex_);
  left_.insert(std::this_thread::get_id());
  staying_.erase(std::this_thread::get_id());
  changed_.notify_all();
}

bool ThreadRoll::Join(double seconds) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
  std::unique_lock lock(mutex_);
  while (true) {
    std::vector<std::thread> left = TakeLeft();
    if (left.empty()) {
      if (AllStay()) return true;
      if (changed_.wait_until(lock, deadline) == std::cv_status::timeout) return false;
      continue;
    }
    lock.unlock();
    for (std::thread& one : left) one.join();
    lock.lock();
  }
}

bool JoinThreads(double seconds) {
  return ThreadRoll::Get().Join(seconds);
}

}  // namespace lumo
