#include "mosaic/histogram_match.h"

#include <numeric>

namespace lumo {

std::vector<double> CumulativeDistribution(std::span<const unsigned long long> counts) {
  const auto total = std::accumulate(counts.begin(), counts.end(), 0ULL);
  if (total == 0) return {};
  std::vector<double> cumulative;
  cumulative.reserve(counts.size());
  unsigned long long sum = 0;
  for (const unsigned long long count : counts) {
    sum += count;
    cumulative.push_back(static_cast<double>(sum) / static_cast<double>(total));
  }
  return cumulative;
}

std::vector<double> MatchDistributions(const ReferenceDistribution& reference,
                                       const SceneDistribution& scene) {
  std::vector<double> table(scene.bins);
  const std::vector<double>& of = reference.cumulative;
  if (of.size() < 2 || scene.cumulative.size() != scene.bins) {
    for (std::size_t bin = 0; bin < table.size(); ++bin) {
      table[bin] = scene.low + static_cast<double>(bin) * scene.binSize;
    }
    return table;
  }
  const double step = (reference.high - reference.low) / static_cast<double>(of.size() - 1);
  // Both distributions grow, so each bin goes on from where the one before it has stopped.
  std::size_t at = 1;
  double before = reference.low;  // the value of bin at - 1
  for (std::size_t bin = 0; bin < table.size(); ++bin) {
    const double share = scene.cumulative[bin];
    if (share - of[0] <= 0) {
      table[bin] = reference.low;
      continue;
    }
    for (; at < of.size() && of[at] < share; ++at) before += step;
    if (at == of.size()) break;  // what is above all of the reference stays 0
    const double above = of[at] - share;
    if (above == 0) {
      table[bin] = before + step;
    } else {
      const double below = share - of[at - 1];
      table[bin] = ((1 / above) * (before + step) + (1 / below) * before) / (1 / above + 1 / below);
    }
  }
  return table;
}

}  // namespace lumo
