#include "geometry/ring_touches.h"

#include <algorithm>
#include <span>
#include <unordered_map>

namespace lumo {
namespace {

using Vertices = std::vector<std::uint64_t>;  // x in the upper half, y in the lower

// No ring with fewer vertices passes a corner twice.
constexpr std::size_t kLeastTouching = 9;

std::uint64_t Pack(std::uint32_t x, std::uint32_t y) {
  return std::uint64_t{x} << 32 | y;
}

/// The coordinates of a ring, its closing vertex included.
std::span<const std::uint32_t> RingOf(const TracedPolygon& polygon, std::size_t ring) {
  const std::size_t begin = polygon.starts[ring] * std::size_t{2};
  const std::size_t end = ring + 1 < polygon.starts.size()
                              ? polygon.starts[ring + 1] * std::size_t{2}
                              : polygon.coordinates.size();
  return {polygon.coordinates.data() + begin, end - begin};
}

bool TouchesItself(std::span<const std::uint32_t> ring, Vertices& scratch) {
  if (ring.size() / 2 < kLeastTouching) return false;
  scratch.clear();
  for (std::size_t at = 0; at + 2 < ring.size(); at += 2) {
    scratch.push_back(Pack(ring[at], ring[at + 1]));
  }
  std::sort(scratch.begin(), scratch.end());
  return std::adjacent_find(scratch.begin(), scratch.end()) != scratch.end();
}

/// True when a loop runs as outer rings do.
bool RunsAsOuter(std::span<const std::uint64_t> loop) {
  // Modulo 2^64; the true sum fits in 63 bits and a sign for rasters of up to 2^31 by 2^31.
  std::uint64_t sum = 0;
  for (std::size_t i = 0; i < loop.size(); ++i) {
    const std::uint64_t one = loop[i], next = loop[(i + 1) % loop.size()];
    sum += (one >> 32) * (next & 0xFFFFFFFF) - (next >> 32) * (one & 0xFFFFFFFF);
  }
  return static_cast<std::int64_t>(sum) > 0;
}

void AddLoop(std::span<const std::uint64_t> loop, TracedPolygon& to) {
  to.starts.push_back(static_cast<std::uint32_t>(to.coordinates.size() / 2));
  for (std::size_t i = 0; i <= loop.size(); ++i) {
    const std::uint64_t vertex = loop[i % loop.size()];
    to.coordinates.push_back(static_cast<std::uint32_t>(vertex >> 32));
    to.coordinates.push_back(static_cast<std::uint32_t>(vertex));
  }
}

/// Cuts a ring into loops, each of which passes no vertex twice.
std::vector<Vertices> CutIntoLoops(std::span<const std::uint32_t> ring) {
  std::vector<Vertices> loops;
  Vertices open;
  std::unordered_map<std::uint64_t, std::size_t> places;
  for (std::size_t at = 0; at + 2 < ring.size(); at += 2) {
    const std::uint64_t vertex = Pack(ring[at], ring[at + 1]);
    const auto [found, isNew] = places.emplace(vertex, open.size());
    if (isNew) {
      open.push_back(vertex);
      continue;
    }
    const auto begin = open.begin() + static_cast<std::ptrdiff_t>(found->second);
    loops.emplace_back(begin, open.end());
    for (auto gone = begin + 1; gone != open.end(); ++gone) places.erase(*gone);
    open.erase(begin + 1, open.end());
  }
  loops.push_back(std::move(open));
  return loops;
}

}  // namespace

bool SplitAtTouches(const TracedPolygon& polygon, TracedPolygon& to) {
  Vertices scratch;
  std::vector<bool> touches(polygon.starts.size());
  for (std::size_t ring = 0; ring < touches.size(); ++ring) {
    touches[ring] = TouchesItself(RingOf(polygon, ring), scratch);
  }
  if (std::find(touches.begin(), touches.end(), true) == touches.end()) return false;
  to.Clear();
  TracedPolygon inner;
  for (std::size_t ring = 0; ring < touches.size(); ++ring) {
    const std::span<const std::uint32_t> points = RingOf(polygon, ring);
    if (!touches[ring]) {
      scratch.clear();
      for (std::size_t at = 0; at + 2 < points.size(); at += 2) {
        scratch.push_back(Pack(points[at], points[at + 1]));
      }
      AddLoop(scratch, ring == 0 ? to : inner);
      continue;
    }
    for (const Vertices& loop : CutIntoLoops(points)) AddLoop(loop, RunsAsOuter(loop) ? to : inner);
  }
  const auto outerRings = to.starts.size();
  const auto offset = static_cast<std::uint32_t>(to.coordinates.size() / 2);
  for (const std::uint32_t start : inner.starts) to.starts.push_back(start + offset);
  to.coordinates.insert(to.coordinates.end(), inner.coordinates.begin(), inner.coordinates.end());
  to.holes.assign(to.starts.size(), 1);
  std::fill_n(to.holes.begin(), outerRings, 0);
  return true;
}

}  // namespace lumo
