#include "raster/level_reduction.h"

namespace lumo {
namespace {

constexpr auto kAverageCode = static_cast<PyramidResamplingMethod>(6);
constexpr auto kModeCode = static_cast<PyramidResamplingMethod>(kLastLevelMethod);

}  // namespace

std::span<const EnumWord<LevelReduction>> WordsOf(LevelReduction) {
  static constexpr EnumWord<LevelReduction> kWords[] = {{"Told", LevelReduction::kTold},
                                                        {"Average", LevelReduction::kAverage},
                                                        {"Mode", LevelReduction::kMode}};
  return kWords;
}

std::optional<PyramidResamplingMethod> MethodOf(LevelReduction reduction) {
  if (reduction == LevelReduction::kAverage) return kAverageCode;
  if (reduction == LevelReduction::kMode) return kModeCode;
  return std::nullopt;
}

LevelReduction ReductionOf(PyramidResamplingMethod method) {
  return method == kAverageCode ? LevelReduction::kAverage
         : method == kModeCode  ? LevelReduction::kMode
                                : LevelReduction::kTold;
}

PyramidResamplingMethod ToldMethodOf(PyramidResamplingMethod method) {
  switch (ReductionOf(method)) {
    case LevelReduction::kAverage:
      return PyramidResamplingMethod::kLinear;
    case LevelReduction::kMode:
      return PyramidResamplingMethod::kMajority;
    default:
      return method;
  }
}

}  // namespace lumo
