#include "fx/attribute_forms.h"

namespace lumo {

std::span<const EnumWord<RegionParts>> WordsOf(RegionParts) {
  static constexpr EnumWord<RegionParts> kWords[] = {{"Told", RegionParts::kTold},
                                                     {"Together", RegionParts::kTogether}};
  return kWords;
}

}  // namespace lumo
