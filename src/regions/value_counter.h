#pragma once

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>
#include <type_traits>
#include <vector>

namespace lumo {

/// Counts values with their weights, for figures that go by order or frequency.
///
/// Integers stay exact. So do floats while there are at most kMostValues different ones; beyond
/// that they are kept to 13 bits behind the point, within 2^-14 of their size.
///
/// Cost: 16 bytes for each different value, and for some that were added last; integers of up to 16
/// bits are counted in a table once they are many.
/// Threads: one at a time.
///
///     ValueCounter<float> counter;
///     for (const float value : values) counter.Add(value, 1);
///     const std::size_t variety = counter.GetEntries().size();
template <typename T>
class ValueCounter {
 public:
  /// A value and its weight.
  struct Entry {
    T value;
    double weight;
  };
  /// Different values up to which floats stay exact.
  static constexpr std::size_t kMostValues = std::size_t{1} << 18;

  /// Counts a value, which is not NaN, with a weight above 0.
  void Add(T value, double weight) {
    if (!table_.empty()) {
      table_[IndexOf(value)] += weight;
      return;
    }
    added_.push_back({isCoarse_ ? Coarse(value) : value, weight});
    if (added_.size() >= limit_) Merge();
  }

  /// The different values in their order.
  const std::vector<Entry>& GetEntries() {
    if (!table_.empty()) {
      entries_.clear();
      for (std::size_t i = 0; i < table_.size(); ++i) {
        if (table_[i] != 0) entries_.push_back({ValueAt(i), table_[i]});
      }
    } else if (!added_.empty()) {
      Merge();
      return GetEntries();  // which may have made a table of them
    }
    return entries_;
  }

 private:
  static constexpr bool kHasTable = std::is_integral_v<T> && sizeof(T) <= 2;
  static constexpr std::size_t kTableSize = std::size_t{1}
                                            << (8 * std::min<std::size_t>(sizeof(T), 2));

  static std::size_t IndexOf(T value) {
    return static_cast<std::size_t>(static_cast<std::int64_t>(value) -
                                    static_cast<std::int64_t>(std::numeric_limits<T>::lowest()));
  }
  static T ValueAt(std::size_t index) {
    return static_cast<T>(static_cast<std::int64_t>(index) +
                          static_cast<std::int64_t>(std::numeric_limits<T>::lowest()));
  }

  /// The middle of the values that agree in sign, exponent and 13 bits.
  static T Coarse(T value) {
    if constexpr (std::is_floating_point_v<T>) {
      using Bits = std::conditional_t<sizeof(T) == 4, std::uint32_t, std::uint64_t>;
      constexpr int kDropped = std::numeric_limits<T>::digits - 1 - 13;
      const Bits low = (Bits{1} << kDropped) - 1;
      return value == 0 || !std::isfinite(value)
                 ? value
                 : std::bit_cast<T>((std::bit_cast<Bits>(value) & ~low) |
                                    (Bits{1} << (kDropped - 1)));
    } else {
      return value;
    }
  }

  /// Sorts what was added among the entries.
  void Merge() {
    if constexpr (kHasTable) {
      if (added_.size() >= kTableSize / 4) {
        table_.assign(kTableSize, 0);
        for (const auto* list : {&entries_, &added_}) {
          for (const Entry& entry : *list) table_[IndexOf(entry.value)] += entry.weight;
        }
        added_ = {};
        return;
      }
    }
    entries_.insert(entries_.end(), added_.begin(), added_.end());
    added_.clear();
    Join();
    if (std::is_floating_point_v<T> && !isCoarse_ && entries_.size() > kMostValues) {
      isCoarse_ = true;
      for (Entry& entry : entries_) entry.value = Coarse(entry.value);
      Join();
    }
    limit_ = std::max(kFirstLimit, entries_.size());
  }

  /// Makes one entry of those with the same value.
  void Join() {
    std::stable_sort(entries_.begin(), entries_.end(),
                     [](const Entry& a, const Entry& b) { return a.value < b.value; });
    std::size_t end = 0;
    for (const Entry& entry : entries_) {
      if (end != 0 && entries_[end - 1].value == entry.value) {
        entries_[end - 1].weight += entry.weight;
      } else {
        entries_[end++] = entry;
      }
    }
    entries_.resize(end);
  }

  static constexpr std::size_t kFirstLimit = kHasTable ? kTableSize / 4 : 0x10000;

  std::vector<Entry> entries_;  // in order, each value once
  std::vector<Entry> added_;
  std::vector<double> table_;  // by value; empty while there are few
  std::size_t limit_ = kFirstLimit;
  bool isCoarse_ = false;
};

}  // namespace lumo
