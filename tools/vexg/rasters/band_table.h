#pragma once

#include <string>
#include <utility>
#include <vector>

#include "foundation/containers.h"
#include "output/json_number.h"

namespace lumo::host {

/// A value in both forms of output.
struct Cell {
  Json json;  ///< null for what there is none of, and for what no number of JSON can be
  std::string text;
};

using Column = std::vector<Cell>;

/// Statistics of bands.
struct BandTable {
  std::vector<unsigned> bands;
  std::vector<std::pair<std::string, Column>> columns;
  std::vector<Column> sumXY, cov;  ///< a row for each band; none unless asked for
};

/// Reads what GetBasicRasterStatsCommand gives, or GetExtendedRasterStatsCommand. Throws HostError
/// where that isn't all.
/// @param file  what the user calls the raster.
BandTable ReadTable(const Map<String, String>& returns, const std::string& file, bool isExtended,
                    const Array<unsigned>& bands, unsigned dataType);

/// Adds a column for each percentile: "median" and "p2".
void AddPercentiles(const String& values, const std::vector<std::string>& names, BandTable& table);

/// The bands as a list of objects.
Json AsJson(const BandTable& table);

}  // namespace lumo::host
