#include <filesystem>

#include "foundation/fault.h"
#include "foundation/own_plugin.h"
#include "foundation/thrown.h"
#include "georef/coordsys_log.h"
#include "proj_context.h"
#include "proj_coordsys.h"

// The four functions of the plug-in contract. No exception leaves them.

VEXG_OWN_PLUGIN;

namespace {

using lumo::CoordSysImpl;
using lumo::String;

CoordSysImpl* Create(const std::string& text) {
  try {
    lumo::pe::DefinitionPtr definition = lumo::pe::FindDefinition(text);
    if (definition == nullptr) return nullptr;
    lumo::LogCoordSys(lumo::CoordSysLog::kSystems, "fetched: %s", text.c_str());
    return new lumo::pe::ProjCoordSys(std::move(definition));
  } catch (...) {
    lumo::LogCoordSys(lumo::CoordSysLog::kErrors, "%s", lumo::DescribeException().c_str());
    return nullptr;
  }
}

}  // namespace

extern "C" {

/// Takes the directory with proj.db when it lies there; otherwise PROJ's own directories count.
VEXG_EXPORT void Esri_Pe_Initialize(String& peDirectory, String& /*gdalDirectory*/) {
  const std::string directory = peDirectory.ToUTF8();
  std::error_code fault;
  if (std::filesystem::exists(directory + "/proj.db", fault)) {
    lumo::pe::SetDataDirectory(directory);
  }
}

VEXG_EXPORT CoordSysImpl* Esri_Pe_CreateFromString(const String& text) {
  return Create(text.ToUTF8());
}

VEXG_EXPORT CoordSysImpl* Esri_Pe_CreateFromCode(int code) {
  return Create("EPSG:" + std::to_string(code));
}

/// Deletes a system that nobody uses; 1 when it did.
VEXG_EXPORT int Esri_Pe_Release(CoordSysImpl* impl) {
  lumo::LogCoordSys(lumo::CoordSysLog::kSystems, "deleted");
  delete impl;
  return impl != nullptr ? 1 : 0;
}

}  // extern "C"
