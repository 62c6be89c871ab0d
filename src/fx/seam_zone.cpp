#include "fx/seam_zone.h"

#include <algorithm>

namespace lumo {
namespace {

using Cell = StripDrains::Cell;

/// Finds the pixels that are nearer to an edge of a strip than to lower ground.
class ZoneSearch {
 public:
  enum State : std::uint8_t { kOther, kOpen, kNearGround, kInZone };

  ZoneSearch(const std::vector<Cell>& cells, std::uint32_t width)
      : cells_(cells), width_(width), states_(cells.size(), kOther) {}

  /// The states of all pixels.
  const std::vector<std::uint8_t>& Find() {
    std::vector<std::uint32_t> edge;
    const auto lastLine = static_cast<std::uint32_t>(cells_.size() - width_);
    for (std::uint32_t x = 0; x < width_; ++x) {
      if (IsOpen(x) && HasSame(x, StripDrains::kUp)) edge.push_back(x);
      const std::uint32_t below = lastLine + x;
      if (IsOpen(below) && HasSame(below, StripDrains::kDown)) edge.push_back(below);
    }
    Open(edge);
    std::vector<std::uint32_t> ground = TakeNearGround(), next;
    std::erase_if(edge, [this](std::uint32_t pixel) { return states_[pixel] != kOpen; });
    for (const std::uint32_t pixel : edge) states_[pixel] = kInZone;
    while (!ground.empty() || !edge.empty()) {
      GoOn(ground, next, kNearGround);  // of equal distances lower ground counts
      GoOn(edge, next, kInZone);
    }
    return states_;
  }

 private:
  bool IsOpen(std::uint32_t pixel) const {
    return (cells_[pixel] & StripDrains::kWayBits) == StripDrains::kNowhere;
  }
  bool HasSame(std::uint32_t pixel, unsigned direction) const {
    return (cells_[pixel] & StripDrains::SameBit(direction)) != 0;
  }
  template <typename Visit>
  void ForEachSame(std::uint32_t pixel, const Visit& visit) const {
    if (HasSame(pixel, StripDrains::kUp) && pixel >= width_) visit(pixel - width_);
    if (HasSame(pixel, StripDrains::kLeft)) visit(pixel - 1);
    if (HasSame(pixel, StripDrains::kRight)) visit(pixel + 1);
    if (HasSame(pixel, StripDrains::kDown) && pixel + width_ < cells_.size()) {
      visit(pixel + width_);
    }
  }

  /// Finds the pixels of the plateaus at the edges that have no lower neighbour.
  void Open(const std::vector<std::uint32_t>& edge) {
    for (const std::uint32_t start : edge) {
      if (states_[start] != kOther) continue;
      states_[start] = kOpen;
      open_.push_back(start);
      for (std::size_t at = open_.size() - 1; at < open_.size(); ++at) {
        ForEachSame(open_[at], [this](std::uint32_t pixel) {
          if (states_[pixel] != kOther || !IsOpen(pixel)) return;
          states_[pixel] = kOpen;
          open_.push_back(pixel);
        });
      }
    }
  }

  /// Takes those beside pixels that have a lower neighbour.
  std::vector<std::uint32_t> TakeNearGround() {
    std::vector<std::uint32_t> ground;
    for (const std::uint32_t pixel : open_) {
      bool isNear = false;
      ForEachSame(pixel, [&](std::uint32_t other) { isNear = isNear || !IsOpen(other); });
      if (!isNear) continue;
      states_[pixel] = kNearGround;
      ground.push_back(pixel);
    }
    open_ = {};
    return ground;
  }

  void GoOn(std::vector<std::uint32_t>& front, std::vector<std::uint32_t>& next, State state) {
    next.clear();
    for (const std::uint32_t at : front) {
      ForEachSame(at, [&](std::uint32_t pixel) {
        if (states_[pixel] != kOpen) return;
        states_[pixel] = state;
        next.push_back(pixel);
      });
    }
    front.swap(next);
  }

