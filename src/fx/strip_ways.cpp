#include "fx/strip_ways.h"

namespace lumo {

StripWays StripWays::Find(StripDrains& drains, std::uint32_t width,
                          std::vector<StripMinimum>* kept) {
  StripWays ways;
  std::size_t candidate = 0;
  const auto lineWidth = static_cast<std::int32_t>(width);
  std::vector<std::int32_t> labels(drains.Cells().size());
  drains.Label(
      labels.data(),
      [&](std::uint32_t pixel) {
        if (kept != nullptr) {
          while ((*kept)[candidate].first != pixel) ++candidate;
          (*kept)[ways.minima] = (*kept)[candidate];
        }
        return static_cast<std::int32_t>(++ways.minima);
      },
      [](std::uint32_t x) { return -1 - static_cast<std::int32_t>(x); },
      [lineWidth](std::uint32_t x) { return -1 - lineWidth - static_cast<std::int32_t>(x); });
  if (kept != nullptr) kept->resize(ways.minima);
  ways.firstLabels.assign(labels.begin(), labels.begin() + lineWidth);
  ways.lastLabels.assign(labels.end() - lineWidth, labels.end());
  return ways;
}

void LabelStrip(StripDrains& drains, MinimumNumbers::Walk minima, const std::int32_t* above,
                const std::int32_t* below, std::int32_t* labels) {
  drains.Label(
      labels, [&](std::uint32_t) { return static_cast<std::int32_t>(minima.Next()); },
      [above](std::uint32_t x) { return above[x]; }, [below](std::uint32_t x) { return below[x]; });
}

}  // namespace lumo
