#pragma once

#include <functional>
#include <memory>
#include <proj.h>
#include <string>

namespace lumo::pe {

struct PjDeleter {
  void operator()(PJ* object) const { proj_destroy(object); }
};
using PjPtr = std::unique_ptr<PJ, PjDeleter>;

/// Sets a directory in which contexts made from now on look for proj.db and grids first.
void SetDataDirectory(const std::string& directory);

/// The PROJ context of the calling thread, without network access; another thread may have it once
/// this one has ended.
PJ_CONTEXT* ThreadContext();

/// A compiled transform that the thread's context keeps under `key`; made by `make` at first use.
/// Null when it can't be made, which is kept too.
PJ* CachedTransform(const std::string& key, const std::function<PjPtr(PJ_CONTEXT*)>& make);

}  // namespace lumo::pe
