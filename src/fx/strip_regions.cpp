#include "fx/strip_regions.h"

#include <type_traits>

#include "raster/raster_enums.h"

namespace lumo {
namespace {

constexpr std::size_t kLeastSlots = 256;

std::size_t HashOf(std::uint32_t label) {
  return (label * std::uint64_t{0x9E3779B97F4A7C15}) >> 32;
}

}  // namespace

void StripRegions::Clear() {
  if (slots_.size() > kLeastSlots && labels_.size() < slots_.size() / 16) {
    slots_.resize(slots_.size() / 2);
  }
  slots_.assign(slots_.size(), Slot());
  labels_.clear();
  runs_.clear();
  lineEnds_.clear();
}

void StripRegions::Grow() {
  slots_.assign(slots_.empty() ? kLeastSlots : 2 * slots_.size(), Slot());
  const std::size_t mask = slots_.size() - 1;
  for (std::size_t i = 0; i < labels_.size(); ++i) {
    std::size_t at = HashOf(labels_[i]) & mask;
    while (slots_[at].number != 0) at = (at + 1) & mask;
    slots_[at] = {labels_[i], static_cast<std::uint32_t>(i + 1)};
  }
}

std::uint32_t StripRegions::NumberOf(std::uint32_t label) {
  if (2 * labels_.size() >= slots_.size()) Grow();
  const std::size_t mask = slots_.size() - 1;
  std::size_t at = HashOf(label) & mask;
  for (; slots_[at].number != 0; at = (at + 1) & mask) {
    if (slots_[at].label == label) return slots_[at].number - 1;
  }
  labels_.push_back(label);
  slots_[at] = {label, static_cast<std::uint32_t>(labels_.size())};
  return slots_[at].number - 1;
}

template <typename L>
bool StripRegions::AddLine(const L* labels, const unsigned char* states,
                           const unsigned char* usable, std::size_t width) {
  const std::size_t aboveBegin =
      lineEnds_.size() < 2 ? 0 : lineEnds_[lineEnds_.size() - 2];  // of the line above
  const std::size_t aboveEnd = lineEnds_.empty() ? 0 : lineEnds_.back();
  std::size_t above = aboveBegin;
  const auto counts = [&](std::size_t x) {
    return IsValidState(states[x]) && (usable == nullptr || usable[x] != 0);
  };
  for (std::size_t x = 0; x < width;) {
    if (!counts(x)) {
      ++x;
      continue;
    }
    const L label = labels[x];
    if constexpr (std::is_signed_v<L>) {
      if (label < 0) {
        negative_ = label;
        return false;
      }
    }
    const std::size_t first = x;
    for (++x; x < width && labels[x] == label && counts(x);) ++x;
    // Most runs are of the region above them.
    while (above < aboveEnd && std::size_t{runs_[above].first} + runs_[above].count <= first) {
      ++above;
    }
    const auto natural = static_cast<std::uint32_t>(label);
    const bool isBelow = above < aboveEnd && labels_[runs_[above].region] == natural;
    const std::uint32_t region = isBelow ? runs_[above].region : NumberOf(natural);
    runs_.push_back(
        {static_cast<std::uint32_t>(first), static_cast<std::uint32_t>(x - first), region});
  }
  lineEnds_.push_back(runs_.size());
  return true;
}

template VEXG_EXPORT bool StripRegions::AddLine(const std::int32_t*, const unsigned char*,
                                                const unsigned char*, std::size_t);
template VEXG_EXPORT bool StripRegions::AddLine(const std::uint32_t*, const unsigned char*,
                                                const unsigned char*, std::size_t);

}  // namespace lumo
