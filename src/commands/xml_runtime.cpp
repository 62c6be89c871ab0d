#include "commands/xml_runtime.h"

#include <mutex>

#include <xercesc/util/PlatformUtils.hpp>

namespace lumo {
namespace {

// Neither is ever destroyed: a detached thread may still parse while the process ends.
std::shared_mutex& Mutex() {
  static auto& mutex = *new std::shared_mutex;
  return mutex;
}

bool gReady = false;

struct LoadTime {
  LoadTime() {
    const std::unique_lock lock(Mutex());
    xercesc::XMLPlatformUtils::Initialize();
    gReady = true;
  }
  ~LoadTime() {
    const std::unique_lock lock(Mutex());
    gReady = false;
    xercesc::XMLPlatformUtils::Terminate();
  }
};

const LoadTime gLoadTime;

}  // namespace

XMLRuntime::XMLRuntime() : lock_(Mutex()), ready_(gReady) {}

}  // namespace lumo
