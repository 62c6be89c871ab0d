#include "data/vector_records.h"

#include <mutex>

#include "data/format_table.h"
#include "foundation/fault.h"
#include "platform/module.h"

namespace lumo {

void VectorRecord::Clear() {
  id = -1;
  geometry = VectorGeometry::kUnknown;
  coordinates.clear();
  partEnds.clear();
  holes.clear();
  values.clear();
}

VectorRecordFactory* GetVectorRecordFactory() {
  static std::mutex mutex;
  static VectorRecordFactory* factory = nullptr;
  const std::lock_guard lock(mutex);
  if (factory != nullptr) return factory;
  const std::string library = LibraryName(*FindFormat("TIFF")).ToUTF8();
  std::string fault;
  // Loaded for good: objects of the plug-in may live as long as the process.
  static platform::Module module;
  module = LoadPlugin(library, fault);
  auto* const create = module.Find<CreateVectorRecordFactoryFunction>("CreateVectorRecordFactory");
  if (create != nullptr) factory = create();
  if (factory == nullptr) SetFault(fault.empty() ? library + ": has no vector formats" : fault);
  return factory;
}

}  // namespace lumo
