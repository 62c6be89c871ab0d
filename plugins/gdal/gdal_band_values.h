#pragma once

#include <gdal.h>
#include <optional>
#include <string>

#include "foundation/array.h"
#include "foundation/color.h"
#include "gdal_common/stored_stats.h"

namespace lumo::gdal {

// The values that a band carries beside its pixels, as GDAL has them and as we do.

/// Those that the source holds, of all its pixels; none are computed.
std::optional<StoredStats> ReadStoredStats(GDALRasterBandH band);
bool WriteStoredStats(GDALRasterBandH band, const StoredStats& stats);
void DeleteStoredStats(GDALRasterBandH band);
/// Deletes our record where it has statistics with other bands; what GDAL knows of stays.
void DeleteStoredPairs(GDALRasterBandH band);

/// A band's histogram as GDAL keeps it: bins of one width between two edges.
struct StoredHistogram {
  double lowEdge = 0;
  double highEdge = 0;
  Array<unsigned long long> counts;
};

/// The one that the source holds; none is computed.
std::optional<StoredHistogram> ReadStoredHistogram(GDALRasterBandH band);
bool WriteStoredHistogram(GDALRasterBandH band, const StoredHistogram& histogram);
/// Those that GDAL keeps beside the file, as it does for most formats.
void DeleteStoredHistograms(GDALRasterBandH band);

/// The colour table of a band, empty when it has none. A colour is called by its name in the table
/// of named colours, else "#rrggbb".
Palette ReadPalette(GDALRasterBandH band);
bool HasPalette(GDALRasterBandH band);
/// @param palette  null takes the colour table away.
bool WritePalette(GDALRasterBandH band, const Palette* palette);

/// Forgets what was set for the file beside a raster and isn't stored there, so that closing the
/// raster doesn't store it.
void DropUnsaved(GDALDatasetH dataset);

}  // namespace lumo::gdal
