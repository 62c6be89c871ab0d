#include "tasks/crew.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <deque>
#include <exception>
#include <mutex>
#include <thread>

#include "foundation/library.h"
#include "platform/per_process.h"

namespace lumo {
namespace {

/// A call of RunByCrew; it lives on the caller's stack.
struct Job {
  const std::function<void(unsigned)>& body;
  const unsigned count;
  std::atomic<unsigned> next{0};
  unsigned helpers = 0;  // that are at it
  std::exception_ptr thrown = nullptr;

  bool HasMore() const { return next < count; }
};

/// The helpers of a process.
class Crew {
 public:
  static Crew& Get() {
    static platform::PerProcess<Crew> crew;
    return crew.Get();
  }

  void Run(Job& job) {
    Announce(job);
    Work(job);
    std::unique_lock lock(mutex_);
    std::erase(jobs_, &job);
    done_.wait(lock, [&] { return job.helpers == 0; });
    if (job.thrown) std::rethrow_exception(job.thrown);
  }

 private:
  void Announce(Job& job) {
    const unsigned wanted = std::min(job.count, CrewSize()) - 1;
    unsigned fresh = 0;
    {
      const std::lock_guard lock(mutex_);
      jobs_.push_back(&job);
      const unsigned most = CrewSize() - 1;
      if (idle_ < wanted) fresh = std::min(wanted - idle_, most - std::min(most, threads_));
      threads_ += fresh;
    }
    for (unsigned i = 0; i < wanted; ++i) called_.notify_one();
    for (; fresh > 0; --fresh) {
      try {
        std::thread([this] { Help(); }).detach();
      } catch (...) {
        const std::lock_guard lock(mutex_);  // without that one, then
        threads_ -= fresh;
        return;
      }
    }
  }

  void Work(Job& job) {
    try {
      for (unsigned i = job.next++; i < job.count; i = job.next++) job.body(i);
    } catch (...) {
      const std::lock_guard lock(mutex_);
      if (!job.thrown) job.thrown = std::current_exception();
      job.next = job.count;
    }
  }

  Job* FindJob() {
    const auto found =
        std::find_if(jobs_.begin(), jobs_.end(), [](Job* job) { return job->HasMore(); });
    return found != jobs_.end() ? *found : nullptr;
  }

  /// The life of a helper.
  void Help() {
    constexpr auto kPatience = std::chrono::seconds(5);
    std::unique_lock lock(mutex_);
    for (;;) {
      ++idle_;
      // Found once: others take the last parts of a job meanwhile.
      Job* job = nullptr;
      called_.wait_for(lock, kPatience, [&] { return (job = FindJob()) != nullptr; });
      --idle_;
      if (job == nullptr) break;
      ++job->helpers;
      lock.unlock();
      Work(*job);
      lock.lock();
      if (--job->helpers == 0) done_.notify_all();
    }
    --threads_;
  }

  std::mutex mutex_;
  std::condition_variable called_, done_;
  std::deque<Job*> jobs_;
  unsigned threads_ = 0, idle_ = 0;
};

}  // namespace

unsigned CrewSize() {
  constexpr std::int32_t kMost = 64;
  const std::int32_t hint = GetThreadsHint();
  static const std::int32_t threads = std::clamp(hint > 0 ? hint : GetProcessingCores(), 1, kMost);
  return static_cast<unsigned>(threads);
}

void RunByCrew(unsigned count, const std::function<void(unsigned)>& body) {
  if (count == 0) return;
  if (count == 1 || CrewSize() == 1) {
    for (unsigned i = 0; i < count; ++i) body(i);
    return;
  }
  Job job{body, count};
  Crew::Get().Run(job);
}

}  // namespace lumo
