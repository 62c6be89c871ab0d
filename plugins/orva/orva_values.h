#pragma once

#include <map>
#include <vector>

#include "foundation/color.h"
#include "orva/orva_header.h"
#include "raster/band_values.h"

namespace lumo::orva {

/// The values of bands that a header keeps beside the description of the pixels. Exists for
/// TwelveTypes.
template <typename T>
struct BandValues {
  /// Reads them from a header.
  /// @param fault  [out] "line N: what".
  bool Read(const Header& header, std::string& fault);

  /// Writes them into a header, in place of those that it has.
  void Write(HeaderText& text) const;

  std::map<unsigned, RasterBandStats<T>> stats;  ///< by band; none for complex T
  std::vector<RasterBandHistogram<T>> histograms;
  std::map<unsigned, Palette> palettes;
};

}  // namespace lumo::orva
