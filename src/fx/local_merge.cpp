#include "fx/local_merge.h"

#include <algorithm>
#include <functional>
#include <numeric>

#include "foundation/fault.h"
#include "platform/system_memory.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

/// Calls `work(i)` for the numbers below `count`, a part of them on each thread.
template <typename Work>
void ForEach(std::size_t count, const Work& work) {
  constexpr unsigned kPart = 1U << 13U;
  const auto parts = static_cast<unsigned>((count + kPart - 1) / kPart);
  ParallelFor(parts, nullptr, [&](unsigned part) {
    const std::size_t end = std::min<std::size_t>(count, std::size_t{part + 1} * kPart);
    for (std::size_t i = std::size_t{part} * kPart; i < end; ++i) {
      work(static_cast<std::uint32_t>(i));
    }
  });
}

std::uint64_t KeyOf(std::uint32_t low, std::uint32_t high) {
  return std::uint64_t{low} << 32U | high;
}

template <typename Container>
std::uint64_t BytesOf(const Container& container) {
  return container.capacity() * sizeof(typename Container::value_type);
}

}  // namespace

void LocalMerge::Begin(std::uint32_t bands, const Rules& rules, LabelForest& forest,
                       Listener* listener) {
  *this = {};
  bands_ = bands;
  rules_ = rules;
  rules_.threshold = std::min(rules.threshold, kMergeCostLimit);
  forest_ = &forest;
  listener_ = listener;
  segments_.resize(std::size_t{rules.rounds} + 1);
  pairs_.resize(std::size_t{rules.rounds} + 1);
}

/// Makes places, a quarter as many again.
void LocalMerge::Grow() {
  constexpr std::size_t kLeast = 1024;
  const std::size_t before = labels_.size(), count = before + std::max(before / 4, kLeast);
  const auto grow = [](auto& container, std::size_t size) {
    container.reserve(size);  // no more than that
    container.resize(size);
  };
  grow(labels_, count);
  grow(pixels_, count);
  grow(means_, count * bands_);
  grow(levels_, count);
  grow(roots_, count);
  grow(chosen_, count);
  grow(waits_, count);
  for (std::size_t slot = count; slot-- > before;) {
    free_.push_back(static_cast<std::uint32_t>(slot));
  }
}

/// Gives a new segment a place.
std::uint32_t LocalMerge::TakeSlot(std::uint32_t label) {
  if (free_.empty()) Grow();
  const std::uint32_t slot = free_.back();
  free_.pop_back();
  labels_[slot] = label;
  levels_[slot] = kGrowing;
  roots_[slot] = slot;
  pixels_[slot] = 0;
  std::fill_n(means_.begin() + static_cast<std::ptrdiff_t>(std::size_t{slot} * bands_), bands_,
              0.0);
  ++live_;
  return slot;
}

/// Gives the basins of a strip their places.
void LocalMerge::Enter(const StripBasins& strip) {
  slots_.assign(strip.basins.size(), kNone);
  for (std::size_t number = 1; number < strip.basins.size(); ++number) {
    const StripBasins::Basin& basin = strip.basins[number];
    if (basin.label == 0) continue;
    if (basin.continues) {
      slots_[number] = open_.at(basin.label);
      continue;
    }
    const std::uint32_t slot = slots_[number] = TakeSlot(basin.label);
    pixels_[slot] = strip.pixels[number];
    std::copy_n(strip.sums.begin() + static_cast<std::ptrdiff_t>(number * bands_), bands_,
                means_.begin() + static_cast<std::ptrdiff_t>(std::size_t{slot} * bands_));
  }
}

/// Ends the growth of a segment.
void LocalMerge::Complete(std::uint32_t slot) {
  double* const means = means_.data() + std::size_t{slot} * bands_;
  for (std::uint32_t band = 0; band < bands_; ++band) means[band] /= pixels_[slot];
  if (listener_ != nullptr) listener_->OnSegment(labels_[slot], SideOf(slot));
  levels_[slot] = 0;
  segments_[0].push_back(slot);
  ++fresh_;
}

/// Takes the pairs of a strip, and completes the segments that end in it.
bool LocalMerge::Leave(const StripBasins& strip) {
  open_.clear();
  for (std::size_t number = 1; number < strip.basins.size(); ++number) {
    if (slots_[number] == kNone) continue;
    if (strip.basins[number].goesOn) {
      open_.emplace(strip.basins[number].label, slots_[number]);
    } else {
      Complete(slots_[number]);
    }
  }
  if (!JoinPairs(strip)) return false;
  mostBytes_ = std::max(mostBytes_, CountBytes());
  return true;
}

