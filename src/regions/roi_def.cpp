#include "regions/roi_def.h"

#include "foundation/type_code.h"
#include "regions/rasterized_geometry_roi.h"
#include "regions/rasterized_group_roi.h"

namespace lumo {

const unsigned ROIDef::TypeCode = GloballyUniqueObjectTypeCode("ROIDef");
const unsigned PixelBasedROIDef::TypeCode = GloballyUniqueObjectTypeCode("PixelBasedROIDef");
const unsigned GeometryROIDef::TypeCode = GloballyUniqueObjectTypeCode("GeometryROIDef");
const unsigned GroupROIDef::TypeCode = GloballyUniqueObjectTypeCode("GroupROIDef");

bool ROIDef::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool PixelBasedROIDef::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ROIDef::IsA(typeCode);
}
bool GeometryROIDef::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ROIDef::IsA(typeCode);
}
bool GroupROIDef::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ROIDef::IsA(typeCode);
}

RasterizedROIPtr RasterizeOn(const ROIDefPtr& definition, unsigned samples, unsigned lines,
                             const GeoRefPtr& geoRef) {
  return definition ? definition->Rasterize(definition, samples, lines, geoRef)
                    : RasterizedROIPtr();
}

RasterizedROIPtr GeometryROIDef::Rasterize(const ROIDefPtr& self, unsigned samples, unsigned lines,
                                           const GeoRefPtr& geoRef) const {
  return RasterizedROIPtr(
      new RasterizedGeometryROI(GeometryROIDefPtr(self), samples, lines, geoRef));
}

RasterizedROIPtr GroupROIDef::Rasterize(const ROIDefPtr& self, unsigned samples, unsigned lines,
                                        const GeoRefPtr& geoRef) const {
  return RasterizedROIPtr(new RasterizedGroupROI(GroupROIDefPtr(self), samples, lines, geoRef));
}

Array<ROIDefPtr> GroupROIDef::Children() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return children_;
}

void GroupROIDef::SetChildren(const Array<ROIDefPtr>& children) {
  const QueuingRWMutexLock lock(mutex_);
  children_ = children;
  ++revision_;
}

std::uint32_t GroupROIDef::Revision() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return revision_;
}

}  // namespace lumo
