#pragma once

#include <algorithm>

#include "pyramid/exact_levels.h"
#include "raster/raster_details.h"
#include "views/spatial_subset_raster.h"

namespace lumo {

namespace detail {

/// The part of a rectangle that lies in a raster of samples by lines; its last column or line for
/// one that lies outside.
inline SubRect CutTo(const SubRect& rect, unsigned samples, unsigned lines) {
  const auto [left, right] = std::minmax(rect.left, rect.right);
  const auto [top, bottom] = std::minmax(rect.top, rect.bottom);
  return {std::min(left, samples - 1), std::min(top, lines - 1), std::min(right, samples - 1),
          std::min(bottom, lines - 1)};
}

}  // namespace detail

template <typename T>
SpatialSubsetRaster<T>::SpatialSubsetRaster(const RasterPtr<T>& parent, const SubRect& rect,
                                            Form form)
    : ComputedRaster<T>(parent), form_(form) {
  if (!parent || parent->Samples() == 0 || parent->Lines() == 0) return;
  rect_ = detail::CutTo(rect, parent->Samples(), parent->Lines());
  def_ = parent->GetRasterDef();
  def_.samples = rect_.Width();
  def_.lines = rect_.Height();
  if (def_.geoRef) def_.SetGeoRef(PartGeoRef(*def_.geoRef, rect_, form_));
  MovePlaceDetails(def_.metadata, rect_.left, rect_.top);
}

template <typename T>
RasterPtr<T> SpatialSubsetRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced =
      this->Parent() ? this->Parent()->PyramidLevel(level) : RasterPtr<T>();
  if (!reduced) return {};
  SubRect rect = rect_;
  for (unsigned i = 0; i < level; ++i) {
    rect.right >>= 1;
    rect.bottom >>= 1;
    rect.left = std::min((rect.left + 1) >> 1, rect.right);
    rect.top = std::min((rect.top + 1) >> 1, rect.bottom);
  }
  const Form form = ExactLevels::AreWanted() ? Form::kExact : form_;
  return RasterPtr<T>(new SpatialSubsetRaster(reduced, rect, form));
}

template <typename T>
SubRect SpatialSubsetRaster<T>::InParent(const SubRect& rect) const {
  return {rect.left + rect_.left, rect.top + rect_.top, rect.right + rect_.left,
          rect.bottom + rect_.top};
}

template <typename T>
bool SpatialSubsetRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                        Interleave interleave, Array<T>& pixels,
                                        Array<unsigned char>& state) {
  return this->Parent() &&
         this->Parent()->GetSubRect(InParent(rect), bands, interleave, pixels, state);
}

template <typename T>
bool SpatialSubsetRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                        Interleave interleave, Array<T>& pixels,
                                        Array<unsigned char>& state) {
  return this->Parent() &&
         this->Parent()->PutSubRect(InParent(rect), bands, interleave, pixels, state);
}

}  // namespace lumo