/// Takes the pairs of a strip. Those of two growing segments may come again in the next one.
bool LocalMerge::JoinPairs(const StripBasins& strip) {
  for (const LabelPair& found : strip.pairs) {
    std::uint32_t low = slots_[found.low], high = slots_[found.high];
    if (labels_[low] > labels_[high]) std::swap(low, high);
    const Pair pair{low, high, found.length, found_};
    const auto isOpen = [&](std::uint32_t number) {
      return strip.basins[number].continues || strip.basins[number].goesOn;
    };
    if (isOpen(found.low) && isOpen(found.high)) {
      const auto [at, isNew] = openPairs_.try_emplace(KeyOf(labels_[low], labels_[high]), pair);
      if (!isNew) {
        at->second.length += found.length;
        continue;
      }
    } else {
      pairs_[0].push_back(pair);
    }
    if (found_++ == kNone) {
      SetFault("the raster has more neighbours than pairs have numbers");
      return false;
    }
  }
  std::erase_if(openPairs_, [this](const auto& entry) {
    const Pair& pair = entry.second;
    if (levels_[pair.low] == kGrowing && levels_[pair.high] == kGrowing) return false;
    pairs_[0].push_back(pair);
    return true;
  });
  return true;
}

std::uint64_t LocalMerge::CountBytes() const {
  std::uint64_t bytes = BytesOf(labels_) + BytesOf(pixels_) + BytesOf(means_) + BytesOf(levels_) +
                        BytesOf(roots_) + BytesOf(chosen_) + BytesOf(waits_) + BytesOf(free_) +
                        BytesOf(gone_) + BytesOf(costs_) + BytesOf(renewed_);
  for (const auto& segments : segments_) bytes += BytesOf(segments);
  for (const auto& pairs : pairs_) bytes += BytesOf(pairs);
  constexpr std::uint64_t kNode = 4 * sizeof(void*);  // of a table, beside what it holds
  return bytes + open_.size() * kNode + openPairs_.size() * (kNode + sizeof(Pair)) +
         lost_.size() * (kNode + sizeof(Lost));
}

/// Merges when as many segments have come as pays, or when memory ends. What is left waits for
/// the next strip; so the work on all waiting ones is never more than a part of all.
bool LocalMerge::MergeIfDue(const AbortFlag* abort) {
  const std::size_t batch = std::max(rules_.batch, live_ / 2);
  if (fresh_ < batch && CountBytes() <= rules_.memory / 2) return true;
  if (!Merge(abort)) return false;
  platform::ReturnFreeMemory();  // of the strips that came in between
  const std::uint64_t bytes = CountBytes();
  if (bytes <= rules_.memory) return true;
  SetFault(String("merging in rounds has " + std::to_string(live_) +
                  " segments at once, which take " + std::to_string(bytes) +
                  " bytes of memory, and may take " + std::to_string(rules_.memory) +
                  "; fewer Rounds or a higher SegmentValue make fewer"));
  return false;
}

/// Lets all segments go through as many rounds as they can.
bool LocalMerge::Merge(const AbortFlag* abort) {
  fresh_ = 0;
  for (unsigned round = 0; round < rules_.rounds; ++round) {
    if (abort != nullptr && abort->IsSet()) return true;
    if (segments_[round].empty()) continue;
    FindCosts(round);
    Choose(round);
    const bool isAny = JoinChosen(round);
    if (!isAny && open_.empty() && IsBehind(round)) {
      ForgetAll();  // nothing would happen in the rounds to come
      break;
    }
    Advance(round);
    MovePairs(round);
    pairs_[round].shrink_to_fit();  // few are left, and the next rounds need the memory
    if (isAny && round + 1 < rules_.rounds) RenewPairs(pairs_[round + 1]);
    Free();
    if (!forest_->IsWell()) return false;
  }
  mostBytes_ = std::max(mostBytes_, CountBytes());
  std::sort(free_.begin(), free_.end(), std::greater<>());  // neighbours get places side by side
  return true;
}

/// True when no segment has been through a round.
bool LocalMerge::IsBehind(unsigned round) const {
  return std::all_of(segments_.begin() + round + 1, segments_.end(),
                     [](const std::vector<std::uint32_t>& segments) { return segments.empty(); });
}

