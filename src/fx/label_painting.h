#pragma once

#include <algorithm>
#include <numeric>
#include <vector>

#include "foundation/fault.h"
#include "fx/strip_regions.h"
#include "raster/tile.h"

namespace lumo {

/// Paints a tile by the labels of another: each valid pixel gets the values of its region, every
/// other one, and label 0, zeros.
/// @param labels    borders included; the first band counts.
/// @param out       is sized like them, with `bands` bands.
/// @param valuesOf  `valuesOf(regions, values)` fills `values` for the regions of the tile, which
///                  come in ascending order without 0: `bands` numbers for each. Gives a bool.
/// @return false, with the fault set, at a label below 0, or when there is no memory.
template <typename T, typename L, typename ValuesOf>
bool PaintLabels(const Tile<L>& labels, unsigned bands, Tile<T>& out, const ValuesOf& valuesOf) {
  TileDimensions size = labels.Dimensions();
  size.bands = bands;
  if (!out.Resize(size)) return false;
  out.SetIndex(labels.Index());
  out.SetOrigin(labels.Origin());

  StripRegions strip;
  const std::size_t width = labels.FullWidth(), height = labels.FullHeight();
  for (std::size_t y = 0; y < height; ++y) {
    const std::size_t at = y * width * labels.Bands();
    if (!strip.AddLine(labels.PixelArray().GetData() + at, labels.StateArray().GetData() + at,
                       nullptr, width)) {
      SetFault(String("there is a label below 0: " + std::to_string(strip.NegativeLabel())));
      return false;
    }
  }
  // In ascending order, as the values lie in files.
  std::vector<std::uint32_t> regions = strip.Labels();
  std::sort(regions.begin(), regions.end());
  if (!regions.empty() && regions.front() == 0) regions.erase(regions.begin());
  std::vector<T> values(regions.size() * bands);
  if (!valuesOf(regions, values.data())) return false;
  std::vector<T> zeros(bands);
  std::vector<const T*> ofLocal;
  for (const std::uint32_t label : strip.Labels()) {
    const auto found = std::lower_bound(regions.begin(), regions.end(), label);
    ofLocal.push_back(label == 0 ? zeros.data()
                                 : values.data() + (found - regions.begin()) *
                                                       static_cast<std::ptrdiff_t>(bands));
  }
  T* line = out.PixelArray().GetData();
  std::fill_n(line, width * height * bands, T());
  for (std::size_t y = 0; y < height; ++y, line += width * bands) {
    for (const LabelRun& run : strip.RunsOf(y)) {
      T* to = line + std::size_t{run.first} * bands;
      for (std::uint32_t i = 0; i < run.count; ++i, to += bands) {
        std::copy_n(ofLocal[run.region], bands, to);
      }
    }
  }
  return true;
}

}  // namespace lumo
