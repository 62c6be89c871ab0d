#include "xml_runtime.h"

#include <mutex>
#include <new>
#include <utility>

#include <xercesc/util/PanicHandler.hpp>
#include <xercesc/util/PlatformUtils.hpp>
#include <xercesc/util/XMLUni.hpp>

#include "platform/memory_shortage.h"

namespace lumo {
namespace {

// Neither is ever destroyed: a detached thread may still parse while the process ends.
std::shared_mutex& Mutex() {
  static auto& mutex = *new std::shared_mutex;
  return mutex;
}

bool gReady = false;

/// Lets the library's loading go on without its parser, where the default would end the process.
class LeavingPanicHandler final : public xercesc::PanicHandler {
 public:
  void panic(const PanicReasons) override { throw std::bad_alloc(); }
};

struct LoadTime {
  LoadTime() {
    static LeavingPanicHandler handler;
    const std::unique_lock lock(Mutex());
    try {
      xercesc::XMLPlatformUtils::Initialize(xercesc::XMLUni::fgXercescDefaultLocale, nullptr,
                                            &handler);
      gReady = true;
    } catch (...) {
      platform::NoteMemoryShortage();  // no document can be parsed then
    }
  }
  ~LoadTime() {
    const std::unique_lock lock(Mutex());
    if (std::exchange(gReady, false)) xercesc::XMLPlatformUtils::Terminate();
  }
};

const LoadTime gLoadTime;

}  // namespace

XMLRuntime::XMLRuntime() : lock_(Mutex()), ready_(gReady) {}

}  // namespace lumo
