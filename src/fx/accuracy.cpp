#include "fx/accuracy.h"

#include <algorithm>
#include <cmath>

namespace lumo {

ShareEstimate EstimateShare(std::uint64_t hits, std::uint64_t all) {
  if (all == 0) return {std::nan(""), std::nan(""), std::nan("")};
  constexpr double kZ = 1.959963984540054;  // 95 % of a normal distribution lie within
  const auto n = static_cast<double>(all);
  const double p = static_cast<double>(hits) / n, z2 = kZ * kZ;
  const double middle = (p + z2 / (2 * n)) / (1 + z2 / n);
  const double half = kZ / (1 + z2 / n) * std::sqrt(p * (1 - p) / n + z2 / (4 * n * n));
  return {p, std::max(middle - half, 0.0), std::min(middle + half, 1.0)};
}

Accuracy Accuracy::Of(const std::vector<std::uint64_t>& matrix, std::size_t classes) {
  std::vector<std::uint64_t> known(classes), mapped(classes);
  std::uint64_t all = 0, right = 0;
  for (std::size_t row = 0; row < classes; ++row) {
    for (std::size_t column = 0; column < classes; ++column) {
      const std::uint64_t count = matrix[row * classes + column];
      known[row] += count;
      mapped[column] += count;
      all += count;
      if (row == column) right += count;
    }
  }
  Accuracy accuracy;
  accuracy.overall = EstimateShare(right, all);
  double byChance = 0;
  for (std::size_t i = 0; i < classes; ++i) {
    const std::uint64_t hits = matrix[i * classes + i];
    accuracy.producer.push_back(EstimateShare(hits, known[i]));
    accuracy.user.push_back(EstimateShare(hits, mapped[i]));
    const std::uint64_t both = known[i] + mapped[i];
    accuracy.f1.push_back(both == 0 ? std::nan("")
                                    : 2.0 * static_cast<double>(hits) / static_cast<double>(both));
    byChance += static_cast<double>(known[i]) * static_cast<double>(mapped[i]);
  }
  byChance /= static_cast<double>(all) * static_cast<double>(all);
  accuracy.kappa = all == 0 || byChance == 1 ? std::nan("")
                                             : (accuracy.overall.share - byChance) / (1 - byChance);
  return accuracy;
}

}  // namespace lumo
