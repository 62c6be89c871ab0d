#pragma once

#include <string>
#include <vector>

#include "commands/value_text.h"
#include "foundation/array.h"
#include "metadata/metadata.h"

// Details are all that is known of a raster beside the fields of its RasterDef. They travel in the
// metadata of the RasterDef as internal entries, all of them texts:
//
//   Bands/<n>/NoDataValue    the no-data value of band n, from 0, exactly; of 64-bit integers
//   Bands/<n>/Description    its name
//   Bands/<n>/Unit           of its values
//   Bands/<n>/Scale, Offset  value = pixel * Scale + Offset
//   Bands/<n>/Meaning        "Alpha", "Red", ...: the name of a colour interpretation
//   Bands/<n>/Categories     the names of its values from 0 on, each on a line
//   Bands/<n>/Items/<name>   further items
//   Items/<name>             further items of the raster
//   Grid                     the six numbers of a grid that no geo-reference can express
//   CoordSys                 WKT of a system of the Grid, the Points, or of nothing
//   Points/<n>               a ground control point: pixel, line, x, y, z. Pixels and lines count
//                            from the upper left corner of the raster
//
// A format's reader enters them, views choose and move them, a format's writer keeps them.

namespace lumo {

/// Which details of its template a raster gets that is made like another one.
enum class KeptDetails : unsigned {
  kTold = 0,   ///< none
  kNames = 1,  ///< the names of bands: the values are others
  kBands = 2,  ///< all but those of the place
  kAll = 3
};

VEXG_EXPORT std::span<const EnumWord<KeptDetails>> WordsOf(KeptDetails);

/// The path of a detail.
/// @param name  as in the list above.
VEXG_EXPORT String DetailPath(const std::string& name);
/// The path of a detail of a band, from 0.
/// @param name  as behind "Bands/<n>/" in the list above.
VEXG_EXPORT String BandDetailPath(unsigned band, const std::string& name);

/// The path of the entry in which a pyramid file keeps the state of the file that it was built
/// from: its bytes and the time of change, in ns since 1970. It is no detail, and stays with the
/// pyramid.
VEXG_EXPORT String FileStatePath();

/// The text of a detail; empty where there is none.
VEXG_EXPORT std::string FindDetail(const Metadata& metadata, const String& path);

/// The names of all details that are there, in order.
VEXG_EXPORT std::vector<std::string> DetailNames(const Metadata& metadata);

/// Names the values of a band from 0 on. A name that breaks lines has blanks there.
VEXG_EXPORT void SetCategories(Metadata& metadata, unsigned band, const Array<String>& names);
/// The names of the values of a band from 0 on; none where it has none.
VEXG_EXPORT std::vector<std::string> FindCategories(const Metadata& metadata, unsigned band);

/// Gives the details of bands another order.
/// @param bands  which one each band was before; one may come twice.
VEXG_EXPORT void ChooseBandDetails(Metadata& metadata, const Array<unsigned>& bands);

/// Adds the details of the bands of another raster.
/// @param offset  band in `metadata` of the other's band 0.
VEXG_EXPORT void AddBandDetails(Metadata& metadata, unsigned offset, const Metadata& other);

/// Drops the details of bands that another raster hasn't got, or has otherwise; exact no-data
/// values are dropped too.
VEXG_EXPORT void KeepSharedBandDetails(Metadata& metadata, const Metadata& other);

/// Moves the details of the place to an origin that lies at a pixel of the raster.
VEXG_EXPORT void MovePlaceDetails(Metadata& metadata, unsigned left, unsigned top);

/// Drops the details that aren't kept. The exact no-data values stay.
VEXG_EXPORT void KeepDetails(Metadata& metadata, KeptDetails kept);

}  // namespace lumo
