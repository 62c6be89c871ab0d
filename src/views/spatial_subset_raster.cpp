#include "views/spatial_subset_raster.h"

#include <algorithm>

#include "pyramid/exact_levels.h"
#include "raster/raster_details.h"

namespace lumo {

template <typename T>
SpatialSubsetRaster<T>::SpatialSubsetRaster(const RasterPtr<T>& parent, const SubRect& rect,
                                            Form form)
    : ComputedRaster<T>(parent), form_(form) {
  if (!parent || parent->Samples() == 0 || parent->Lines() == 0) return;
  const unsigned lastX = parent->Samples() - 1, lastY = parent->Lines() - 1;
  rect_ = rect.Clip(lastX, lastY).Clip(lastX, lastY);  // again, for one that lies outside
  def_ = parent->GetRasterDef();
  def_.samples = rect_.Width();
  def_.lines = rect_.Height();
  if (def_.geoRef) def_.SetGeoRef(PartGeoRef(*def_.geoRef, rect_, form_));
  MovePlaceDetails(def_.metadata, rect_.left, rect_.top);
}

template <typename T>
SubRect SpatialSubsetRaster<T>::PlaceInParent(const SubRect& rect) const {
  return {rect.left + rect_.left, rect.top + rect_.top, rect.right + rect_.left,
          rect.bottom + rect_.top};
}

template <typename T>
RasterPtr<T> SpatialSubsetRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = RasterView<T>::PyramidLevel(level);
  if (!reduced) return {};
  SubRect rect = rect_;
  for (unsigned i = 0; i < level; ++i) {
    const unsigned right = rect.right >> 1, bottom = rect.bottom >> 1;
    rect = {std::min((rect.left + 1) >> 1, right), std::min((rect.top + 1) >> 1, bottom), right,
            bottom};
  }
  const Form form = ExactLevels::AreWanted() ? Form::kExact : form_;
  return RasterPtr<T>(new SpatialSubsetRaster(reduced, rect, form));
}

template <typename T>
bool SpatialSubsetRaster<T>::GetBlock(const SubRect& rect, const Array<unsigned>& bands,
                                      Interleave interleave, Array<T>& pixels,
                                      BlockStates& states) {
  const RasterPtr<T>& parent = this->Parent();
  return parent && GetBlockOf(*parent, PlaceInParent(rect), bands, interleave, pixels, states);
}

VEXG_INSTANCES(EIGHT, SpatialSubsetRaster);

}  // namespace lumo
