#include "fx/watershed.h"

#include <algorithm>

namespace lumo {
namespace {

// The drains of a pixel: a neighbour, in the order in which the last one wins, or one of these.
enum Drain : std::uint8_t {
  kUp = 0,
  kLeft = 1,
  kRight = 2,
  kDown = 3,
  kNowhere = 4,  // a plateau without a way down, or one whose way isn't known yet
  kExcluded = 5,
  kNew = 8,  // flag of a drain that was found in this step from lower ground
};

/// The direction from a neighbour back to the pixel.
constexpr std::uint8_t Back(std::uint8_t direction) {
  return static_cast<std::uint8_t>(3 - direction);
}

}  // namespace

template <typename Visit>
void Watershed::ForEachNeighbour(std::uint32_t pixel, Visit&& visit) const {
  const std::uint32_t x = pixel % width_;
  if (pixel >= width_) visit(pixel - width_, kUp);
  if (x > 0) visit(pixel - 1, kLeft);
  if (x + 1 < width_) visit(pixel + 1, kRight);
  if (pixel + width_ < drains_.size()) visit(pixel + width_, kDown);
}

bool Watershed::IsAborted() const {
  return abort_ != nullptr && abort_->IsSet();
}

void Watershed::DrainToLower(const std::int32_t* gradient, const std::uint8_t* excluded) {
  const auto isLower = [&](std::size_t neighbour, std::int32_t than) {
    return gradient[neighbour] < than && (excluded == nullptr || excluded[neighbour] == 0);
  };
  for (std::uint32_t y = 0; y < height_ && !IsAborted(); ++y) {
    for (std::uint32_t x = 0; x < width_; ++x) {
      const std::size_t at = std::size_t{y} * width_ + x;
      const std::int32_t value = gradient[at];
      std::uint8_t drain = kNowhere;
      if (y > 0 && isLower(at - width_, value)) drain = kUp;
      if (x > 0 && isLower(at - 1, value)) drain = kLeft;
      if (x + 1 < width_ && isLower(at + 1, value)) drain = kRight;
      if (y + 1 < height_ && isLower(at + width_, value)) drain = kDown;
      drains_[at] = excluded != nullptr && excluded[at] != 0 ? std::uint8_t{kExcluded} : drain;
    }
  }
}

/// Spreads over plateaus from the pixels that drain, a step at a time.
void Watershed::DrainPlateaus(const std::int32_t* gradient) {
  front_.clear();
  for (std::uint32_t pixel = 0; pixel < drains_.size(); ++pixel) {
    if (drains_[pixel] >= kNowhere) continue;
    bool isAtPlateau = false;
    ForEachNeighbour(pixel, [&](std::uint32_t neighbour, std::uint8_t) {
      isAtPlateau |= drains_[neighbour] == kNowhere && gradient[neighbour] == gradient[pixel];
    });
    if (isAtPlateau) front_.push_back(pixel);
  }
  while (!front_.empty() && !IsAborted()) {
    next_.clear();
    for (const std::uint32_t pixel : front_) {
      ForEachNeighbour(pixel, [&](std::uint32_t neighbour, std::uint8_t direction) {
        std::uint8_t& drain = drains_[neighbour];
        const bool isNew = (drain & kNew) != 0;
        if (!isNew && drain != kNowhere) return;
        if (gradient[neighbour] != gradient[pixel]) return;
        const auto back = static_cast<std::uint8_t>(Back(direction) | kNew);
        if (!isNew) next_.push_back(neighbour);
        drain = isNew ? std::max(drain, back) : back;
      });
    }
    for (const std::uint32_t pixel : next_) drains_[pixel] &= static_cast<std::uint8_t>(~kNew);
    front_.swap(next_);
  }
}

/// Labels the pixels of the minima. @return how many there are.
std::uint32_t Watershed::NumberMinima(const std::int32_t* gradient, std::int32_t* labels) {
  struct Minimum {
    std::int32_t gradient;
    std::uint32_t first;
  };
  std::vector<Minimum> minima;
  for (std::uint32_t pixel = 0; pixel < drains_.size(); ++pixel) {
    if (drains_[pixel] != kNowhere || labels[pixel] != 0) continue;
    minima.push_back({gradient[pixel], pixel});
    labels[pixel] = 1;  // seen
    front_.assign(1, pixel);
    while (!front_.empty()) {
      const std::uint32_t at = front_.back();
      front_.pop_back();
      ForEachNeighbour(at, [&](std::uint32_t neighbour, std::uint8_t) {
        if (drains_[neighbour] != kNowhere || labels[neighbour] != 0) return;
        if (gradient[neighbour] != gradient[at]) return;
        labels[neighbour] = 1;
        front_.push_back(neighbour);
      });
    }
  }
  std::stable_sort(minima.begin(), minima.end(),
                   [](const Minimum& a, const Minimum& b) { return a.gradient < b.gradient; });
  // The pixels of a minimum are one area of pixels that drain nowhere: no other one touches it.
  std::int32_t label = 0;
  for (const Minimum& minimum : minima) {
    ++label;
    labels[minimum.first] = -label;  // numbered
    front_.assign(1, minimum.first);
    while (!front_.empty()) {
      const std::uint32_t at = front_.back();
      front_.pop_back();
      ForEachNeighbour(at, [&](std::uint32_t neighbour, std::uint8_t) {
        if (drains_[neighbour] != kNowhere || labels[neighbour] < 0) return;
        labels[neighbour] = -label;
        front_.push_back(neighbour);
      });
    }
  }
  return static_cast<std::uint32_t>(label);
}

void Watershed::FollowDrains(std::int32_t* labels) {
  const std::ptrdiff_t steps[] = {-static_cast<std::ptrdiff_t>(width_), -1, 1,
                                  static_cast<std::ptrdiff_t>(width_)};
  for (std::size_t pixel = 0; pixel < drains_.size(); ++pixel) {
    if (labels[pixel] < 0) labels[pixel] = -labels[pixel];
    if (labels[pixel] != 0 || drains_[pixel] == kExcluded) continue;
    std::size_t end = pixel;
    while (labels[end] == 0) end += static_cast<std::size_t>(steps[drains_[end]]);
    const std::int32_t label = std::abs(labels[end]);
    for (std::size_t at = pixel; labels[at] == 0;) {
      labels[at] = label;
      at += static_cast<std::size_t>(steps[drains_[at]]);
    }
  }
}

std::uint32_t Watershed::Label(const std::int32_t* gradient, const std::uint8_t* excluded,
                               std::uint32_t width, std::uint32_t height, std::int32_t* labels,
                               const AbortFlag* abort) {
  abort_ = abort;
  width_ = width;
  height_ = height;
  drains_.resize(std::size_t{width} * height);
  std::fill_n(labels, drains_.size(), 0);
  DrainToLower(gradient, excluded);
  DrainPlateaus(gradient);
  if (IsAborted()) return 0;  // not all drains are known
  const std::uint32_t count = NumberMinima(gradient, labels);
  FollowDrains(labels);
  return count;
}

}  // namespace lumo
