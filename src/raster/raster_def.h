#pragma once

#include <map>

#include "georef/georef.h"
#include "metadata/metadata.h"
#include "raster/raster_enums.h"

namespace lumo {

/// The description of a raster: a value, whose copy has a geo-reference of its own.
/// Failure: none but those of memory, which leave the copy without a geo-reference.
struct VEXG_EXPORT RasterDef {
  RasterDef() = default;
  RasterDef(const RasterDef& other);
  RasterDef(RasterDef&& other) = default;
  RasterDef& operator=(const RasterDef& other);
  RasterDef& operator=(RasterDef&& other) = default;
  ~RasterDef() = default;

  /// Sets every field back to its default.
  void Clear() { *this = RasterDef(); }

  /// Takes a copy of `source`, and tells it the samples and lines of this description.
  void SetGeoRef(const GeoRefPtr& source);

  /// Gives a band a no-data value, 0 unless it has one already; or takes it away.
  void SetNoData(unsigned band, bool has);

  std::map<unsigned, double> noData;  ///< by band; a band without an entry has no no-data value
  unsigned samples = 0;
  unsigned lines = 0;
  unsigned bands = 0;
  unsigned tileWidth = 0;         ///< of the source's storage blocks, 0 when it has none
  unsigned tileHeight = 0;        ///< above 1: the source is stored in true tiles
  unsigned sourceFields[6] = {};  ///< carried for the data source; nothing here reads them
  Interleave interleave = Interleave::None;
  unsigned dataType = 0;
  String format = "Unknown";
  GeoRefPtr geoRef;
  Metadata metadata;
};

/// What pyramid a raster has, or is to get.
struct PyramidDef {
  PyramidType pyramidType = PyramidType::kNone;
  PyramidResamplingMethod resamplingMethod = PyramidResamplingMethod::kUnknown;
  unsigned levelMin = 0;
  unsigned levelMax = 0;
  bool canBuild = false;
  unsigned level = 0;       ///< of the level that answers; 0 for the raster itself
  Form bins = Form::kTold;  ///< of the histogram that a build counts

  friend bool operator==(const PyramidDef&, const PyramidDef&) = default;
};

}  // namespace lumo
