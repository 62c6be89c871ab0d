#pragma once

#include <map>

#include "georef/georef.h"
#include "metadata/metadata.h"
#include "raster/creation_options.h"
#include "raster/raster_enums.h"

namespace lumo {

/// The description of a raster: a value, whose copy has a geo-reference of its own.
///
///     RasterDef def = raster->GetRasterDef();
///     def.dataType = kDataTypeOf<float>;
///     def.bands = 1;
///     def.noData = {{0, -9999.0}};  // band 0
///     def.SetGeoRef(grid);
///
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

  /// Takes a copy of `source`, and gives it the samples and lines of this description.
  void SetGeoRef(const GeoRefPtr& source);

  /// Gives a band a no-data value, 0 unless it has one already; or takes it away.
  void SetNoData(unsigned band, bool has);

  std::map<unsigned, double> noData;  ///< by band; a band without an entry has no no-data value
  unsigned samples = 0;               ///< pixels of a line
  unsigned lines = 0;
  unsigned bands = 0;
  unsigned tileWidth = 0;         ///< of the source's storage blocks, 0 when it has none
  unsigned tileHeight = 0;        ///< above 1: the source is stored in true tiles
  unsigned sourceFields[6] = {};  ///< carried for the data source; nothing here reads them
  Interleave interleave = Interleave::None;  ///< of the source; None when it has none
  unsigned dataType = 0;                     ///< code of the pixel type, see pixel_types.h
  String format = "Unknown";                 ///< the format's key
  GeoRefPtr geoRef;                          ///< empty when the place isn't known
  Metadata metadata;                         ///< the details of raster_details.h among it
  CreationOptions creation;                  ///< of a raster that is to be made
};

/// Describes the pyramid that a raster has, or is to get. A value; the default is no pyramid.
struct PyramidDef {
  PyramidType pyramidType = PyramidType::kNone;
  PyramidResamplingMethod resamplingMethod = PyramidResamplingMethod::kUnknown;
  unsigned levelMin = 0;    ///< first level stored; level 1 halves samples and lines
  unsigned levelMax = 0;    ///< last level stored
  bool canBuild = false;    ///< PyramidBuild can succeed
  unsigned level = 0;       ///< of the level that answers; 0 for the raster itself
  Form bins = Form::kTold;  ///< of the histogram that a build counts

  friend bool operator==(const PyramidDef&, const PyramidDef&) = default;
};

}  // namespace lumo
