#pragma once

#include <cmath>

#include "raster/pixel_states.h"
#include "views/computed_raster.h"

namespace lumo::example {

/// Shows the pixels of its parent whose centres lie in a circle, and masks the others.
///
/// A view of other states: it changes the states of the blocks that its parent delivers, and not
/// one pixel. Other pixels count, so that its statistics are its own.
template <typename T>
class CircleRaster final : public ComputedRaster<T> {
 public:
  /// @param x, y    centre, in pixels from the upper left corner of the raster.
  /// @param radius  in pixels.
  CircleRaster(const RasterPtr<T>& parent, double x, double y, double radius)
      : ComputedRaster<T>(parent), x_(x), y_(y), radius_(radius) {}
  ~CircleRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("CircleRaster"); }
  RasterPtr<T> PyramidLevel(unsigned level) override {
    const RasterPtr<T> reduced = ComputedRaster<T>::PyramidLevel(level);
    const double scale = std::ldexp(1.0, -static_cast<int>(level));
    return reduced
               ? RasterPtr<T>(new CircleRaster(reduced, x_ * scale, y_ * scale, radius_ * scale))
               : RasterPtr<T>();
  }
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override {
    if (!ComputedRaster<T>::GetSubRect(rect, bands, interleave, pixels, state)) return false;
    const auto isOutside = [&](unsigned x, unsigned y, unsigned /*band*/) {
      return std::hypot(x + 0.5 - x_, y + 0.5 - y_) > radius_;
    };
    MarkStates(rect, bands, interleave, PixelValueState::Masked, state, isOutside);
    return true;
  }

 private:
  const double x_;
  const double y_;
  const double radius_;
};

}  // namespace lumo::example
