#pragma once

#include "platform/export.h"

namespace lumo {

/// While one lives, new sources whose last holder lets go on this thread are given up: their files
/// are removed rather than put in their places. A source's own thread follows the thread that it
/// works for. It nests: the innermost one on a thread decides, and the state before it comes back
/// with its end.
///
///     {
///       AbandonScope abandon;       // the copy was interrupted
///       target = RasterPtr<T>();    // the last holder: the unfinished file is removed
///     }
class VEXG_EXPORT AbandonScope {
 public:
  /// @param abandons  false leaves sources their places again.
  explicit AbandonScope(bool abandons = true);
  ~AbandonScope();
  AbandonScope(const AbandonScope&) = delete;
  AbandonScope& operator=(const AbandonScope&) = delete;

 private:
  const bool before_;
};

/// True when a new source that ends on this thread now is given up.
VEXG_EXPORT bool IsAbandoning();

}  // namespace lumo
