#include "foundation/library.h"

#include <cstdlib>
#include <map>
#include <memory>

#include <oneapi/tbb/global_control.h>
#include <oneapi/tbb/info.h>

#include "foundation/text_form.h"
#include "platform/clock.h"

namespace lumo {
namespace {

std::multimap<unsigned, void (*)()>& InitSteps() {
  static std::multimap<unsigned, void (*)()> steps;
  return steps;
}

std::int32_t ReadThreadsHint() {
  const char* const text = std::getenv("LUMO_THREADS_HINT");
  if (text == nullptr) return -1;
  std::istringstream in = MakeTextReader(text);
  std::int32_t hint = 0;
  return ReadNumber(in, hint) && hint >= 1 ? hint : -1;
}

/// The state of the process that the library takes at load and keeps until unload.
struct LoadTime {
  double wallBase = platform::MonotonicSeconds();
  std::int32_t threadsHint = ReadThreadsHint();
  std::unique_ptr<tbb::global_control> scheduler;

  LoadTime() {
    if (threadsHint < 1) return;
    scheduler = std::make_unique<tbb::global_control>(tbb::global_control::max_allowed_parallelism,
                                                      static_cast<std::size_t>(threadsHint));
  }
};

const LoadTime& GetLoadTime() {
  static const LoadTime loadTime;
  return loadTime;
}

// Taken here also when nothing asks: the wall-clock base belongs to the load, not to the first use.
[[maybe_unused]] const LoadTime& gLoadTime = GetLoadTime();

}  // namespace

void VEXInit() {
  for (const auto& [order, run] : InitSteps()) run();
}

const char* GetLibraryVersion() {
  return VEXG_VERSION;
}

std::int32_t GetProcessingCores() {
  return tbb::info::default_concurrency();
}

std::int32_t GetThreadsHint() {
  return GetLoadTime().threadsHint;
}

double WallSeconds() {
  return platform::MonotonicSeconds() - GetLoadTime().wallBase;
}

InitStep::InitStep(unsigned order, void (*run)()) {
  InitSteps().emplace(order, run);
}

}  // namespace lumo
