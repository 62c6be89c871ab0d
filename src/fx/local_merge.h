#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <unordered_map>
#include <vector>

#include "foundation/run_controls.h"
#include "fx/label_forest.h"
#include "fx/merge_cost.h"
#include "fx/strip_basins.h"
#include "platform/huge_pages.h"

namespace lumo {

/// Merges neighbouring segments of a label image in rounds: in each, every segment chooses the
/// neighbour that costs least (MergeCost) and less than a threshold, of equal costs the pair that
/// was found first in the image, and all pairs that have chosen each other become one at once, with
/// costs brought up to date after each round. A pair that two pairs become was found where the
/// first of them was.
///
/// A segment of n rounds depends on its surroundings alone, unlike one of LambdaSchedule, whose
/// merges wait for cheaper ones anywhere. So the image comes strip by strip, and a segment is done
/// with, and forgotten, as soon as its last round is. Each goes through its rounds on its own: a
/// round of it waits until all neighbours have been through those before, and until the choice of
/// the neighbour that it chose is known as well. So nothing is ever guessed or done twice: the
/// result is the same for any height of the strips, any memory, and any number of threads.
///
/// Memory: of segments that wait, and their pairs. They are those some two neighbours for each
///         round away from the end of what has come so far; and those as near to a segment that
///         reaches through the whole image. What has become of the others is in a LabelForest.
/// Cost:   each round looks at all segments and pairs that go through it. All threads work in it.
/// Threads: one at a time. Failure: false, with the fault set.
///
///     merge.Begin(bands, rules, forest);
///     for (...) if (!merge.AddStrip(basins, values, abort)) return false;
///     if (!merge.Finish(abort)) return false;
class VEXG_EXPORT LocalMerge {
 public:
  /// The rounds where nobody says how many.
  static constexpr unsigned kRounds = 12;
  static constexpr std::size_t kBatch = 1U << 18U;

  struct Rules {
    double threshold = 0;
    unsigned rounds = kRounds;
    GrowthLimits limits;
    std::uint64_t memory = 0xFFFFFFFFFFFFFFFF;  ///< bytes that it may take, the forest excluded
    std::size_t batch = kBatch;  ///< segments that come between two merges at least, for speed
  };

  /// Two segments that become one, by their labels, which are the lowest of their basins.
  struct Join {
    double cost = 0;
    std::uint32_t lower = 0;
    std::uint32_t higher = 0;
    std::uint32_t border = 0;  ///< length of the common boundary, in pixel edges
    std::uint32_t round = 0;
  };
  /// Hears what becomes of segments: of all joins of a segment in the order of their rounds.
  class Listener {
   public:
    virtual ~Listener() = default;
    /// A segment is whole, before any join of it. @param means  of its bands.
    virtual void OnSegment(std::uint32_t label, const MergeSide& segment) = 0;
    virtual void OnJoin(const Join& join) = 0;
  };

  /// Forgets everything. @param forest  has all labels, each by itself; it outlives the merge.
  /// @param listener  outlives it as well; null for none.
  void Begin(std::uint32_t bands, const Rules& rules, LabelForest& forest,
             Listener* listener = nullptr);

  /// Adds the next strip, and merges where enough has come.
  /// @param values  of its pixels, band by band for each.
  template <typename T>
  bool AddStrip(const StripBasins& strip, const T* values, const AbortFlag* abort) {
    Enter(strip);
    for (const StripBasins::Run& run : strip.runs) {
      AddRun(slots_[run.basin], run.pixels, values + run.first * bands_);
    }
    return Leave(strip) && MergeIfDue(abort);
  }
  /// Merges the rest, behind all strips.
  bool Finish(const AbortFlag* abort) { return Merge(abort); }

  /// The most bytes that it took at once so far.
  std::uint64_t MostBytes() const { return mostBytes_; }

 private:
  static constexpr std::uint32_t kNone = 0xFFFFFFFF;
  static constexpr std::int32_t kGrowing = -1;  // the level of a segment that strips add to

  /// Two neighbours, by their places; `low` has the lower label.
  struct Pair {
    std::uint32_t low, high;
    std::uint32_t length;
    std::uint32_t index;  // by which it was found
  };
  /// A choice that a segment can't make any more: the neighbour has gone through the round.
  struct Lost {
    double cost;
    std::uint32_t index;
    std::int32_t level;
  };
  template <typename T>
  using Large = std::vector<T, platform::HugePageAllocator<T>>;

  template <typename T>
  void AddRun(std::uint32_t slot, std::uint32_t count, const T* values) {
    pixels_[slot] += count;
    double* const sums = means_.data() + std::size_t{slot} * bands_;
    for (std::uint32_t i = 0; i < count; ++i, values += bands_) {
      for (std::uint32_t band = 0; band < bands_; ++band) {
        sums[band] += static_cast<double>(values[band]);
      }
    }
  }
  MergeSide SideOf(std::uint32_t slot) const {
    return {pixels_[slot], means_.data() + std::size_t{slot} * bands_};
  }
  std::uint32_t TakeSlot(std::uint32_t label);
  void Grow();
  void Enter(const StripBasins& strip);
  bool Leave(const StripBasins& strip);
  void Complete(std::uint32_t slot);
  bool JoinPairs(const StripBasins& strip);
  std::uint64_t CountBytes() const;
  bool MergeIfDue(const AbortFlag* abort);
  bool Merge(const AbortFlag* abort);
  bool IsBehind(unsigned round) const;
  void ForgetAll();
  void FindCosts(unsigned round);
  void Choose(unsigned round);
  bool IsBetter(const Pair* pairs, std::uint32_t pair, std::uint32_t other) const;
  bool JoinChosen(unsigned round);
  void Advance(unsigned round);
  void MovePairs(unsigned round);
  void RenewPairs(std::vector<Pair>& pairs);
  void Lose(std::uint32_t slot, const Lost& lost);
  void Free();

  std::uint32_t bands_ = 0;
  Rules rules_;
  LabelForest* forest_ = nullptr;
  Listener* listener_ = nullptr;
  std::uint64_t mostBytes_ = 0;

  // By place. A place is free again when its segment has gone.
  std::vector<std::uint32_t> labels_;
  Large<double> pixels_, means_;      // of growing ones sums
  std::vector<std::int32_t> levels_;  // the rounds that it has been through
  std::vector<std::uint32_t> roots_;  // the place of the segment that it became part of
  Large<std::uint32_t> chosen_;       // the pair that it chose in its round; also counts of pairs
  std::vector<std::uint8_t> waits_;   // not 0: can't go through its round yet
  std::unordered_map<std::uint32_t, Lost> lost_;  // by place: the best of these
  std::vector<std::uint32_t> free_, gone_;

  // By level, that of the segment of a pair that has been through more rounds.
  std::vector<std::vector<std::uint32_t>> segments_;
  std::vector<std::vector<Pair>> pairs_;
  std::size_t live_ = 0, fresh_ = 0;  // segments, and those that have come since the last merge
  Large<double> costs_;               // by pair of a level
  Large<Pair> renewed_;

  // Between strips.
  std::unordered_map<std::uint32_t, std::uint32_t> open_;  // by label: places of growing segments
  std::unordered_map<std::uint64_t, Pair> openPairs_;      // of two of them, by labels
  std::vector<std::uint32_t> slots_;                       // by number in the strip
  std::uint32_t found_ = 0;                                // pairs
};

}  // namespace lumo
