#include "fx/seam_ways.h"

#include <algorithm>
#include <utility>

#include "foundation/fault.h"

namespace lumo {
namespace {

constexpr std::int32_t kBeyond = -1;  // a way that leaves the three strips

}  // namespace

SeamWays::SeamWays(SeamLines& lines, std::uint32_t width, std::vector<std::uint8_t>&& isOpen)
    : lines_(lines), width_(width), isOpen_(std::move(isOpen)) {}

bool SeamWays::Follow(const AbortFlag* abort) {
  const auto strips = static_cast<unsigned>(isOpen_.size());
  const auto isAnyOpen = [this] {
    return std::any_of(isOpen_.begin(), isOpen_.end(), [](std::uint8_t open) { return open != 0; });
  };
  for (bool isDownward = true; isAnyOpen(); isDownward = !isDownward) {
    if (isDownward) hasMoved_ = false;
    for (unsigned i = 0; i < strips; ++i) {
      const unsigned strip = isDownward ? i : strips - 1 - i;
      if (isOpen_[strip] == 0) continue;
      if (abort != nullptr && abort->IsSet()) return true;
      if (!FollowStrip(strip)) return false;
    }
    if (!isDownward && !hasMoved_) {  // ways lead downhill, so the file isn't what was written
      SetFault("working file: its lines lead nowhere");
      return false;
    }
  }
  return true;
}

/// Gives the label that a way leads to. @param place  [out] that in own_, or its size.
std::int32_t SeamWays::LabelAt(std::int32_t way, std::size_t& place) const {
  const auto at = static_cast<std::uint32_t>(-1 - way);
  std::int32_t label = at < width_ ? above_[at] : below_[at - width_];
  place = own_.size();
  if (label > 0) return label;
  // It goes on from there: back to this strip, or away from it.
  const auto next = static_cast<std::uint32_t>(-1 - label);
  const bool isBack = at < width_ ? next >= width_ : next < width_;
  if (!isBack) return kBeyond;
  place = at < width_ ? next - width_ : width_ + next;
  return own_[place];
}

/// Finds where the ways end of a pixel of the strip and of those that they lead through.
void SeamWays::FollowFrom(std::size_t start) {
  places_.assign(1, start);
  std::int32_t label = own_[start];
  while (label < 0) {
    std::size_t place = 0;
    label = LabelAt(label, place);
    if (place == own_.size()) break;
    if (ends_[place] != 0) {
      label = ends_[place];
      break;
    }
    places_.push_back(place);
  }
  for (const std::size_t place : places_) ends_[place] = label;
}

bool SeamWays::FollowStrip(unsigned strip) {
  Labels last;
  if (!lines_.Read(strip, SeamLines::kFirstLabels, own_) ||
      !lines_.Read(strip, SeamLines::kLastLabels, last)) {
    return false;
  }
  own_.insert(own_.end(), last.begin(), last.end());
  if (strip > 0 && !lines_.Read(strip - 1, SeamLines::kLastLabels, above_)) return false;
  const bool hasBelow = strip + 1 < isOpen_.size();
  if (hasBelow && !lines_.Read(strip + 1, SeamLines::kFirstLabels, below_)) return false;
  ends_.assign(own_.size(), 0);
  bool isOpen = false, hasMoved = false;
  for (std::size_t i = 0; i < own_.size(); ++i) {
    if (own_[i] < 0 && ends_[i] == 0) FollowFrom(i);
  }
  for (std::size_t i = 0; i < own_.size(); ++i) {
    if (own_[i] >= 0) continue;
    (ends_[i] == kBeyond ? isOpen : hasMoved) = true;
    if (ends_[i] != kBeyond) own_[i] = ends_[i];
  }
  isOpen_[strip] = isOpen ? 1 : 0;
  if (!hasMoved) return true;
  hasMoved_ = true;
  std::copy(own_.begin() + width_, own_.end(), last.begin());
  own_.resize(width_);
  return lines_.Write(strip, SeamLines::kFirstLabels, own_) &&
         lines_.Write(strip, SeamLines::kLastLabels, last);
}

}  // namespace lumo