/// Ends with all segments as they are.
void LocalMerge::ForgetAll() {
  for (std::vector<std::uint32_t>& segments : segments_) {
    gone_.insert(gone_.end(), segments.begin(), segments.end());
    segments.clear();
  }
  for (std::vector<Pair>& pairs : pairs_) pairs.clear();
  lost_.clear();
  Free();
}

/// Finds what the pairs of a round cost, and which segments wait for others to come to it.
void LocalMerge::FindCosts(unsigned round) {
  const std::vector<Pair>& pairs = pairs_[round];
  const std::vector<std::uint32_t>& segments = segments_[round];
  costs_.resize(pairs.size());
  ForEach(segments.size(), [&](std::uint32_t i) {
    chosen_[segments[i]] = kNone;
    waits_[segments[i]] = 0;
  });
  const auto level = static_cast<std::int32_t>(round);
  ForEach(pairs.size(), [&](std::uint32_t i) {
    const Pair& pair = pairs[i];
    const std::int32_t low = levels_[pair.low], high = levels_[pair.high];
    if (low == high) {
      costs_[i] =
          MergeCost(SideOf(pair.low), SideOf(pair.high), bands_, pair.length, rules_.limits);
      return;
    }
    costs_[i] = std::numeric_limits<double>::infinity();
    const std::atomic_ref waits(waits_[low == level ? pair.low : pair.high]);
    waits.store(1, std::memory_order_relaxed);
  });
}

/// True when a pair costs less than another, or as much and was found earlier.
bool LocalMerge::IsBetter(const Pair* pairs, std::uint32_t pair, std::uint32_t other) const {
  return costs_[pair] < costs_[other] ||
         (costs_[pair] == costs_[other] && pairs[pair].index < pairs[other].index);
}

void LocalMerge::Choose(unsigned round) {
  const Pair* const pairs = pairs_[round].data();
  const auto offer = [&](std::uint32_t slot, std::uint32_t pair) {
    const std::atomic_ref chosen(chosen_[slot]);
    std::uint32_t best = chosen.load(std::memory_order_relaxed);
    while (best == kNone || IsBetter(pairs, pair, best)) {
      if (chosen.compare_exchange_weak(best, pair, std::memory_order_relaxed)) return;
    }
  };
  ForEach(pairs_[round].size(), [&](std::uint32_t i) {
    if (!(costs_[i] < rules_.threshold)) return;
    offer(pairs[i].low, i);
    offer(pairs[i].high, i);
  });
  for (const auto& [slot, lost] : lost_) {
    if (lost.level != static_cast<std::int32_t>(round)) continue;
    const std::uint32_t chosen = chosen_[slot];
    if (chosen == kNone) continue;
    const double cost = costs_[chosen];
    if (lost.cost < cost || (lost.cost == cost && lost.index < pairs[chosen].index)) {
      chosen_[slot] = kNone;
    }
  }
}

/// Makes one of the segments that have chosen each other, where neither waits. False where there
/// are none.
bool LocalMerge::JoinChosen(unsigned round) {
  const std::vector<Pair>& pairs = pairs_[round];
  std::atomic<bool> isAny = false;
  ForEach(pairs.size(), [&](std::uint32_t i) {
    if (!(costs_[i] < rules_.threshold)) return;
    const std::uint32_t low = pairs[i].low, high = pairs[i].high;
    if (chosen_[low] != i || chosen_[high] != i) return;
    if (waits_[low] != 0 || waits_[high] != 0) {  // who waits may choose a better one
      waits_[low] = waits_[high] = 1;
      return;
    }
    double* const u = means_.data() + std::size_t{low} * bands_;
    const double* const v = means_.data() + std::size_t{high} * bands_;
    for (std::uint32_t band = 0; band < bands_; ++band) {
      u[band] = JoinedMean(pixels_[low], u[band], pixels_[high], v[band]);
    }
    pixels_[low] += pixels_[high];
    roots_[high] = low;
    isAny.store(true, std::memory_order_relaxed);
  });
  return isAny;
}

