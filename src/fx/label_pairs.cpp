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
  std::size_t size = kLeastTable;
  while (size < labelCount * 8) size *= 2;  // areas have six neighbours at most on the average
  keys_.assign(size, 0);
  numbers_.resize(size);
  lastKey_ = 0;
}

std::size_t LabelPairs::PlaceOf(std::uint64_t key) const {
  const std::size_t mask = keys_.size() - 1;
  std::size_t at = HashOf(key) & mask;
  while (keys_[at] != key && keys_[at] != 0) at = (at + 1) & mask;
  return at;
}

void LabelPairs::Grow() {
  keys_.assign(keys_.size() * 2, 0);
  numbers_.resize(keys_.size());
  for (std::uint32_t number = 0; number < pairs_.size(); ++number) {
    const std::uint64_t key = KeyOf(pairs_[number].low, pairs_[number].high);
    const std::size_t at = PlaceOf(key);
    keys_[at] = key;
    numbers_[at] = number;
  }
}

std::uint32_t LabelPairs::FindOrAdd(std::uint64_t key) {
  const std::size_t at = PlaceOf(key);
  if (keys_[at] == key) return numbers_[at];
  const auto number = static_cast<std::uint32_t>(pairs_.size());
  keys_[at] = key;
  numbers_[at] = number;
  pairs_.push_back(
      {static_cast<std::uint32_t>(key >> 32), static_cast<std::uint32_t>(key & 0xFFFFFFFF), 0});
  if (pairs_.size() * 2 > keys_.size()) Grow();
  return number;
}

}  // namespace lumo
