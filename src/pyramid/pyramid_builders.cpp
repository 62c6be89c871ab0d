#include "pyramid/pyramid_builders.h"

#include "pyramid/pyramid_builders_impl.h"

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

template class AsyncPyramidBuilder<std::uint8_t>;
template class AsyncPyramidBuilder<std::int8_t>;
template class AsyncPyramidBuilder<std::uint16_t>;
template class AsyncPyramidBuilder<std::int16_t>;
template class AsyncPyramidBuilder<std::uint32_t>;
template class AsyncPyramidBuilder<std::int32_t>;
template class AsyncPyramidBuilder<float>;
template class AsyncPyramidBuilder<double>;
template class AsyncPyramidBuilder<std::uint64_t>;
template class AsyncPyramidBuilder<std::int64_t>;
template class AsyncPyramidBuilder<Complex<float>>;
template class AsyncPyramidBuilder<Complex<double>>;

template class AsyncOrvaPyramidBuilder<std::uint8_t>;
template class AsyncOrvaPyramidBuilder<std::int8_t>;
template class AsyncOrvaPyramidBuilder<std::uint16_t>;
template class AsyncOrvaPyramidBuilder<std::int16_t>;
template class AsyncOrvaPyramidBuilder<std::uint32_t>;
template class AsyncOrvaPyramidBuilder<std::int32_t>;
template class AsyncOrvaPyramidBuilder<float>;
template class AsyncOrvaPyramidBuilder<double>;
template class AsyncOrvaPyramidBuilder<std::uint64_t>;
template class AsyncOrvaPyramidBuilder<std::int64_t>;
template class AsyncOrvaPyramidBuilder<Complex<float>>;
template class AsyncOrvaPyramidBuilder<Complex<double>>;

}  // namespace lumo
