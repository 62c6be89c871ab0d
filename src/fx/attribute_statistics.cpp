#include "fx/attribute_statistics.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "foundation/fault.h"

namespace lumo {
namespace {

/// Calls `take(band, attribute, value)` for the values of the regions that are there.
template <typename Take>
bool ForEachValue(RegionAttributesFile<float>& regions, const IPC& ipc, const Take& take) {
  const unsigned count = regions.RegionCount();
  for (unsigned region = 0; region < count; ++region) {
    if (region % 1024 == 0) {
      if (ipc.abort->IsSet()) {
        SetFault("the work was aborted");
        return false;
      }
      ipc.progress->Update(static_cast<double>(region) / count);
    }
    for (unsigned band = 0; band < regions.Bands(); ++band) {
      if (!regions.RegionExists(region, band)) continue;
      for (unsigned i = 0; i < regions.Attributes(); ++i) {
        take(band, i, std::as_const(regions).Value(region, band, i));
      }
    }
  }
  return regions.IsValid();
}

void Count(float value, unsigned band, unsigned attribute, RegionAttributeHistogram<float>& to) {
  const float lower = to.LowerLimit(band, attribute), upper = to.UpperLimit(band, attribute);
  if (!std::isfinite(value) || value < lower || value > upper) return;
  const double last = to.Bins() - 1;
  const double size = (static_cast<double>(upper) - static_cast<double>(lower)) / last;
  const double bin =
      size > 0 ? std::floor((static_cast<double>(value) - static_cast<double>(lower)) / size) : 0;
  ++to.Count(band, attribute, static_cast<unsigned>(std::clamp(bin, 0.0, last)));
}

}  // namespace

std::vector<AttributeFigures> FindAttributeFigures(RegionAttributesFile<float>& regions,
                                                   const IPC& ipc) {
  const unsigned attributes = regions.Attributes();
  std::vector<LargeStatsAccumulator<float>> sums(std::size_t{regions.Bands()} * attributes);
  const bool isRead =
      ForEachValue(regions, ipc, [&](unsigned band, unsigned attribute, float value) {
        sums[std::size_t{band} * attributes + attribute].Add(value);
      });
  std::vector<AttributeFigures> figures;
  if (!isRead) return figures;
  for (const LargeStatsAccumulator<float>& sum : sums) {
    if (sum.count == 0) {
      figures.emplace_back();
      continue;
    }
    const auto n = static_cast<double>(sum.count);
    const double variance = sum.count > 1 ? sum.s / (n - 1) : 0;
    figures.push_back({sum.mean, std::sqrt(variance), sum.min, sum.max, n});
  }
  return figures;
}

void SetLimits(const std::vector<AttributeFigures>& figures, RegionAttributeHistogram<float>& to) {
  auto figure = figures.begin();
  for (unsigned band = 0; band < to.Bands(); ++band) {
    for (unsigned i = 0; i < to.Attributes(); ++i, ++figure) {
      to.LowerLimit(band, i) =
          static_cast<float>(std::max(figure->mean - 2 * figure->deviation, figure->min));
      to.UpperLimit(band, i) =
          static_cast<float>(std::min(figure->mean + 2 * figure->deviation, figure->max));
    }
  }
}

bool CountAttributes(RegionAttributesFile<float>& regions, RegionAttributeHistogram<float>& to,
                     const IPC& ipc) {
  return ForEachValue(regions, ipc, [&](unsigned band, unsigned attribute, float value) {
    Count(value, band, attribute, to);
  });
}

}  // namespace lumo