/// Takes all segments that don't wait to the next round.
void LocalMerge::Advance(unsigned round) {
  std::vector<std::uint32_t>& segments = segments_[round];
  std::vector<std::uint32_t>& next = segments_[round + 1];
  std::size_t kept = 0;
  for (const std::uint32_t slot : segments) {
    if (roots_[slot] != slot) {
      const std::uint32_t lower = labels_[roots_[slot]], pair = chosen_[slot];
      forest_->Join(labels_[slot], lower);
      if (listener_ != nullptr) {
        listener_->OnJoin({costs_[pair], lower, labels_[slot], pairs_[round][pair].length, round});
      }
    } else if (waits_[slot] != 0) {
      segments[kept++] = slot;
      continue;
    } else if (round + 1 < rules_.rounds) {
      next.push_back(slot);
    }
    levels_[slot] = static_cast<std::int32_t>(round) + 1;
    if (roots_[slot] != slot || round + 1 == rules_.rounds) gone_.push_back(slot);
  }
  segments.resize(kept);
  std::erase_if(lost_,
                [this](const auto& lost) { return levels_[lost.first] != lost.second.level; });
}

/// Remembers the best choice that a segment has lost.
void LocalMerge::Lose(std::uint32_t slot, const Lost& lost) {
  Lost& best = lost_.try_emplace(slot, lost).first->second;
  if (lost.cost < best.cost || (lost.cost == best.cost && lost.index < best.index)) best = lost;
}

/// Takes the pairs of segments that have gone to the next round there; behind the last one they go.
void LocalMerge::MovePairs(unsigned round) {
  std::vector<Pair>& pairs = pairs_[round];
  std::vector<Pair>& next = pairs_[round + 1];
  const auto level = static_cast<std::int32_t>(round);
  std::size_t kept = 0;
  for (std::size_t i = 0; i < pairs.size(); ++i) {
    const Pair& pair = pairs[i];
    const bool lowGoes = levels_[pair.low] > level, highGoes = levels_[pair.high] > level;
    if (!lowGoes && !highGoes) {
      pairs[kept++] = pair;
      continue;
    }
    if (lowGoes != highGoes && costs_[i] < rules_.threshold) {
      Lose(lowGoes ? pair.high : pair.low, {costs_[i], pair.index, level});
    }
    if (round + 1 < rules_.rounds) next.push_back(pair);
  }
  pairs.resize(kept);
}

/// Gives pairs the segments of now, and joins those that have become the same.
void LocalMerge::RenewPairs(std::vector<Pair>& pairs) {
  ForEach(chosen_.size(), [this](std::uint32_t slot) { chosen_[slot] = 0; });
  ForEach(pairs.size(), [&](std::uint32_t i) {
    Pair& pair = pairs[i];
    pair.low = roots_[pair.low];
    pair.high = roots_[pair.high];
    if (labels_[pair.low] > labels_[pair.high]) std::swap(pair.low, pair.high);
    if (pair.low == pair.high) return;
    std::atomic_ref(chosen_[pair.low]).fetch_add(1, std::memory_order_relaxed);
  });
  std::exclusive_scan(chosen_.begin(), chosen_.end(), chosen_.begin(), 0U);
  renewed_.resize(pairs.size());
  ForEach(pairs.size(), [&](std::uint32_t i) {
    const Pair& pair = pairs[i];
    if (pair.low == pair.high) return;
    const std::atomic_ref place(chosen_[pair.low]);
    renewed_[place.fetch_add(1, std::memory_order_relaxed)] = pair;
  });
  // Each place is now where the next segment's begin.
  ForEach(chosen_.size(), [this](std::uint32_t slot) {
    const std::size_t begin = slot == 0 ? 0 : chosen_[slot - 1];
    const auto first = renewed_.begin() + static_cast<std::ptrdiff_t>(begin);
    const auto last = renewed_.begin() + static_cast<std::ptrdiff_t>(chosen_[slot]);
    std::sort(first, last, [](const Pair& x, const Pair& y) {
      return x.high != y.high ? x.high < y.high : x.index < y.index;
    });
    for (auto at = first; at != last;) {  // those that went into another one lose their length
      Pair& kept = *at;
      for (++at; at != last && at->high == kept.high; ++at) {
        kept.length += at->length;
        at->length = 0;
      }
    }
  });
  const std::size_t count = chosen_.empty() ? 0 : chosen_.back();
  pairs.clear();
  for (std::size_t i = 0; i < count; ++i) {
    if (renewed_[i].length != 0) pairs.push_back(renewed_[i]);
  }
}

/// Makes the places of segments that have gone free.
void LocalMerge::Free() {
  live_ -= gone_.size();
  free_.insert(free_.end(), gone_.begin(), gone_.end());
  gone_.clear();
}

}  // namespace lumo
