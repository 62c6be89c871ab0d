#pragma once

#include <optional>
#include <string>
#include <vector>

#include "output/json_number.h"
#include "rasters/raster_source.h"

namespace lumo::host {

/// Holds what a raster says of a band, beside RasterInfo; a text is empty where it says nothing.
struct BandNotes {
  std::string name, meaning, unit, scale, offset;

  bool IsEmpty() const {
    return name.empty() && meaning.empty() && unit.empty() && scale.empty() && offset.empty();
  }
  bool IsScaled() const { return !scale.empty() || !offset.empty(); }
  /// How values come from pixels, "pixel * 0.1 + 273", of a band that IsScaled.
  std::string GetScaling() const;
};

/// Holds what a raster says of itself, beside RasterInfo.
struct RasterNotes {
  std::vector<BandNotes> bands;
  std::optional<unsigned> alpha;  ///< the band that says which pixels count
  long epsg = 0;                  ///< code of the coordinate system; 0 for none
  TileDimensions blocks;          ///< of the file; 0 where it says nothing
  std::string pyramidMethod;      ///< how its levels came about; empty without any
  std::string compression;        ///< of the file, "none", or empty where it says nothing
};

/// Adds the command that asks a raster for them.
/// @param raster  a variable or URI.
void AddNotesQuery(JobDraft& draft, const String& raster);

/// Reads the results of the command of AddNotesQuery.
RasterNotes ReadNotes(const JobResults& results, unsigned bands);

}  // namespace lumo::host
