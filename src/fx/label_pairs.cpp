#include "fx/label_pairs.h"

namespace lumo {
namespace {

constexpr std::size_t kLeastTable = 1024;

std::size_t HashOf(std::uint64_t key) {
  key *= 0x9E3779B97F4A7C15ULL;  // 2^64 over the golden ratio
  return static_cast<std::size_t>(key ^ (key >> 29));
}

}  // namespace

void LabelPairs::Begin(std::size_t labelCount) {
  pairs_.clear();
  pairs_.reserve(3 * labelCount);  // more pairs of areas touch in no plane
  std::size_t size = kLeastTable;
  while (size < labelCount * 6) size *= 2;
  table_.assign(size, 0);
  lastKey_ = 0;
}

std::size_t LabelPairs::PlaceOf(std::uint64_t key) const {
  const std::size_t mask = table_.size() - 1;
  std::size_t at = HashOf(key) & mask;
  while (table_[at] != 0 && KeyOf(pairs_[table_[at] - 1]) != key) at = (at + 1) & mask;
  return at;
}

void LabelPairs::Grow() {
  table_.assign(table_.size() * 2, 0);
  for (std::uint32_t number = 0; number < pairs_.size(); ++number) {
    table_[PlaceOf(KeyOf(pairs_[number]))] = number + 1;
  }
}

std::uint32_t LabelPairs::FindOrAdd(std::uint64_t key) {
  const std::size_t at = PlaceOf(key);
  if (table_[at] != 0) return table_[at] - 1;
  const auto number = static_cast<std::uint32_t>(pairs_.size());
  pairs_.push_back(
      {static_cast<std::uint32_t>(key >> 32), static_cast<std::uint32_t>(key & 0xFFFFFFFF), 0});
  table_[at] = number + 1;
  if (pairs_.size() * 4 > table_.size() * 3) Grow();
  return number;
}

}  // namespace lumo
