#include "geometry/boundary_tracer.h"

#include <algorithm>
#include <bit>

namespace lumo {
namespace {

// The edges that meet in a node, as bits of its code.
constexpr unsigned kUp = 8;
constexpr unsigned kLeft = 4;
constexpr unsigned kDown = 2;
constexpr unsigned kRight = 1;

// Room for points that a vector keeps for its next use.
constexpr std::size_t kPointsKept = 64;

/// Keeps what is small; gives back what is large.
template <typename T>
void Empty(std::vector<T>& values) {
  if (values.capacity() > kPointsKept) {
    std::vector<T>().swap(values);
  } else {
    values.clear();
  }
}

}  // namespace

BoundaryTracer::BoundaryTracer(std::uint32_t width) : below_(std::size_t{width} + 1) {}

void BoundaryTracer::Vector::AddFront(const Point& point, signed char corner) {
  front.push_back(point);
  first = point;
  frontCorner = corner;
}

void BoundaryTracer::Vector::AddBack(const Point& point, signed char corner) {
  back.push_back(point);
  last = point;
  backCorner = corner;
}

bool BoundaryTracer::Walk(const ColumnBits& up, const ColumnBits& down, const ColumnBits& across,
                          TracedPolygonSink& sink) {
  endings_.clear();
  Arriving from;
  std::int64_t lastNode = -1;  // the last one that was visited
  std::int64_t lastUp = -1;    // the last one before this word with an edge above
  bool isOnEdge = false;       // an edge leads from the last node to the right
  std::uint64_t carry = 0;
  for (std::size_t word = 0; word < up.WordCount(); ++word) {
    const std::uint64_t u = up.Word(word), d = down.Word(word);
    const std::uint64_t r = word < across.WordCount() ? across.Word(word) : 0;
    const std::uint64_t l = r << 1 | carry;
    carry = r >> 63;
    const auto base = static_cast<std::int64_t>(word * 64);
    // All nodes but those without an edge and those that an edge passes straight.
    for (std::uint64_t nodes = (u ^ d) | (l ^ r) | (u & l); nodes != 0; nodes &= nodes - 1) {
      const int bit = std::countr_zero(nodes);
      const std::uint64_t here = std::uint64_t{1} << bit;
      const std::int64_t x = base + bit;
      if (!isOnEdge && x != lastNode + 1) {
        const std::uint64_t before = u & (here - 1);
        const std::int64_t crossed = before != 0 ? base + 63 - std::countl_zero(before) : lastUp;
        if (crossed > lastNode) from.a = below_[static_cast<std::size_t>(crossed)].right;
        from.b = from.a;
      }
      const unsigned code = ((u & here) != 0 ? kUp : 0) | ((l & here) != 0 ? kLeft : 0) |
                            ((d & here) != 0 ? kDown : 0) | ((r & here) != 0 ? kRight : 0);
      from = Visit(static_cast<std::uint32_t>(x), code, from);
      lastNode = x;
      isOnEdge = (code & kRight) != 0;
    }
    if (u != 0) lastUp = base + 63 - std::countl_zero(u);
  }
  ++row_;
  return std::all_of(endings_.begin(), endings_.end(),
                     [&](const Ending& ending) { return Complete(ending, sink); });
}

/// Gives the vectors of a node's quadrants, links those that meet there, and adds its point to
/// those that turn there.
BoundaryTracer::Arriving BoundaryTracer::Visit(std::uint32_t x, unsigned code,
                                               const Arriving& from) {
  const Slot a = from.a, b = from.b;
  const Slot c = below_[x].left, d = below_[x].right;
  const Point here{x, row_};
  switch (code) {
    case kDown | kRight: {
      const Slot around = New(a);
      const Slot inside = New();
      Attach(around, -kTopLeft, here);
      Attach(inside, kTopLeft, here);
      below_[x] = {around, inside};
      return {around, inside};
    }
    case kLeft | kDown:
      Attach(a, -kTopRight, here);
      Attach(b, kTopRight, here);
      below_[x] = {b, a};
      return {a, a};
    case kLeft | kDown | kRight: {
      const Slot inside = New();
      Attach(b, kTopRight, here);
      Attach(inside, kTopLeft, here);
      below_[x] = {b, inside};
      return {a, inside};
    }
    case kUp | kRight:
      Attach(c, -kBottomLeft, here);
      Attach(d, kBottomLeft, here);
      return {d, c};
    case kUp | kDown | kRight: {
      const Slot inside = New();
      Attach(d, kBottomLeft, here);
      Attach(inside, kTopLeft, here);
      below_[x] = {c, inside};
      return {d, inside};
    }
    case kUp | kLeft:
      Link(c, a);
      Link(b, d);
      HangHole(b);
      Attach(a, kBottomRight, here);
      Attach(b, -kBottomRight, here);
      endings_.push_back({x, a, d});
      return {d, b};
    case kUp | kLeft | kRight:
      Link(c, a);
      Attach(a, kBottomRight, here);
      Attach(d, kBottomLeft, here);
      endings_.push_back({x, a, 0});
      return {d, b};
    case kUp | kLeft | kDown:
      Link(c, a);
      Attach(a, kBottomRight, here);
      Attach(b, kTopRight, here);
      endings_.push_back({x, a, 0});
      below_[x] = {b, d};
      return {d, d};
    case kUp | kLeft | kDown | kRight: {
      const Slot inside = New();
      Link(c, a);
      Attach(a, kBottomRight, here);
      Attach(b, kTopRight, here);
      Attach(d, kBottomLeft, here);
      Attach(inside, kTopLeft, here);
      endings_.push_back({x, a, 0});
      below_[x] = {b, inside};
      return {d, inside};
    }
    default:  // an edge that ends: never in a partition
      below_[x] = {};
      return {};
  }
}

BoundaryTracer::Slot BoundaryTracer::New(Slot parent) {
  Slot slot = 0;
  if (free_.empty()) {
    slot = static_cast<Slot>(vectors_.size());
    vectors_.emplace_back();
  } else {
    slot = free_.back();
    free_.pop_back();
  }
  Vector& vector = vectors_[slot];
  vector.id = ++lastId_;
  vector.above = slot;
  vector.parent = parent;
  return slot;
}

void BoundaryTracer::Free(Slot slot) {
  Vector& vector = vectors_[slot];
  vector.id = 0;
  vector.next = 0;
  vector.parent = 0;
  vector.closed = false;
  vector.frontCorner = vector.backCorner = 0;
  Empty(vector.front);
  Empty(vector.back);
  Empty(vector.holes);
  free_.push_back(slot);
}

BoundaryTracer::Slot BoundaryTracer::RootOf(Slot slot) {
  while (vectors_[slot].above != slot) {
    Slot& above = vectors_[slot].above;
    above = vectors_[above].above;
    slot = above;
  }
  return slot;
}

bool BoundaryTracer::IsSmaller(Slot parent, Slot than) const {
  return parent != 0 && (than == 0 || vectors_[parent].id < vectors_[than].id);
}

void BoundaryTracer::Link(Slot from, Slot to) {
  if (vectors_[from].next != 0) return;
  vectors_[from].next = to;
  const Slot one = RootOf(from), other = RootOf(to);
  if (one == other) {
    vectors_[one].closed = true;
    return;
  }
  vectors_[one].above = other;
  if (IsSmaller(vectors_[one].parent, vectors_[other].parent)) {
    vectors_[other].parent = vectors_[one].parent;
  }
}

bool BoundaryTracer::IsClosed(Slot slot) {
  return vectors_[slot].id != 0 && vectors_[RootOf(slot)].closed;
}

void BoundaryTracer::HangHole(Slot slot) {
  if (!IsClosed(slot)) return;
  const Slot parent = vectors_[RootOf(slot)].parent;
  if (parent != 0) vectors_[parent].holes.push_back(slot);
}

/// Adds a point to the end of a vector that it continues, if it continues one.
void BoundaryTracer::Attach(Slot slot, signed char corner, const Point& point) {
  Vector& vector = vectors_[slot];
  if (vector.IsEmpty()) {
    vector.AddBack(point, corner);
    vector.first = point;
    vector.frontCorner = corner;
    return;
  }
  const signed char front = vector.frontCorner, back = vector.backCorner;
  const bool frontInRow = vector.first.y == point.y, frontInColumn = vector.first.x == point.x;
  const bool backInRow = vector.last.y == point.y, backInColumn = vector.last.x == point.x;
  bool atBack = false;
  bool atFront = false;
  switch (corner) {
    case kTopRight:
      atBack = backInRow && (back == kTopLeft || back == -kBottomLeft);
      atFront = frontInColumn && front == -kBottomLeft;
      break;
    case kBottomLeft:
      atBack = backInRow && back == -kTopRight;
      atFront = frontInColumn && (front == kTopLeft || front == -kTopRight);
      break;
    case -kBottomRight:
      atBack = backInRow && (back == kTopLeft || back == -kBottomLeft);
      atFront = frontInColumn && (front == kTopLeft || front == -kTopRight);
      break;
    case kBottomRight:
      atFront = frontInRow && (front == -kTopLeft || front == kBottomLeft);
      atBack = !atFront && backInColumn && (back == -kTopLeft || back == kTopRight);
      break;
    case -kTopRight:
      atFront = frontInRow && (front == -kTopLeft || front == kBottomLeft);
      atBack = !atFront && backInColumn && back == kBottomLeft;
      break;
    case -kBottomLeft:
      atFront = frontInRow && front == kTopRight;
      atBack = !atFront && backInColumn && (back == -kTopLeft || back == kTopRight);
      break;
    default:
      break;
  }
  if (atBack) {
    vector.AddBack(point, corner);
  } else if (atFront) {
    vector.AddFront(point, corner);
  }
}

bool BoundaryTracer::Complete(const Ending& ending, TracedPolygonSink& sink) {
  if (ending.outside != 0 && IsClosed(ending.outside) &&
      vectors_[RootOf(ending.outside)].parent == 0 && !Emit(ending.outside, ending.x, sink)) {
    return false;
  }
  return !IsClosed(ending.inside) || Emit(ending.inside, ending.x - 1, sink);
}

bool BoundaryTracer::Emit(Slot start, std::uint32_t column, TracedPolygonSink& sink) {
  const bool isWanted = sink.Wants(column);
  polygon_.Clear();
  std::vector<Slot> holes;
  pending_.assign(1, {start, false});
  while (!pending_.empty()) {
    const auto [ring, isHole] = pending_.back();
    pending_.pop_back();
    if (isWanted) {
      polygon_.holes.push_back(isHole ? 1 : 0);
      polygon_.starts.push_back(static_cast<std::uint32_t>(polygon_.coordinates.size() / 2));
    }
    TakeRing(ring, isWanted, holes);
    // The first one comes off the stack first.
    std::sort(holes.begin(), holes.end(),
              [&](Slot one, Slot other) { return vectors_[one].id > vectors_[other].id; });
    for (const Slot hole : holes) pending_.emplace_back(hole, true);
  }
  return !isWanted || sink.Take(column, polygon_);
}

/// Takes the vectors of a ring out, adds their points to the polygon where it is wanted, and
/// gathers the holes that hang on them.
void BoundaryTracer::TakeRing(Slot start, bool isWanted, std::vector<Slot>& holes) {
  holes.clear();
  std::vector<std::uint32_t>& out = polygon_.coordinates;
  const std::size_t begin = out.size();
  const auto add = [&](const Point& point) {
    out.push_back(point.x);
    out.push_back(point.y);
  };
  Slot slot = start;
  do {
    const Vector& vector = vectors_[slot];
    if (isWanted) {
      std::for_each(vector.front.rbegin(), vector.front.rend(), add);
      std::for_each(vector.back.begin(), vector.back.end(), add);
    }
    holes.insert(holes.end(), vector.holes.begin(), vector.holes.end());
    const Slot next = vector.next;
    Free(slot);
    slot = next;
  } while (slot != start);
  if (isWanted) add({out[begin], out[begin + 1]});
}

}  // namespace lumo
