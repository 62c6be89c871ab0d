#include "warp/warp_kernel.h"

#include <algorithm>
#include <cmath>
#include <numbers>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

/// Parts of a pixel that errors of arithmetic may have moved into a footprint, or out of it.
constexpr double kNothing = 1e-6;

/// Half the width of a kernel that isn't stretched.
double RadiusOf(WarpKernel kernel) {
  switch (kernel) {
    case WarpKernel::kLanczos:
      return 3;
    case WarpKernel::kCubic:
      return 2;
    case WarpKernel::kLinear:
      return 1;
    default:
      return 0.5;
  }
}

double StretchOf(double size) {
  return size > WarpFootprint::kLeastStretch ? size : 1.0;
}

bool IsBox(WarpKernel kernel) {
  return RadiusOf(kernel) < 1;
}

double Lanczos(double x) {
  constexpr double kPi = std::numbers::pi;
  if (x < 1e-8) return 1;
  return 3 * std::sin(kPi * x) * std::sin(kPi * x / 3) / (kPi * kPi * x * x);
}

/// The weight at a distance from 0 on.
template <WarpKernel kKernel>
[[gnu::always_inline]] inline double WeightAt(double x) {
  if constexpr (kKernel == WarpKernel::kLinear) {
    return x < 1 ? 1 - x : 0.0;
  } else if constexpr (kKernel == WarpKernel::kCubic) {
    const double near = (1.5 * x - 2.5) * x * x + 1;
    const double far = ((-0.5 * x + 2.5) * x - 4) * x + 2;
    return x < 1 ? near : x < 2 ? far : 0.0;
  } else {
    return x < 3 ? Lanczos(x) : 0.0;
  }
}

double WeightAt(WarpKernel kernel, double x) {
  return kernel == WarpKernel::kLinear  ? WeightAt<WarpKernel::kLinear>(x)
         : kernel == WarpKernel::kCubic ? WeightAt<WarpKernel::kCubic>(x)
                                        : WeightAt<WarpKernel::kLanczos>(x);
}

/// The part of a pixel between two places; 0 for next to nothing. Functions of the library that are
/// not compiled for this set of instructions, as std::min is not, stay calls and end vector code.
[[gnu::always_inline]] inline double Covered(double at, double from, double end, double nothing) {
  const double right = at + 1.0 < end ? at + 1.0 : end, left = from < at ? at : from;
  const double part = right - left;
  return part > nothing ? part : 0.0;
}

/// Below it a part of a pixel isn't covered by a footprint of that size.
double NothingOf(double size) {
  return std::min(kNothing, size / 2);
}

/// The pixels whose centre lies in a range, or else the one at the position.
void WeighCentres(double position, double size, std::int32_t low, std::int32_t high,
                  KernelWeights& weights) {
  const double from = std::ceil(position - size / 2 - 0.5 - kNothing);
  const double end = std::ceil(position + size / 2 - 0.5 - kNothing);
  auto first = static_cast<std::int32_t>(std::clamp<double>(from, low, high));
  auto last = static_cast<std::int32_t>(std::clamp<double>(end - 1, low, high));
  if (end <= from) {
    first = last = static_cast<std::int32_t>(std::clamp<double>(std::floor(position), low, high));
  }
  weights.first = first;
  weights.of.assign(static_cast<std::size_t>(last - first + 1), 1.0 / (last - first + 1));
}

/// Takes the pixels without weight off the ends, and makes the sum of the others 1.
void Normalise(KernelWeights& weights) {
  std::vector<double>& of = weights.of;
  while (of.size() > 1 && of.back() == 0) of.pop_back();
  std::size_t left = 0;
  while (left + 1 < of.size() && of[left] == 0) ++left;
  of.erase(of.begin(), of.begin() + static_cast<std::ptrdiff_t>(left));
  weights.first += static_cast<std::int32_t>(left);
  double sum = 0;
  for (const double weight : of) sum += weight;
  if (!(std::abs(sum) > 0)) {
    std::fill(of.begin(), of.end(), 1.0 / static_cast<double>(of.size()));
    return;
  }
  for (double& weight : of) weight /= sum;
}

/// Makes the sums of weights 1.
[[gnu::always_inline]] inline void Share(unsigned count, NearWeights& weights) {
  double sums[NearWeights::kMostPositions];
  for (unsigned i = 0; i < count; ++i) sums[i] = 0;
  for (unsigned k = 0; k < weights.taps; ++k) {
    for (unsigned i = 0; i < count; ++i) sums[i] += weights.of[k][i];
  }
  for (unsigned k = 0; k < weights.taps; ++k) {
    for (unsigned i = 0; i < count; ++i) weights.of[k][i] /= sums[i];
  }
}

