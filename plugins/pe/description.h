#pragma once

#include "georef/coordsys_info.h"
#include "proj_context.h"

namespace lumo::pe {

/// The horizontal system that a description is made from.
struct SystemParts {
  const PJ* map = nullptr;        ///< the geographic or projected system
  const PJ* geodetic = nullptr;   ///< the geographic system below it, which may be the same
  const PJ* transform = nullptr;  ///< transform to WGS 84 that came with the text; may be null
};

/// Fills `info` from the parts, all but its text; also where the Esri dialect lacks the projection.
void Describe(PJ_CONTEXT* context, const SystemParts& parts, CoordSysInfo& info);

/// Code of an object in the EPSG registry, 0 when it has none.
int EpsgCode(const PJ* object);

/// Degrees for the unit of the axes of a geographic system, and of its prime meridian.
double DegreesPerUnit(PJ_CONTEXT* context, const PJ* geodetic);
double MeridianDegrees(PJ_CONTEXT* context, const PJ* geodetic);

/// The text of a system, operation or part as one line of WKT; empty when it has none in the form.
std::string ToWkt(PJ_CONTEXT* context, const PJ* object, PJ_WKT_TYPE form);

}  // namespace lumo::pe