  const std::vector<Cell>& cells_;
  const std::uint32_t width_;
  std::vector<std::uint8_t> states_;
  std::vector<std::uint32_t> open_;
};

/// The wave through the zones of all strips.
class SeamWave {
 public:
  SeamWave(std::vector<SeamStrip>& strips, std::uint32_t width) : strips_(strips), width_(width) {
    std::size_t count = 0;
    zones_.resize(strips.size());
    for (std::size_t i = 0; i < strips.size(); ++i) {
      zones_[i].begin = count;
      count += strips[i].zone.Count();
      Index(strips[i].zone, zones_[i]);
    }
    distances_.assign(count, StripDrains::kFar);
  }

  void Run() {
    GatherSources();
    std::vector<Place> front, next;
    auto source = sources_.cbegin();
    for (std::uint32_t distance = 0; !front.empty() || source != sources_.cend(); ++distance) {
      if (front.empty()) distance = source->distance;
      for (; source != sources_.cend() && source->distance == distance; ++source) {
        Reach(source->place, distance, front);
      }
      next.clear();
      for (const Place& at : front) GoOn(at, distance + 1, next);
      front.swap(next);
    }
    Store();
  }

 private:
  static constexpr std::uint32_t kNone = SeamZone::kNone;

  struct Place {
    std::uint32_t strip;
    std::uint32_t pixel;  // of its zone
  };
  struct Source {
    std::uint32_t distance;
    Place place;
  };
  /// How the pixels of a zone hang together.
  struct Zone {
    std::size_t begin = 0;                   // of its pixels among those of all
    std::vector<std::uint32_t> down;         // by pixel
    std::vector<std::uint32_t> first, last;  // by column: the pixel in that line
  };

  void Index(const SeamZone& zone, Zone& to) const {
    to.down.assign(zone.Count(), kNone);
    for (std::uint32_t pixel = 0; pixel < zone.Count(); ++pixel) {
      if (zone.up[pixel] != kNone) to.down[zone.up[pixel]] = pixel;
    }
    to.first.assign(width_, kNone);
    to.last.assign(width_, kNone);
    for (std::uint32_t i = 0; i < zone.first.size(); ++i) to.first[zone.first[i]] = i;
    const auto behind = static_cast<std::uint32_t>(zone.Count() - zone.last.size());
    for (std::uint32_t i = 0; i < zone.last.size(); ++i) to.last[zone.last[i]] = behind + i;
  }

  /// Lists from where the wave starts: pixels of the zones at edges that their own strip has lower
  /// ground for, and those beside pixels of another strip that are in no zone.
  void GatherSources() {
    const auto add = [this](std::size_t strip, std::uint32_t pixel, std::uint32_t distance) {
      if (pixel == kNone || distance == StripDrains::kFar) return;
      sources_.push_back({distance, {static_cast<std::uint32_t>(strip), pixel}});
    };
    for (std::size_t strip = 0; strip < strips_.size(); ++strip) {
      const SeamStrip& own = strips_[strip];
      for (std::uint32_t x = 0; x < width_; ++x) {
        add(strip, zones_[strip].first[x], own.first[x]);
        add(strip, zones_[strip].last[x], own.last[x]);
        if (strip == 0 || own.isSameAbove[x] == 0) continue;
        const std::uint32_t above = zones_[strip - 1].last[x], below = zones_[strip].first[x];
        const std::uint32_t fromAbove = strips_[strip - 1].last[x], fromBelow = own.first[x];
        if (above == kNone && fromAbove != StripDrains::kFar) add(strip, below, fromAbove + 1);
        if (below == kNone && fromBelow != StripDrains::kFar) add(strip - 1, above, fromBelow + 1);
      }
    }
    std::sort(sources_.begin(), sources_.end(),
              [](const Source& a, const Source& b) { return a.distance < b.distance; });
  }

  void Reach(const Place& place, std::uint32_t distance, std::vector<Place>& front) {
    std::uint32_t& held = distances_[zones_[place.strip].begin + place.pixel];
    if (held != StripDrains::kFar) return;
    held = distance;
    front.push_back(place);
  }

