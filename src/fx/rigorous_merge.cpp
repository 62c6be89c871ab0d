#include "fx/rigorous_merge.h"

#include <algorithm>
#include <numeric>

namespace lumo {
namespace {

/// The groups of labels that are joined: numbered from 1 in the order in which they arise.
class Groups {
 public:
  explicit Groups(std::size_t labels) : ofLabel_(labels), parents_(1) {}

  void Join(std::uint32_t a, std::uint32_t b) {
    std::uint32_t& groupOfA = ofLabel_[a];
    std::uint32_t& groupOfB = ofLabel_[b];
    if (groupOfA == 0 && groupOfB == 0) {
      groupOfA = groupOfB = Count() + 1;
      parents_.push_back(0);
    } else if (groupOfA == 0) {
      groupOfA = groupOfB;
    } else if (groupOfB == 0) {
      groupOfB = groupOfA;
    } else if (groupOfA != groupOfB) {
      const std::uint32_t low = RootOf(std::min(groupOfA, groupOfB));
      const std::uint32_t high = RootOf(std::max(groupOfA, groupOfB));
      if (low != high) parents_[low] = high;
    }
  }

  /// How many groups have arisen, those included that are part of others by now.
  std::uint32_t Count() const { return static_cast<std::uint32_t>(parents_.size() - 1); }

  std::vector<std::uint32_t> NumberLabels() const {
    std::vector<std::uint32_t> numbers(ofLabel_.size());
    if (Count() == 0) {
      std::iota(numbers.begin(), numbers.end(), 0U);
      return numbers;
    }
    std::uint32_t next = Count();
    for (std::size_t label = 0; label < numbers.size(); ++label) {
      numbers[label] = ofLabel_[label] != 0 ? RootOf(ofLabel_[label]) : next++;
    }
    return numbers;
  }

 private:
  std::uint32_t RootOf(std::uint32_t group) const {
    while (parents_[group] != 0) group = parents_[group];
    return group;
  }

  std::vector<std::uint32_t> ofLabel_;
  std::vector<std::uint32_t> parents_;  // by group; 0 for a root
};

}  // namespace

void RigorousMerge::Begin(std::uint32_t labelCount, std::uint32_t bands, Form sums) {
  bands_ = bands;
  sums_ = sums;
  const std::size_t labels = std::size_t{labelCount} + 1;
  counts_.assign(labels, 0);
  toldSums_.assign(sums == Form::kTold ? labels * bands : 0, 0.0F);
  exactSums_.assign(sums == Form::kExact ? labels * bands : 0, 0.0);
}

/// Gives the pixels of a segment; told sums of ones stop where a float holds no next integer.
double RigorousMerge::CountOf(std::uint32_t label) const {
  constexpr std::uint32_t kMostTold = 1U << 24U;
  const std::uint32_t count = counts_[label];
  return sums_ == Form::kTold ? std::min(count, kMostTold) : count;
}

double RigorousMerge::MeanOf(std::uint32_t label, std::uint32_t band) const {
  const double count = CountOf(label);
  if (count == 0) return 0;
  const std::size_t at = std::size_t{label} * bands_ + band;
  if (sums_ == Form::kExact) return exactSums_[at] / count;
  return static_cast<double>(toldSums_[at] / static_cast<float>(count));
}

float RigorousMerge::CostOf(const LabelPair& pair) const {
  double sum = 0;
  for (std::uint32_t band = 0; band < bands_; ++band) {
    const double difference = MeanOf(pair.low, band) - MeanOf(pair.high, band);
    sum += difference * difference;
  }
  const double a = CountOf(pair.low), b = CountOf(pair.high);
  // Of two segments without a pixel that counts it is no number, and not below any threshold.
  return static_cast<float>(b * a / (b + a) * sum / static_cast<double>(pair.length));
}

std::vector<std::uint32_t> RigorousMerge::Join(const std::vector<LabelPair>& pairs,
                                               double threshold) {
  Groups groups(counts_.size());
  if (threshold > 0) {
    // By the lower label, and where it is the same as they came.
    std::vector<std::uint32_t> ends(counts_.size() + 1), order(pairs.size());
    for (const LabelPair& pair : pairs) ++ends[pair.low + 1];
    std::partial_sum(ends.begin(), ends.end(), ends.begin());
    for (std::uint32_t at = 0; at < pairs.size(); ++at) order[ends[pairs[at].low]++] = at;
    for (const std::uint32_t at : order) {
      if (threshold > static_cast<double>(CostOf(pairs[at]))) {
        groups.Join(pairs[at].low, pairs[at].high);
      }
    }
  }
  return groups.NumberLabels();
}

}  // namespace lumo
