#include "fx/minimum_numbers.h"

#include <algorithm>
#include <limits>

#include "foundation/fault.h"

namespace lumo {

bool MinimumNumbers::AddStrip(std::uint32_t minima) {
  constexpr std::uint64_t kMost = std::numeric_limits<std::int32_t>::max();
  const std::uint64_t before =
      strips_.empty() ? 0 : std::uint64_t{strips_.back().firstNumber} + strips_.back().minima;
  if (before + minima > kMost) {
    SetFault("the raster has more minima than labels have numbers");
    return false;
  }
  strips_.push_back({minima, static_cast<std::uint32_t>(before)});
  return true;
}

void MinimumNumbers::Connect(const std::vector<Join>& joins) {
  FindParts(joins);
  GiveLabels();
}

/// Finds which parts of minima are one.
void MinimumNumbers::FindParts(const std::vector<Join>& joins) {
  parts_.clear();
  parts_.reserve(2 * joins.size());
  for (const auto& [a, b] : joins) {
    parts_.push_back({a, a});
    parts_.push_back({b, b});
  }
  std::sort(parts_.begin(), parts_.end(),
            [](const Part& a, const Part& b) { return a.number < b.number; });
  const auto isSame = [](const Part& a, const Part& b) { return a.number == b.number; };
  parts_.erase(std::unique(parts_.begin(), parts_.end(), isSame), parts_.end());
  const auto partOf = [this](std::uint32_t number) -> Part& {
    return *std::lower_bound(parts_.begin(), parts_.end(), number,
                             [](const Part& part, std::uint32_t at) { return part.number < at; });
  };
  const auto rootOf = [&](std::uint32_t number) {
    for (Part* part = &partOf(number); part->label != part->number; part = &partOf(part->label)) {
      number = part->label = partOf(part->label).label;
    }
    return number;
  };
  for (const auto& [a, b] : joins) {
    const std::uint32_t one = rootOf(a), other = rootOf(b);
    partOf(std::max(one, other)).label = std::min(one, other);
  }
  for (Part& part : parts_) part.label = rootOf(part.number);
  std::erase_if(parts_, [](const Part& part) { return part.label == part.number; });
  parts_.shrink_to_fit();
}

/// Numbers minima in raster order, those that strips cut where they begin.
void MinimumNumbers::GiveLabels() {
  std::size_t part = 0;
  for (Strip& strip : strips_) {
    strip.firstPart = part;
    strip.firstLabel = strip.firstNumber - static_cast<std::uint32_t>(part);
    while (part < parts_.size() && parts_[part].number < strip.firstNumber + strip.minima) {
      ++part;
    }
  }
  count_ = strips_.back().firstNumber + strips_.back().minima -
           static_cast<std::uint32_t>(parts_.size());
  // A whole is no part, so that the number of parts in front of it is known.
  const auto isBefore = [](const Part& at, std::uint32_t number) { return at.number < number; };
  for (Part& at : parts_) {
    const auto before = std::lower_bound(parts_.begin(), parts_.end(), at.label, isBefore);
    at.label = at.label + 1 - static_cast<std::uint32_t>(before - parts_.begin());
  }
}

MinimumNumbers::Labels MinimumNumbers::LabelsOf(unsigned strip) const {
  const std::uint32_t first = strips_[strip].firstLabel;
  const std::uint32_t end = strip + 1 < strips_.size() ? strips_[strip + 1].firstLabel : count_;
  return {first, end - first};
}

std::uint32_t MinimumNumbers::LabelOf(unsigned strip, std::uint32_t minimum) const {
  const Strip& own = strips_[strip];
  const std::uint32_t number = own.firstNumber + minimum;
  const auto part = std::lower_bound(
      parts_.begin() + static_cast<std::ptrdiff_t>(own.firstPart), parts_.end(), number,
      [](const Part& at, std::uint32_t wanted) { return at.number < wanted; });
  if (part != parts_.end() && part->number == number) return part->label;
  return number + 1 - static_cast<std::uint32_t>(part - parts_.begin());
}

MinimumNumbers::Walk::Walk(const MinimumNumbers& numbers, unsigned strip)
    : numbers_(numbers),
      part_(numbers.strips_[strip].firstPart),
      number_(numbers.strips_[strip].firstNumber),
      label_(numbers.strips_[strip].firstLabel) {}

std::uint32_t MinimumNumbers::Walk::Next() {
  return numbers_.IsPart(part_, number_++) ? numbers_.parts_[part_++].label : ++label_;
}

MinimumNumbers::Ranking::Ranking(const MinimumNumbers& numbers) : numbers_(numbers) {
  keys_.reserve(numbers.Count());
}

void MinimumNumbers::Ranking::Add(std::int32_t level) {
  constexpr std::int64_t kLeast = std::numeric_limits<std::int32_t>::min();
  if (numbers_.IsPart(part_, number_++)) {
    ++part_;
    return;
  }
  const auto height = static_cast<std::uint64_t>(std::int64_t{level} - kLeast);
  keys_.push_back(height << 32U | (keys_.size() + 1));
}

std::vector<std::uint32_t> MinimumNumbers::Ranking::Finish() {
  std::sort(keys_.begin(), keys_.end());
  std::vector<std::uint32_t> ranks(keys_.size() + 1, 0);
  for (std::uint32_t i = 0; i < keys_.size(); ++i) ranks[keys_[i] & 0xFFFFFFFFU] = i + 1;
  return ranks;
}

}  // namespace lumo
