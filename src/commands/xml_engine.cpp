#include "commands/xml_engine.h"

#include <atomic>

#include "foundation/fault.h"
#include "foundation/plugin_library.h"

namespace lumo {

XmlEngine* GetXmlEngine() {
  static std::atomic<XmlEngine*> ready{nullptr};
  XmlEngine* engine = ready;
  if (engine != nullptr) return engine;
  std::string fault;
  const platform::Module module = LoadPlugin(platform::ModuleFileName("vexxml"), fault);
  auto* const create =
      module.IsLoaded() ? module.Find<CreateXmlEngineFunction>("CreateXmlEngine") : nullptr;
  engine = create != nullptr ? create() : nullptr;
  ready = engine;
  if (engine == nullptr) SetFault(fault.empty() ? "the XML parser is not ready" : fault);
  return engine;
}

}  // namespace lumo
