#include "warp/reprojection_body.h"

namespace lumo {

std::span<const EnumWord<WarpSampling>> WordsOf(WarpSampling) {
  using enum WarpSampling;
  static constexpr EnumWord<WarpSampling> kWords[] = {
      {"Told", kCorner}, {"Centred", kCentred}, {"Corner", kCorner}};
  return kWords;
}

VEXG_INSTANCES(EIGHT, Reprojection);

}  // namespace lumo
