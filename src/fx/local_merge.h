#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "foundation/run_controls.h"
#include "fx/label_pairs.h"
#include "fx/merge_cost.h"
#include "platform/huge_pages.h"

namespace lumo {

/// Merges neighbouring segments of a label image in rounds: in each, every segment chooses the
/// neighbour that costs least (MergeCost) and less than a threshold, of equal costs the pair that
/// was found first in the image, and all pairs that have chosen each other become one at once, with
/// costs brought up to date after each round. A pair that two pairs become was found where the
/// first of them was.
///
/// A segment of n rounds depends on its surroundings alone, unlike one of LambdaSchedule, whose
/// merges wait for cheaper ones anywhere. The result is the same for any number of threads.
///
/// Cost: each round looks at all segments and pairs that are left. All threads work in it.
/// Threads: one at a time.
class VEXG_EXPORT LocalMerge {
 public:
  /// The rounds where nobody says how many.
  static constexpr unsigned kRounds = 12;

  /// Forgets everything, and makes room for labels below `labelCount`, of `bands` bands.
  void Begin(std::uint32_t labelCount, std::uint32_t bands);
  /// Limits how segments grow. Behind Begin.
  void Limit(const GrowthLimits& limits) { limits_ = limits; }

  /// Adds a pixel to its segment.
  /// @param label   not 0.
  /// @param values  one for each band.
  template <typename T>
  void AddPixel(std::uint32_t label, const T* values) {
    double* const sums = means_.data() + std::size_t{label} * bands_;
    for (std::uint32_t band = 0; band < bands_; ++band) {
      sums[band] += static_cast<double>(values[band]);
    }
    pixels_[label] += 1;
  }
  /// Makes room for pairs of neighbours.
  void ReservePairs(std::size_t count) { pairs_.reserve(count); }
  /// Adds a pair of neighbours, behind those that were found before. None has the label 0.
  void AddPair(const LabelPair& pair) {
    pairs_.push_back({pair.low, pair.high, pair.length, static_cast<std::uint32_t>(pairs_.size())});
  }
  /// Adds to the common boundary of a pair. @param pair  by the order in which pairs were added.
  void Lengthen(std::size_t pair, std::uint32_t length) { pairs_[pair].length += length; }

  /// Merges, behind all pixels and pairs. @param abort  ends it early; null for none.
  /// @return for each label one that stands for its segment.
  std::vector<std::uint32_t> Join(double threshold, unsigned rounds, const AbortFlag* abort);

  /// The bytes that a segment and a pair of neighbours take.
  static constexpr std::size_t BytesOfSegment(std::uint32_t bands) {
    return sizeof(double) + bands * sizeof(double) + 2 * sizeof(std::uint32_t);
  }
  static constexpr std::size_t BytesOfPair() { return 2 * sizeof(Pair) + sizeof(double); }

 private:
  static constexpr std::uint32_t kNone = 0xFFFFFFFF;

  struct Pair {
    std::uint32_t low, high;
    std::uint32_t length;
    std::uint32_t index;  // by which it was found
  };
  template <typename T>
  using Large = std::vector<T, platform::HugePageAllocator<T>>;

  MergeSide SideOf(std::uint32_t label) const {
    return {pixels_[label], means_.data() + std::size_t{label} * bands_};
  }
  bool IsBetter(std::uint32_t pair, std::uint32_t other) const;
  void Offer(std::uint32_t label, std::uint32_t pair);
  void Choose(double threshold);
  bool MergeChosen();
  void RenewPairs();
  void SumUpCounts();

  std::uint32_t bands_ = 0;
  GrowthLimits limits_;
  Large<double> pixels_, means_;      // by label
  std::vector<std::uint32_t> roots_;  // by label: the segment that it became part of
  Large<std::uint32_t> chosen_;       // by label: the pair that it chose; or a count of its pairs
  Large<Pair> pairs_, renewed_;
  Large<double> costs_;  // by pair
};

}  // namespace lumo
