#pragma once

#include <string>
#include <vector>

#include "data/format_table.h"

namespace lumo::gdal {

/// A format of the table, and GDAL's drivers for it.
struct Format {
  std::string key;
  /// GDAL's names: the first makes and opens sources, the others may open them too.
  std::vector<std::string> drivers;
};

/// Readies GDAL for the process at the first call: its drivers, and its data directory when the
/// environment names one. Any thread.
void StartGdal();

/// The drivers of a row; none, with the fault set, when this GDAL hasn't got them.
Format FindDrivers(const FormatRecord& record);

}  // namespace lumo::gdal
