#include "tasks/thread_limit.h"

#include <algorithm>

#include <oneapi/tbb/global_control.h>

namespace lumo {

struct ThreadLimit::Impl {
  tbb::global_control control;
};

ThreadLimit::ThreadLimit(unsigned threads)
    : impl_(new Impl{tbb::global_control(tbb::global_control::max_allowed_parallelism,
                                         std::max(threads, 1U))}) {}

ThreadLimit::~ThreadLimit() = default;

unsigned ThreadLimit::GetCurrent() {
  return static_cast<unsigned>(
      tbb::global_control::active_value(tbb::global_control::max_allowed_parallelism));
}

}  // namespace lumo
