#pragma once

#include <cstdint>
#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <utility>

namespace lumo {

/// Keeps the things of many scenes that were used last, as many as it has room for; others are made
/// anew when they are needed. Whoever uses one holds it beyond its time here.
///
/// Threads: any number. One thing is made once, however many threads wait for it; others are made
///          at the same time.
///
///     RecentScenes<std::shared_ptr<Table>> tables(64);
///     const std::shared_ptr<Table> table = tables.Get(scene, [&] { return ReadTable(scene); });
template <typename Thing>
class RecentScenes {
 public:
  explicit RecentScenes(std::size_t room) : room_(room) {}

  /// The thing of a scene; `make` makes it. One that is empty is not kept.
  Thing Get(std::uint64_t scene, const std::function<Thing()>& make) {
    std::list<std::shared_ptr<Entry>> dropped;  // let go of without the lock
    const std::shared_ptr<Entry> entry = Find(scene, dropped);
    const std::lock_guard lock(entry->lock);
    if (!entry->thing) entry->thing = make();
    return entry->thing;
  }
  void Clear() {
    std::list<std::shared_ptr<Entry>> dropped;
    const std::lock_guard lock(lock_);
    dropped.swap(entries_);
  }

 private:
  struct Entry {
    explicit Entry(std::uint64_t number) : scene(number) {}
    const std::uint64_t scene;
    std::mutex lock;
    Thing thing{};
  };

  /// The entry of a scene, as the first of all.
  std::shared_ptr<Entry> Find(std::uint64_t scene, std::list<std::shared_ptr<Entry>>& dropped) {
    const std::lock_guard lock(lock_);
    for (auto at = entries_.begin(); at != entries_.end(); ++at) {
      if ((*at)->scene != scene) continue;
      entries_.splice(entries_.begin(), entries_, at);
      return entries_.front();
    }
    entries_.push_front(std::make_shared<Entry>(scene));
    if (entries_.size() > room_) dropped.splice(dropped.begin(), entries_, --entries_.end());
    return entries_.front();
  }

  const std::size_t room_;
  std::mutex lock_;
  std::list<std::shared_ptr<Entry>> entries_;  // used last first
};

}  // namespace lumo
