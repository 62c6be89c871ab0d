#pragma once

#include "foundation/near_name.h"
#include "foundation/plugin_library.h"
#include "verb.h"

namespace lumo::host {

/// Finds a function of the plug-in that draws, which is loaded by the first call. Throws HostError
/// where it can't be.
template <typename Function>
Function* FindDrawing(const char* name) {
  std::string fault;
  const platform::Module plugin = LoadPlugin(platform::ModuleFileName("vexgdrawing"), fault);
  if (auto* const draw = plugin.Find<Function>(name)) return draw;
  throw HostError(kExitFailed, "text can't be drawn: " + fault);
}

}  // namespace lumo::host
