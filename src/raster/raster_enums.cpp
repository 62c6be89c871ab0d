#include "raster/raster_enums.h"

namespace lumo {

std::span<const EnumWord<Interleave>> WordsOf(Interleave) {
  static constexpr EnumWord<Interleave> kWords[] = {{"None", Interleave::None},
                                                    {"BIP", Interleave::BIP},
                                                    {"BIL", Interleave::BIL},
                                                    {"BSQ", Interleave::BSQ}};
  return kWords;
}

std::span<const EnumWord<PyramidType>> WordsOf(PyramidType) {
  static constexpr EnumWord<PyramidType> kWords[] = {{"None", PyramidType::kNone},
                                                     {"ORVA", PyramidType::kOrva},
                                                     {"DRIVER", PyramidType::kDriver},
                                                     {"MANUAL", PyramidType::kManual}};
  return kWords;
}

std::span<const EnumWord<PyramidResamplingMethod>> WordsOf(PyramidResamplingMethod) {
  using enum PyramidResamplingMethod;
  static constexpr EnumWord<PyramidResamplingMethod> kWords[] = {
      {"Unknown", kUnknown}, {"Impl", kImpl},   {"Nearest", kNearest},
      {"Linear", kLinear},   {"Cubic", kCubic}, {"Majority", kMajority}};
  return kWords;
}

std::span<const EnumWord<StatsMode>> WordsOf(StatsMode) {
  static constexpr EnumWord<StatsMode> kWords[] = {{"DoBasic", StatsMode::kBasic},
                                                   {"DoExtended", StatsMode::kExtended}};
  return kWords;
}

std::span<const EnumWord<StatsSource>> WordsOf(StatsSource) {
  using enum StatsSource;
  static constexpr EnumWord<StatsSource> kWords[] = {
      {"Unknown", kUnknown}, {"Native", kNative}, {"Dynamic", kDynamic}, {"ORVA", kOrva}};
  return kWords;
}

std::span<const EnumWord<HistogramSign>> WordsOf(HistogramSign) {
  using enum HistogramSign;
  static constexpr EnumWord<HistogramSign> kWords[] = {
      {"Both", kBoth}, {"Positive", kPositive}, {"Negative", kNegative}};
  return kWords;
}

}  // namespace lumo
