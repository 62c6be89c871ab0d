#include "regions/rasterized_roi.h"

#include <algorithm>
#include <cstring>

#include "foundation/type_code.h"

namespace lumo {

const unsigned ROIHitInfo::TypeCode = GloballyUniqueObjectTypeCode("ROIHitInfo");
const unsigned GeometryROIHitInfo::TypeCode = GloballyUniqueObjectTypeCode("GeometryROIHitInfo");
const unsigned RasterizedROI::TypeCode = GloballyUniqueObjectTypeCode("RasterizedROI");

bool ROIHitInfo::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool GeometryROIHitInfo::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ROIHitInfo::IsA(typeCode);
}
bool RasterizedROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

RasterizedROI::RasterizedROI(unsigned samples, unsigned lines, const GeoRefPtr& geoRef)
    : geoRef_(geoRef),
      samples_(geoRef ? geoRef->Samples() : samples),
      lines_(geoRef ? geoRef->Lines() : lines) {}

void RasterizedROI::SetOffset(std::int32_t x, std::int32_t y) {
  hasOffset_ = x != 0 || y != 0;
  offsetX_ = x;
  offsetY_ = y;
}

RegionWindow RasterizedROI::Offset(const RegionWindow& window) const {
  return hasOffset_ ? window.Moved(offsetX_, offsetY_) : window;
}

bool RasterizedROI::FreshMask(const SubRect& rect, Array<unsigned char>& mask,
                              std::uint64_t& count) {
  count = 0;
  if (!ShapeMask(rect, mask)) return false;
  RegionMarks marks(WindowOf(rect), mask.GetData());
  if (!Mark(marks)) return false;
  count = marks.Count();
  return true;
}

bool ShapeMask(const SubRect& rect, Array<unsigned char>& mask, bool keep) {
  const ArrayDims dims(rect.Height(), rect.Width());
  if (keep && mask.GetDims() == dims) return true;
  if (!mask.Resize(dims)) return false;
  std::memset(mask.GetData(), 0, mask.GetCount());
  return true;
}

}  // namespace lumo
