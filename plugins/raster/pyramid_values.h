#pragma once

#include <map>
#include <string>
#include <vector>

#include "georef/georef.h"
#include "raster/band_values.h"

namespace lumo::pyramid {

/// The values that a pyramid file keeps beside the pixels. Exists for TwelveTypes.
///
/// Its text has a line for each value: a word, a blank, and the text form of the value.
template <typename T>
struct Values {
  /// @return false for a text that breaks off, or names a band that isn't there.
  bool Read(const std::string& text, unsigned bands);
  std::string Write() const;

  std::map<unsigned, T> noData;
  std::map<unsigned, RasterBandStats<T>> stats;  ///< by band; none for complex T
  std::vector<RasterBandHistogram<T>> histograms;
  GeoRefPtr geoRef;       ///< of the raster; may be empty
  std::string fileState;  ///< of the raster when the levels were built; may be empty
};

}  // namespace lumo::pyramid
