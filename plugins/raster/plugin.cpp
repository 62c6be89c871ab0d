#include "memory_factory.h"

/// The entry point of the plug-in. There is no factory for the row "Pyramid" yet.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  return record->name == "MemoryRaster" ? lumo::MakeMemoryFactory() : nullptr;
}
