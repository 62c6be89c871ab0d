#pragma once

#include <mutex>
#include <shared_mutex>

namespace lumo::host {

/// A lock that many hold at once to read a raster, which may open it by its name, and one alone
/// while a source is opened anew. Who wants to be alone goes before all that come later: a page
/// that asks for tiles without end does not keep a pyramid from being built.
class OpeningGate {
 public:
  std::shared_lock<std::shared_mutex> Enter() {
    const std::lock_guard turn(turn_);
    return std::shared_lock(mutex_);
  }
  std::unique_lock<std::shared_mutex> EnterAlone() {
    const std::lock_guard turn(turn_);
    return std::unique_lock(mutex_);
  }

 private:
  std::mutex turn_;
  std::shared_mutex mutex_;
};

}  // namespace lumo::host
