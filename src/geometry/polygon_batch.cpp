#include "geometry/polygon_batch.h"

#include <cmath>
#include <limits>

namespace lumo {
namespace {

// Every label of this magnitude or below that is whole fits 64 bits.
constexpr double kWholeLimit = 9.0e18;

/// A label in the writer's type, and whether that holds it.
template <typename L>
L ToLabel(double label, bool& isHeld) {
  if constexpr (std::is_floating_point_v<L>) {
    isHeld = static_cast<double>(static_cast<L>(label)) == label;
    return static_cast<L>(label);
  } else {
    using Limits = std::numeric_limits<L>;
    isHeld = label >= static_cast<double>(Limits::min()) &&
             label <= static_cast<double>(Limits::max()) && std::trunc(label) == label;
    if (std::abs(label) <= kWholeLimit) return static_cast<L>(static_cast<std::int64_t>(label));
    return label < 0 ? Limits::min() : Limits::max();
  }
}

template <typename T>
bool Fill(Deque<T>& to, const auto* from, std::size_t count) {
  to.Clear();
  for (std::size_t i = 0; i < count; ++i) {
    if (!to.PushBack(static_cast<T>(from[i]))) return false;
  }
  return true;
}

}  // namespace

bool PolygonBatch::Take(double label, TracedPolygon& polygon) {
  entries_.push_back({label, polygon.holes.size(), polygon.coordinates.size()});
  all_.holes.insert(all_.holes.end(), polygon.holes.begin(), polygon.holes.end());
  all_.starts.insert(all_.starts.end(), polygon.starts.begin(), polygon.starts.end());
  all_.coordinates.insert(all_.coordinates.end(), polygon.coordinates.begin(),
                          polygon.coordinates.end());
  return true;
}

void PolygonBatch::Clear() {
  entries_.clear();
  all_.Clear();
}

template <typename L>
bool PolygonBatch::WriteAll(PolygonWriter<L, std::uint32_t>& writer, LabelCounts& counts) const {
  auto* const flat = dynamic_cast<FlatPolygonWriter<L, std::uint32_t>*>(&writer);
  const unsigned char* holes = all_.holes.data();
  const std::uint32_t* starts = all_.starts.data();
  const std::uint32_t* coordinates = all_.coordinates.data();
  Deque<bool> holeDeque;
  Deque<unsigned> startDeque;
  Deque<std::uint32_t> coordinateDeque;
  for (const Entry& entry : entries_) {
    bool isHeld = true;
    const L label = ToLabel<L>(entry.label, isHeld);
    if (flat != nullptr) {
      if (!flat->WriteFlat(label, entry.rings, holes, starts, entry.coordinates, coordinates)) {
        return false;
      }
    } else if (!Fill(holeDeque, holes, entry.rings) || !Fill(startDeque, starts, entry.rings) ||
               !Fill(coordinateDeque, coordinates, entry.coordinates) ||
               !writer.Write(label, holeDeque, startDeque, coordinateDeque)) {
      return false;
    }
    holes += entry.rings;
    starts += entry.rings;
    coordinates += entry.coordinates;
    ++counts.polygons;
    if (!isHeld) ++counts.changed;
  }
  return true;
}

template <typename T>
bool PolygonBatch::WriteTo(Object& writer, LabelCounts& counts) const {
  if (auto* const own = dynamic_cast<PolygonWriter<T, std::uint32_t>*>(&writer)) {
    return WriteAll<T>(*own, counts);
  }
  auto* const whole = dynamic_cast<PolygonWriter<std::int32_t, std::uint32_t>*>(&writer);
  return whole != nullptr && WriteAll<std::int32_t>(*whole, counts);
}

#define VEXG_WRITE_TO(T) \
  template VEXG_EXPORT bool PolygonBatch::WriteTo<T>(Object&, LabelCounts&) const;
VEXG_FOR_ALL(EIGHT, VEXG_WRITE_TO);
#undef VEXG_WRITE_TO

}  // namespace lumo
