#include "fx/local_merge.h"

#include <algorithm>
#include <atomic>
#include <numeric>

#include "tasks/parallel.h"

namespace lumo {
namespace {

/// Calls `work(i)` for the numbers below `count`, a part of them on each thread.
template <typename Work>
void ForEach(std::size_t count, const Work& work) {
  constexpr unsigned kPart = 1U << 14U;
  const auto parts = static_cast<unsigned>((count + kPart - 1) / kPart);
  ParallelFor(parts, nullptr, [&](unsigned part) {
    const std::size_t end = std::min<std::size_t>(count, std::size_t{part + 1} * kPart);
    for (std::size_t i = std::size_t{part} * kPart; i < end; ++i) {
      work(static_cast<std::uint32_t>(i));
    }
  });
}

}  // namespace

void LocalMerge::Begin(std::uint32_t labelCount, std::uint32_t bands) {
  bands_ = bands;
  limits_ = {};
  pixels_.assign(labelCount, 0.0);
  means_.assign(std::size_t{labelCount} * bands, 0.0);
  pairs_.clear();
}

/// True when a pair costs less than another, or as much and was found earlier.
bool LocalMerge::IsBetter(std::uint32_t pair, std::uint32_t other) const {
  return costs_[pair] < costs_[other] ||
         (costs_[pair] == costs_[other] && pairs_[pair].index < pairs_[other].index);
}

/// Has a segment choose a pair, unless it has chosen a better one.
void LocalMerge::Offer(std::uint32_t label, std::uint32_t pair) {
  const std::atomic_ref chosen(chosen_[label]);
  std::uint32_t best = chosen.load(std::memory_order_relaxed);
  while (best == kNone || IsBetter(pair, best)) {
    if (chosen.compare_exchange_weak(best, pair, std::memory_order_relaxed)) return;
  }
}

void LocalMerge::Choose(double threshold) {
  costs_.resize(pairs_.size());
  ForEach(pairs_.size(), [this](std::uint32_t i) {
    const Pair& pair = pairs_[i];
    costs_[i] = MergeCost(SideOf(pair.low), SideOf(pair.high), bands_, pair.length, limits_);
  });
  ForEach(chosen_.size(), [this](std::uint32_t label) { chosen_[label] = kNone; });
  ForEach(pairs_.size(), [this, threshold](std::uint32_t i) {
    if (!(costs_[i] < threshold)) return;
    Offer(pairs_[i].low, i);
    Offer(pairs_[i].high, i);
  });
}

/// Makes one of the segments that have chosen each other. False where there are none.
bool LocalMerge::MergeChosen() {
  std::atomic<bool> isAny = false;
  ForEach(pairs_.size(), [&](std::uint32_t i) {
    const std::uint32_t low = pairs_[i].low, high = pairs_[i].high;
    if (chosen_[low] != i || chosen_[high] != i) return;
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

/// Turns counts by label into where each begins.
void LocalMerge::SumUpCounts() {
  std::exclusive_scan(chosen_.begin(), chosen_.end(), chosen_.begin(), 0U);
}

/// Gives pairs the segments of now, and joins those that have become the same. They come by their
/// lower segment, then by the higher.
void LocalMerge::RenewPairs() {
  ForEach(chosen_.size(), [this](std::uint32_t label) { chosen_[label] = 0; });
  ForEach(pairs_.size(), [this](std::uint32_t i) {
    Pair& pair = pairs_[i];
    const std::uint32_t a = roots_[pair.low], b = roots_[pair.high];
    pair.low = std::min(a, b);
    pair.high = std::max(a, b);
    if (a != b) std::atomic_ref(chosen_[pair.low]).fetch_add(1, std::memory_order_relaxed);
  });
  SumUpCounts();
  renewed_.resize(pairs_.size());
  ForEach(pairs_.size(), [this](std::uint32_t i) {
    const Pair& pair = pairs_[i];
    if (pair.low == pair.high) return;
    const std::atomic_ref place(chosen_[pair.low]);
    renewed_[place.fetch_add(1, std::memory_order_relaxed)] = pair;
  });
  // Each place is now where the next label's begin.
  ForEach(chosen_.size(), [this](std::uint32_t label) {
    const std::size_t begin = label == 0 ? 0 : chosen_[label - 1];
    const std::size_t end = chosen_[label];
    const auto first = renewed_.begin() + static_cast<std::ptrdiff_t>(begin);
    const auto last = renewed_.begin() + static_cast<std::ptrdiff_t>(end);
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
  pairs_.clear();
  for (std::size_t i = 0; i < count; ++i) {
    if (renewed_[i].length != 0) pairs_.push_back(renewed_[i]);
  }
}

std::vector<std::uint32_t> LocalMerge::Join(double threshold, unsigned rounds,
                                            const AbortFlag* abort) {
  ForEach(pixels_.size(), [this](std::uint32_t label) {
    if (pixels_[label] == 0) return;
    double* const means = means_.data() + std::size_t{label} * bands_;
    for (std::uint32_t band = 0; band < bands_; ++band) means[band] /= pixels_[label];
  });
  roots_.resize(pixels_.size());
  std::iota(roots_.begin(), roots_.end(), 0U);
  chosen_.resize(pixels_.size());
  threshold = std::min(threshold, kMergeCostLimit);
  for (unsigned round = 0; round < rounds; ++round) {
    if (abort != nullptr && abort->IsSet()) break;
    Choose(threshold);
    if (!MergeChosen()) break;
    RenewPairs();
  }
  // The lower label stands for both, so what a label leads to is known by then.
  for (std::uint32_t& root : roots_) root = roots_[root];
  return std::move(roots_);
}

}  // namespace lumo
