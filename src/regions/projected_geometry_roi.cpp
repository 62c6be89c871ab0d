#include "regions/projected_geometry_roi.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned ProjectedROI::TypeCode = GloballyUniqueObjectTypeCode("ProjectedROI");
const unsigned ProjectedGeometryROI::TypeCode =
    GloballyUniqueObjectTypeCode("ProjectedGeometryROI");

bool ProjectedROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedROI::IsA(typeCode);
}
bool ProjectedGeometryROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ProjectedROI::IsA(typeCode);
}

ProjectedGeometryROI::ProjectedGeometryROI(const GeometryROIDefPtr& definition,
                                           const GeoRefPtr& geoRef)
    : ProjectedROI(geoRef),
      shown_(new GeometryROIDef(
          GeometryPtr(new ProjectedGeometry(definition->Geometry(), geoRef->CoordinateSystem())),
          definition->Options())),
      region_(new RasterizedGeometryROI(shown_, 0, 0, geoRef)) {}

}  // namespace lumo
