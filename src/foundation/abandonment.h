#pragma once

#include "platform/export.h"

namespace lumo {

/// While one lives, new sources whose last holder lets go on this thread are given up: their files
/// are removed rather than put in their places. A source's own thread follows the thread that it
/// works for.
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

/// Tells whether a new source that ends on this thread now is given up.
VEXG_EXPORT bool IsAbandoning();

}  // namespace lumo
