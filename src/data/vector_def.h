#pragma once

#include "georef/georef.h"

namespace lumo {

/// Names what the features of a vector source are.
enum class VectorGeometry : std::int32_t { kUnknown = 0, kPoint = 1, kLine = 2, kPolygon = 3 };

/// The description of a vector source: a value, whose copy has a geo-reference of its own.
struct VEXG_EXPORT VectorDef {
  VectorDef() = default;
  VectorDef(const VectorDef& other);
  VectorDef(VectorDef&& other) = default;
  VectorDef& operator=(const VectorDef& other);
  VectorDef& operator=(VectorDef&& other) = default;
  ~VectorDef() = default;

  VectorGeometry geometry = VectorGeometry::kUnknown;
  String format = "Unknown";  ///< the format's key
  GeoRefPtr geoRef;           ///< carries the coordinate system; empty when there is none
  unsigned dataType = 5;      ///< code of the coordinate type
  unsigned features = 0;      ///< how many the source holds
  MapRect bounds;             ///< of all features, in the source's coordinates
};

}  // namespace lumo
