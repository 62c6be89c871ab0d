#pragma once

#include <shared_mutex>

namespace lumo {

/// Holds the XML library ready for the length of one parse or write. It is made ready when this
/// plug-in is loaded, and ended when that is unloaded; work that comes later is refused.
class XMLRuntime {
 public:
  XMLRuntime();
  /// False once the library was unloaded.
  bool IsReady() const { return ready_; }

 private:
  std::shared_lock<std::shared_mutex> lock_;
  bool ready_;
};

}  // namespace lumo
