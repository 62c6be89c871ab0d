#include "pyramid/pyramid_builders.h"

#include "pyramid/pyramid_builders_body.h"

namespace lumo {

String PyramidBuilder::GetFault() const {
  const std::lock_guard lock(lock_);
  return fault_;
}

void PyramidBuilder::Fail(const char* otherwise) {
  const String fault = TakeFaultOr(otherwise);
  SetErrorState(AsyncErrorExecuteFailed());
  const std::lock_guard lock(lock_);
  fault_ = fault;
}

unsigned ChooseHistogramLevel(unsigned samples, unsigned lines, unsigned levelMin,
                              unsigned levelMax) {
  constexpr int kSmall = 8;  // 2^8 pixels and more
  const auto larger = static_cast<float>(std::max(samples, lines));
  const auto power = static_cast<int>(static_cast<double>(std::log(larger)) / std::log(2.0));
  int level = std::min(power - kSmall, static_cast<int>(levelMax));
  if (level <= 0) return 0;
  level = std::max(level, static_cast<int>(levelMin));
  while (level > 0 && ((samples >> level) == 0 || (lines >> level) == 0)) --level;
  return level < static_cast<int>(levelMin) ? 0 : static_cast<unsigned>(level);
}

VEXG_INSTANCES(TWELVE, AsyncPyramidBuilder);
VEXG_INSTANCES(TWELVE, AsyncOrvaPyramidBuilder);

}  // namespace lumo
