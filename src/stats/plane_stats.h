#pragma once

#include <cmath>
#include <type_traits>

#include "stats/exact_stats_accumulator.h"
#include "stats/plane_walk.h"

// How planes go into the accumulators of statistics.

namespace lumo {

/// The accumulator for one band of T: exact sums where T allows it, else the running form.
template <typename T>
using BandAccumulator =
    std::conditional_t<kExactStats<T>, ExactStatsAccumulator<T>, LargeStatsAccumulator<T>>;

/// The valid values of one band's plane, and their sums.
template <typename T>
struct SummedPlane {
  ValidPlane<T> valid;  ///< which values count
  PlaneSums<T> sums;    ///< of the whole plane, with what fills it
};

/// Sums the plane of one band. The result means something until the next call with `planes`.
/// @param band    of the group, from 0.
/// @param planes  gives the memory for planes with values that don't count.
template <typename T>
SummedPlane<T> SumBand(const PlaneGroup<T>& group, std::size_t band, ValidPlanes<T>& planes) {
  SummedPlane<T> summed;
  const T* const values = group.values + band * group.stride;
  const unsigned char* const states =
      group.states != nullptr ? group.states + band * group.stride : nullptr;
  bool allFinite = true;
  if constexpr (std::is_floating_point_v<T>) {
    // The common case first: nothing to leave out.
    if (states == nullptr) {
      SumPlane(values, group.count, summed.sums);
      allFinite = summed.sums.finite;
      if (allFinite) {
        summed.valid = {values, nullptr, group.count, T()};
        return summed;
      }
    } else {
      allFinite = false;
    }
  }
  summed.valid = planes.Find(values, states, group.count, allFinite);
  if (summed.valid.count != 0) SumPlane(summed.valid.values, group.count, summed.sums);
  return summed;
}

/// Takes a plane of `count` values in; the values that fill it are taken off again.
template <typename T>
void AddPlane(const SummedPlane<T>& plane, std::size_t count, ExactStatsAccumulator<T>& into) {
  if (plane.valid.count == 0) return;
  const Int128 filler = plane.valid.filler;
  const auto fillers = static_cast<Int128>(count - plane.valid.count);
  into.count += plane.valid.count;
  into.sum += plane.sums.sum - filler * fillers;
  into.sum2 += (UInt128{plane.sums.sum2High} << 32) + plane.sums.sum2Low -
               static_cast<UInt128>(filler * filler * fillers);
  into.min = std::min(into.min, plane.sums.min);
  into.max = std::max(into.max, plane.sums.max);
}

/// Takes a plane of `count` values in. Where its sums left the range of a double, the values are
/// added one by one.
template <typename T>
void AddPlane(const SummedPlane<T>& plane, std::size_t count, LargeStatsAccumulator<T>& into) {
  if (plane.valid.count == 0) return;
  const PlaneSums<T>& sums = plane.sums;
  const auto n = static_cast<double>(plane.valid.count);
  LargeStatsAccumulator<T> part;
  part.sum2 = sums.sum2 + sums.shift * (2 * sums.sum + n * sums.shift);
  if (std::isfinite(part.sum2) && std::isfinite(sums.sum2)) {
    part.count = plane.valid.count;
    part.sum = sums.sum + n * sums.shift;
    part.mean = sums.shift + sums.sum / n;
    part.s = std::max(sums.sum2 - sums.sum * sums.sum / n, 0.0);
    part.meanSq = part.sum2 / n;
    part.min = sums.min;
    part.max = sums.max;
  } else {
    part = {};
    for (std::size_t i = 0; i < count; ++i) {
      if (plane.valid.mask == nullptr || plane.valid.mask[i] != 0) part.Add(plane.valid.values[i]);
    }
  }
  into.Merge(part);
}

}  // namespace lumo
