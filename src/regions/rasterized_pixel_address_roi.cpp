#include "regions/rasterized_pixel_address_roi.h"

#include <cmath>

#include "foundation/fault.h"
#include "foundation/type_code.h"
#include "regions/projected_pixel_address_roi.h"

namespace lumo {

const unsigned RasterizedPixelAddressROI::TypeCode =
    GloballyUniqueObjectTypeCode("RasterizedPixelAddressROI");

bool RasterizedPixelAddressROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedROI::IsA(typeCode);
}

RasterizedPixelAddressROI::RasterizedPixelAddressROI(const PixelAddressROIDefPtr& definition,
                                                     unsigned samples, unsigned lines,
                                                     const GeoRefPtr& geoRef)
    : RasterizedROI(samples, lines, geoRef), definition_(definition) {
  if (!definition_) {
    SetErrorState(ObjectErrorNotConstructed());
    return;
  }
  const GeoRefPtr own = definition_->GeoRef();
  if (!geoRef_ || !own) return;
  if (!geoRef_->IsEqual(own, GeoRef::kSkipTiePoint)) {
    projected_ = true;
    inner_.Reset(new ProjectedPixelAddressROI(definition_, geoRef_));
    return;
  }
  shifted_ = geoRef_->TieMapX() != own->TieMapX() || geoRef_->TieMapY() != own->TieMapY() ||
             geoRef_->TiePixelX() != own->TiePixelX() || geoRef_->TiePixelY() != own->TiePixelY();
}

/// The window on the definition's grid. Shifted, it is found by the centre of its first pixel.
bool RasterizedPixelAddressROI::ToDefinition(const RegionWindow& window, RegionWindow& own) const {
  own = geoRef_ ? window : Offset(window);
  if (!shifted_) return true;
  double point[] = {static_cast<double>(window.left) + 0.5, static_cast<double>(window.top) + 0.5};
  Array<double> points(point, ArrayDims(1, 2));
  if (!geoRef_->PixelToPixel(points, *definition_->GeoRef())) {
    SetFault("the region's grid can't be carried to the raster's");
    return false;
  }
  own.left = static_cast<std::int64_t>(std::floor(point[0]));
  own.top = static_cast<std::int64_t>(std::floor(point[1]));
  return true;
}

bool RasterizedPixelAddressROI::HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) {
  info = ROIHitInfoPtr();
  if (inner_) {
    if (!inner_->HitTest(point, info)) return false;
    info->SetROIDef(definition_);
    return true;
  }
  RegionWindow own;
  if (!definition_ || !ToDefinition({point.x, point.y, 1, 1}, own)) return false;
  if (own.left < 0 || own.top < 0 ||
      !definition_->Contains({static_cast<unsigned>(own.left), static_cast<unsigned>(own.top)})) {
    return false;
  }
  info = ROIHitInfoPtr(new ROIHitInfo(definition_, kPixelHit));
  return true;
}

bool RasterizedPixelAddressROI::Mask(const SubRect& rect, Array<unsigned char>& mask,
                                     std::uint64_t& count) {
  return inner_ ? inner_->Mask(rect, mask, count) : FreshMask(rect, mask, count);
}

bool RasterizedPixelAddressROI::Mark(RegionMarks& marks) {
  if (inner_) return inner_->Mark(marks);
  RegionWindow own;
  if (!definition_ || !ToDefinition(marks.Window(), own)) return false;
  return marks.MarkMoved(own, [&](RegionMarks& moved) {
    definition_->Mark(moved);
    return true;
  });
}

RegionCover RasterizedPixelAddressROI::Cover(const RegionWindow& window) {
  if (inner_) return inner_->Cover(window);
  RegionWindow own;
  SubRect bounds;
  if (!definition_ || !ToDefinition(window, own)) return RegionCover::kPartly;
  const bool isOutside = !definition_->Bounds(bounds) || own.Right() < bounds.left ||
                         own.left > bounds.right || own.Bottom() < bounds.top ||
                         own.top > bounds.bottom;
  return isOutside ? RegionCover::kOutside : RegionCover::kPartly;
}

}  // namespace lumo
