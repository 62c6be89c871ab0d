#include "regions/rasterized_group_roi.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned RasterizedGroupROI::TypeCode = GloballyUniqueObjectTypeCode("RasterizedGroupROI");

bool RasterizedGroupROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedROI::IsA(typeCode);
}

RasterizedGroupROI::RasterizedGroupROI(const GroupROIDefPtr& definition, unsigned samples,
                                       unsigned lines, const GeoRefPtr& geoRef)
    : RasterizedROI(samples, lines, geoRef), definition_(definition) {
  if (!definition_) SetErrorState(ObjectErrorNotConstructed());
}

/// Makes the forms of children that are new, and drops those of children that are gone.
void RasterizedGroupROI::Refresh() {
  const std::uint32_t revision = definition_->Revision();
  const std::pair offset(offsetX_, offsetY_);
  if (isFresh_ && revision == seenRevision_ && offset == seenOffset_) return;
  Map<ROIDefPtr, RasterizedROIPtr> forms;
  children_.clear();
  for (const ROIDefPtr& child : definition_->Children()) {
    RasterizedROIPtr form = forms_.Find(child);
    const bool isNew = form.IsNull();
    if (isNew) form = RasterizeOn(child, samples_, lines_, geoRef_);
    if (!form) continue;
    // Others may be using a form that is not new, whose offset then is right already.
    if ((isNew || offset != seenOffset_) && !form->GridGeoRef()) {
      form->SetOffset(offsetX_, offsetY_);
    }
    forms[child] = form;
    children_.push_back(form);
  }
  forms_ = forms;
  seenRevision_ = revision;
  seenOffset_ = offset;
  isFresh_ = true;
}

/// The forms of all children as they are now.
std::vector<RasterizedROIPtr> RasterizedGroupROI::Children() {
  const std::lock_guard lock(mutex_);
  if (definition_) Refresh();
  return children_;
}

bool RasterizedGroupROI::HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) {
  info = ROIHitInfoPtr();
  for (const RasterizedROIPtr& child : Children()) {
    if (child->HitTest(point, info)) return true;
  }
  return false;
}

bool RasterizedGroupROI::Mask(const SubRect& rect, Array<unsigned char>& mask,
                              std::uint64_t& count) {
  return FreshMask(rect, mask, count);
}

bool RasterizedGroupROI::Mark(RegionMarks& marks) {
  for (const RasterizedROIPtr& child : Children()) {
    if (!child->Mark(marks)) return false;
  }
  return IsValid();
}

RegionCover RasterizedGroupROI::Cover(const RegionWindow& window) {
  RegionCover cover = IsValid() ? RegionCover::kOutside : RegionCover::kPartly;
  for (const RasterizedROIPtr& child : Children()) {
    const RegionCover one = child->Cover(window);
    if (one == RegionCover::kInside) return one;
    if (one == RegionCover::kPartly) cover = one;
  }
  return cover;
}

}  // namespace lumo
