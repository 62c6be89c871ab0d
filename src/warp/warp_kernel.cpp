#include "warp/warp_kernel.h"

#include <algorithm>
#include <cmath>
#include <numbers>

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
double WeightAt(WarpKernel kernel, double x) {
  if (x >= RadiusOf(kernel)) return 0;
  if (kernel == WarpKernel::kLinear) return 1 - x;
  if (kernel == WarpKernel::kLanczos) return Lanczos(x);
  return x < 1 ? (1.5 * x - 2.5) * x * x + 1 : ((-0.5 * x + 2.5) * x - 4) * x + 2;
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

/// Takes weights that are nothing off the ends, and makes the sum of the others 1.
void Normalise(KernelWeights& weights, double nothing) {
  std::vector<double>& of = weights.of;
  while (of.size() > 1 && std::abs(of.back()) <= nothing) of.pop_back();
  std::size_t left = 0;
  while (left + 1 < of.size() && std::abs(of[left]) <= nothing) ++left;
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
    const double weight = IsBox(kernel) ? std::min(end, at + 1.0) - std::max(from, double(at))
                                        : WeightAt(kernel, std::abs(at + 0.5 - position) / stretch);
    weights.of.push_back(weight);
  }
  Normalise(weights, IsBox(kernel) ? std::min(kNothing, size / 2) : 0.0);
}

}  // namespace lumo