template <WarpKernel kKernel>
[[gnu::always_inline]] inline void WeighNear(const std::int32_t* whole, const double* rest,
                                             unsigned count, double stretch, NearWeights& weights) {
  const double reach = RadiusOf(kKernel) * stretch;
  double positions[NearWeights::kMostPositions];
  for (unsigned i = 0; i < count; ++i) {
    positions[i] = whole[i] + rest[i];
    weights.first[i] = static_cast<std::int32_t>(std::floor(positions[i] - reach - 0.5)) + 1;
  }
  for (unsigned k = 0; k < weights.taps; ++k) {
    for (unsigned i = 0; i < count; ++i) {
      const double centre = weights.first[i] + static_cast<std::int32_t>(k) + 0.5;
      weights.of[k][i] = WeightAt<kKernel>(std::fabs(centre - positions[i]) / stretch);
    }
  }
  Share(count, weights);
}

VEXG_CHOOSING_VECTOR_CLONES
void WeighLinear(const std::int32_t* whole, const double* rest, unsigned count, double stretch,
                 NearWeights& weights) {
  WeighNear<WarpKernel::kLinear>(whole, rest, count, stretch, weights);
}

VEXG_CHOOSING_VECTOR_CLONES
void WeighCubic(const std::int32_t* whole, const double* rest, unsigned count, double stretch,
                NearWeights& weights) {
  WeighNear<WarpKernel::kCubic>(whole, rest, count, stretch, weights);
}

VEXG_CHOOSING_VECTOR_CLONES
void WeighCovered(const std::int32_t* whole, const double* rest, unsigned count, double size,
                  NearWeights& weights) {
  const double nothing = NothingOf(size);
  double positions[NearWeights::kMostPositions];
  for (unsigned i = 0; i < count; ++i) {
    positions[i] = whole[i] + rest[i];
    weights.first[i] = static_cast<std::int32_t>(std::floor(positions[i] - size / 2));
  }
  for (unsigned k = 0; k < weights.taps; ++k) {
    for (unsigned i = 0; i < count; ++i) {
      const double at = weights.first[i] + static_cast<std::int32_t>(k);
      weights.of[k][i] = Covered(at, positions[i] - size / 2, positions[i] + size / 2, nothing);
    }
  }
  Share(count, weights);
}

}  // namespace

std::span<const EnumWord<WarpKernel>> WordsOf(WarpKernel) {
  using enum WarpKernel;
  static constexpr EnumWord<WarpKernel> kWords[] = {
      {"Told", kTold},       {"Nearest", kNearest}, {"Linear", kLinear}, {"Cubic", kCubic},
      {"Lanczos", kLanczos}, {"Average", kAverage}, {"Mode", kMode},     {"Min", kMin},
      {"Max", kMax},         {"Median", kMedian}};
  return kWords;
}

double KernelReach(WarpKernel kernel, double size) {
  return RadiusOf(kernel) * (IsBox(kernel) ? std::max(size, 1.0) : StretchOf(size));
}

void FindKernelWeights(WarpKernel kernel, double position, double size, std::int32_t low,
                       std::int32_t high, KernelWeights& weights) {
  if (kernel == WarpKernel::kMin || kernel == WarpKernel::kMax || kernel == WarpKernel::kMedian) {
    return WeighCentres(position, size, low, high, weights);
  }
  const double stretch = IsBox(kernel) ? size : StretchOf(size);
  const double reach = RadiusOf(kernel) * stretch;
  const double from = position - reach, end = position + reach;
  weights.first = static_cast<std::int32_t>(std::clamp<double>(std::floor(from), low, high));
  const auto last = static_cast<std::int32_t>(std::clamp<double>(std::ceil(end) - 1, low, high));
  weights.of.clear();
  for (std::int32_t at = weights.first; at <= std::max(last, weights.first); ++at) {
    weights.of.push_back(IsBox(kernel) ? Covered(at, from, end, NothingOf(size))
                                       : WeightAt(kernel, std::abs(at + 0.5 - position) / stretch));
  }
  Normalise(weights);
}

double CountTaps(WarpKernel kernel, double size) {
  return IsBox(kernel) ? std::ceil(size) + 1 : std::ceil(2 * RadiusOf(kernel) * StretchOf(size));
}

void FindNearWeights(WarpKernel kernel, const std::int32_t* whole, const double* rest,
                     unsigned count, double size, NearWeights& weights) {
  weights.taps = static_cast<unsigned>(CountTaps(kernel, size));
  switch (kernel) {
    case WarpKernel::kLinear:
      return WeighLinear(whole, rest, count, StretchOf(size), weights);
    case WarpKernel::kCubic:
      return WeighCubic(whole, rest, count, StretchOf(size), weights);
    case WarpKernel::kLanczos:
      return WeighNear<WarpKernel::kLanczos>(whole, rest, count, StretchOf(size), weights);
    default:
      return WeighCovered(whole, rest, count, size, weights);
  }
}

}  // namespace lumo
