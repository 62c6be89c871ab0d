#include "foundation/own_plugin.h"
#include "memory_factory.h"
#include "pyramid_factory.h"

VEXG_OWN_PLUGIN;

/// The entry point of the plug-in.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  if (record->name == "MemoryRaster") return lumo::MakeMemoryFactory();
  return record->name == "Pyramid" ? lumo::MakePyramidFactory() : nullptr;
}
