#include "regions/scan_rules.h"

namespace lumo {

std::span<const EnumWord<ScanRules>> WordsOf(ScanRules) {
  static constexpr EnumWord<ScanRules> kWords[] = {{"Told", ScanRules::kTold},
                                                   {"Steady", ScanRules::kSteady}};
  return kWords;
}

std::span<const EnumWord<ShapeCoordinates>> WordsOf(ShapeCoordinates) {
  static constexpr EnumWord<ShapeCoordinates> kWords[] = {{"Told", ShapeCoordinates::kTold},
                                                          {"Map", ShapeCoordinates::kMap},
                                                          {"Pixel", ShapeCoordinates::kPixel}};
  return kWords;
}

std::span<const EnumWord<PixelRule>> WordsOf(PixelRule) {
  static constexpr EnumWord<PixelRule> kWords[] = {
      {"Told", PixelRule::kTold}, {"Center", PixelRule::kCenter}, {"Touched", PixelRule::kTouched}};
  return kWords;
}

}  // namespace lumo
