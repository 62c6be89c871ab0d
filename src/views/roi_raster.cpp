#include "views/roi_raster.h"

#include "regions/region_states.h"
#include "regions/roi_changes.h"

namespace lumo {

template <typename T>
ROIRaster<T>::ROIRaster(const RasterPtr<T>& parent, const ROIDefPtr& definition)
    : ComputedRaster<T>(parent), definition_(definition) {
  if (!parent) return;
  rasterized_ =
      RasterizeOn(definition, parent->Samples(), parent->Lines(), parent->GetRasterDef().geoRef);
}

template <typename T>
RasterPtr<T> ROIRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = ComputedRaster<T>::PyramidLevel(level);
  return reduced ? RasterPtr<T>(new ROIRaster(reduced, definition_, rasterized_, level))
                 : RasterPtr<T>();
}

template <typename T>
bool ROIRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                              Interleave interleave, Array<T>& pixels,
                              Array<unsigned char>& state) {
  if (!ComputedRaster<T>::GetSubRect(rect, bands, interleave, pixels, state)) return false;
  if (!rasterized_) return true;
  const SubRect ordered(rect.left, rect.top, rect.right, rect.bottom);
  return FillRegionStates(*rasterized_, level_, ordered, interleave, bands.GetCount(), state);
}

template <typename T>
std::uint64_t ROIRaster<T>::WriteCount() const {
  return ComputedRaster<T>::WriteCount() + ChangesOf(definition_);
}

VEXG_INSTANCES(EIGHT, ROIRaster);

}  // namespace lumo
