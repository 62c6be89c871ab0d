#include "views/reprojection_impl.h"

namespace lumo {

std::span<const EnumWord<WarpSampling>> WordsOf(WarpSampling) {
  using enum WarpSampling;
  static constexpr EnumWord<WarpSampling> kWords[] = {
      {"Told", kCorner}, {"Centred", kCentred}, {"Corner", kCorner}};
  return kWords;
}

template class Reprojection<std::uint8_t>;
template class Reprojection<std::int8_t>;
template class Reprojection<std::uint16_t>;
template class Reprojection<std::int16_t>;
template class Reprojection<std::uint32_t>;
template class Reprojection<std::int32_t>;
template class Reprojection<float>;
template class Reprojection<double>;

}  // namespace lumo