  void GoOn(const Place& at, std::uint32_t distance, std::vector<Place>& front) {
    const SeamStrip& strip = strips_[at.strip];
    const SeamZone& zone = strip.zone;
    const auto go = [&](std::uint32_t to, std::uint32_t pixel) {
      if (pixel != kNone) Reach({to, pixel}, distance, front);
    };
    if (zone.hasLeft[at.pixel] != 0) go(at.strip, at.pixel - 1);
    if (at.pixel + 1 < zone.Count() && zone.hasLeft[at.pixel + 1] != 0) go(at.strip, at.pixel + 1);
    go(at.strip, zone.up[at.pixel]);
    go(at.strip, zones_[at.strip].down[at.pixel]);
    if (at.strip > 0 && at.pixel < zone.first.size()) {
      const std::uint32_t x = zone.first[at.pixel];
      if (strip.isSameAbove[x] != 0) go(at.strip - 1, zones_[at.strip - 1].last[x]);
    }
    const std::size_t behind = zone.Count() - zone.last.size();
    if (at.strip + 1 < strips_.size() && at.pixel >= behind) {
      const std::uint32_t x = zone.last[at.pixel - behind];
      if (strips_[at.strip + 1].isSameAbove[x] != 0)
        go(at.strip + 1, zones_[at.strip + 1].first[x]);
    }
  }

  void Store() {
    for (std::size_t strip = 0; strip < strips_.size(); ++strip) {
      const Zone& zone = zones_[strip];
      for (std::uint32_t x = 0; x < width_; ++x) {
        if (zone.first[x] != kNone)
          strips_[strip].first[x] = distances_[zone.begin + zone.first[x]];
        if (zone.last[x] != kNone) strips_[strip].last[x] = distances_[zone.begin + zone.last[x]];
      }
    }
  }

  std::vector<SeamStrip>& strips_;
  const std::uint32_t width_;
  std::vector<Zone> zones_;
  std::vector<std::uint32_t> distances_;  // by pixel of all zones
  std::vector<Source> sources_;
};

}  // namespace

SeamZone SeamZone::Find(const std::vector<Cell>& cells, std::uint32_t width) {
  SeamZone zone;
  ZoneSearch search(cells, width);
  const std::vector<std::uint8_t>& states = search.Find();
  std::vector<std::uint32_t> above(width, kNone);  // by column
  const std::size_t lastLine = cells.size() - width;
  for (std::size_t pixel = 0; pixel < cells.size(); ++pixel) {
    const auto x = static_cast<std::uint32_t>(pixel % width);
    if (states[pixel] != ZoneSearch::kInZone) {
      above[x] = kNone;
      continue;
    }
    const auto isSame = [&](unsigned direction) {
      return (cells[pixel] & StripDrains::SameBit(direction)) != 0;
    };
    const auto number = static_cast<std::uint32_t>(zone.Count());
    const bool hasLeft =
        x > 0 && isSame(StripDrains::kLeft) && states[pixel - 1] == ZoneSearch::kInZone;
    zone.hasLeft.push_back(hasLeft ? 1 : 0);
    zone.up.push_back(pixel >= width && isSame(StripDrains::kUp) ? above[x] : kNone);
    above[x] = number;
    if (pixel < width) zone.first.push_back(x);
    if (pixel >= lastLine) zone.last.push_back(x);
  }
  return zone;
}

bool SeamZone::IsSound(std::uint32_t width) const {
  const auto areColumns = [&](const std::vector<std::uint32_t>& columns) {
    return columns.size() <= Count() && (columns.empty() || columns.back() < width) &&
           std::is_sorted(columns.begin(), columns.end());
  };
  if (hasLeft.size() != Count() || !areColumns(first) || !areColumns(last)) return false;
  for (std::uint32_t pixel = 0; pixel < Count(); ++pixel) {
    if (up[pixel] != kNone && up[pixel] >= pixel) return false;
  }
  return Count() == 0 || hasLeft.front() == 0;
}

void SettleSeams(std::vector<SeamStrip>& strips, std::uint32_t width) {
  SeamWave(strips, width).Run();
}

}  // namespace lumo
