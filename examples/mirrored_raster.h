#pragma once

#include <utility>

#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "raster/raster_view.h"

namespace lumo::example {

/// Shows its parent mirrored left to right: pixel (x, y) is the parent's (Samples() - 1 - x, y).
///
/// A view of other places: it says which of the parent's pixels a block stands on, and turns the
/// block around. No geo-reference describes the mirrored grid, so it has none. It has the same
/// pixels as its parent, and so the parent's statistics.
template <typename T>
class MirroredRaster final : public RasterView<T> {
 public:
  using RasterView<T>::RasterView;

  URI GetURI() const override { return this->DefaultURI("MirroredRaster"); }
  RasterDef GetRasterDef() const override {
    RasterDef def = RasterView<T>::GetRasterDef();
    def.geoRef = {};
    return def;
  }
  RasterPtr<T> PyramidLevel(unsigned level) override {
    const RasterPtr<T> reduced = RasterView<T>::PyramidLevel(level);
    return reduced ? RasterPtr<T>(new MirroredRaster(reduced)) : RasterPtr<T>();
  }
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override {
    if (!RasterView<T>::GetSubRect(rect, bands, interleave, pixels, state)) return false;
    const BlockShape block(rect, bands, interleave);
    Mirror(block, pixels);
    Mirror(block, state);
    return true;
  }
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override {
    const BlockShape block(rect, bands, interleave);
    if (!block.IsHeldBy(pixels, state)) return false;
    Mirror(block, pixels);
    Mirror(block, state);
    const bool isWritten = RasterView<T>::PutSubRect(rect, bands, interleave, pixels, state);
    Mirror(block, pixels);  // the caller's as they were
    Mirror(block, state);
    return isWritten;
  }

 protected:
  SubRect PlaceInParent(const SubRect& rect) const override {
    const unsigned last = this->Samples() - 1;
    return {last - rect.right, rect.top, last - rect.left, rect.bottom};
  }

 private:
  template <typename E>
  static void Mirror(const BlockShape& block, Array<E>& values) {
    const BlockStrides strides(block.interleave, block.width, block.height, block.count);
    for (std::size_t band = 0; band < block.count; ++band) {
      for (std::size_t y = 0; y < block.height; ++y) {
        E* left = &values[band * strides.band + y * strides.line];
        E* right = left + (block.width - 1) * strides.pixel;
        for (; left < right; left += strides.pixel, right -= strides.pixel) {
          std::swap(*left, *right);
        }
      }
    }
  }
};

}  // namespace lumo::example
