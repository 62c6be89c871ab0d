#pragma once

#include <cstdint>
#include <memory>
#include <vector>

namespace lumo {

/// Keeps a value for each label, in pages that are made, of zeros, when one of their labels is
/// touched: so labels may lie far apart. Threads: readers may share a table that nobody changes.
template <typename V>
class LabelTable {
 public:
  /// The value of a label, to change.
  V& operator[](std::uint32_t label) {
    const std::size_t page = label >> kPageBits;
    if (page >= pages_.size()) pages_.resize(page + 1);
    if (!pages_[page]) pages_[page] = std::make_unique<V[]>(kPageSize);
    return pages_[page][label & (kPageSize - 1)];
  }

  /// The value of a label; V() for one that was never touched.
  V Get(std::uint32_t label) const {
    const std::size_t page = label >> kPageBits;
    if (page >= pages_.size() || !pages_[page]) return V();
    return pages_[page][label & (kPageSize - 1)];
  }

 private:
  static constexpr unsigned kPageBits = 12;
  static constexpr std::uint32_t kPageSize = 1U << kPageBits;

  std::vector<std::unique_ptr<V[]>> pages_;
};

}  // namespace lumo
