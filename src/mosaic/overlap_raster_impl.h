#pragma once

#include <algorithm>
#include <cmath>
#include <optional>

#include "data/block_shape.h"
#include "mosaic/overlap_raster.h"
#include "raster/block_strides.h"
#include "tasks/parallel_ranges.h"
#include "views/reprojection.h"

namespace lumo {

namespace detail {

/// The map rectangle that a raster covers, in the coordinate system of another model; nothing when
/// no point of its edge can be carried there.
inline std::optional<MapRect> ExtentIn(const GeoRef& other, const RasterDef& def) {
  constexpr unsigned kPieces = 32;  // of an edge: it may be curved in the other system
  Array<double> points{ArrayDims(4 * (kPieces + 1), 2)};
  for (unsigned i = 0, at = 0; i <= kPieces; ++i) {
    const double x = def.samples * (double(i) / kPieces), y = def.lines * (double(i) / kPieces);
    for (const double value : {x, 0.0, x, double(def.lines), 0.0, y, double(def.samples), y}) {
      points[at++] = value;
    }
  }
  def.geoRef->PixelToMap(points);
  if (!def.geoRef->CoordinateSystem().IsEqual(other.CoordinateSystem())) {
    def.geoRef->MapToMap(points, other);
  }
  MapRect rect{HUGE_VAL, HUGE_VAL, -HUGE_VAL, -HUGE_VAL};
  for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
    if (!std::isfinite(points[i]) || !std::isfinite(points[i + 1])) continue;
    rect.minX = std::min(rect.minX, points[i]);
    rect.maxX = std::max(rect.maxX, points[i]);
    rect.minY = std::min(rect.minY, points[i + 1]);
    rect.maxY = std::max(rect.maxY, points[i + 1]);
  }
  return rect.minX <= rect.maxX ? std::optional(rect) : std::nullopt;
}

/// The pixels that a rectangle in map coordinates spans, rounded to the nearest number.
inline void PixelsOf(const GeoRef& geoRef, const MapRect& rect, unsigned& samples,
                     unsigned& lines) {
  Array<double> corners{ArrayDims(4, 2)};
  const double values[] = {rect.minX, rect.minY, rect.minX, rect.maxY,
                           rect.maxX, rect.maxY, rect.maxX, rect.minY};
  std::copy(std::begin(values), std::end(values), corners.begin());
  geoRef.MapToPixel(corners);
  const auto nearest = [](double v) {
    const double rounded = std::floor(v + 0.5);
    return rounded > 0 && rounded < 0x7FFFFFFF ? static_cast<unsigned>(rounded) : 0U;
  };
  const auto span = [&](unsigned axis) {
    const auto [low, high] =
        std::minmax({corners[axis], corners[2 + axis], corners[4 + axis], corners[6 + axis]});
    return nearest(high - low);
  };
  samples = span(0);
  lines = span(1);
}

}  // namespace detail

/// Gives pixels of the first raster, and tells where both are valid, over the lines of a block: one
/// body for all interleaves.
template <typename T>
class OverlapRasterGetDataParallel final : public ArrayParallelFor {
 public:
  /// A block as the rasters give it, pixel-interleaved.
  struct Given {
    const T* pixels;
    const unsigned char* firstState;
    const unsigned char* secondState;
  };

  OverlapRasterGetDataParallel(unsigned width, unsigned lines, unsigned bands, const Given& given,
                               const BlockStrides& strides, T* pixels, unsigned char* state)
      : ArrayParallelFor(lines),
        width_(width),
        bands_(bands),
        given_(given),
        strides_(strides),
        pixels_(pixels),
        state_(state) {}

  void Body(unsigned begin, unsigned end) override {
    for (unsigned line = begin; line < end; ++line) {
      std::size_t in = std::size_t{line} * width_ * bands_;
      std::size_t out = line * strides_.line;
      for (unsigned x = 0; x < width_; ++x, out += strides_.pixel) {
        for (unsigned band = 0; band < bands_; ++band, ++in) {
          const std::size_t at = out + band * strides_.band;
          const unsigned both = given_.firstState[in] | given_.secondState[in];
          pixels_[at] = given_.pixels[in];
          state_[at] = (both & PixelValueState::NotValid) == 0 ? PixelValueState::Valid
                                                               : PixelValueState::NoData;
        }
      }
    }
  }

 private:
  unsigned width_;
  unsigned bands_;
  Given given_;
  BlockStrides strides_;
  T* pixels_;
  unsigned char* state_;
};

template <typename T, typename U>
OverlapRaster<T, U>::OverlapRaster(const RasterPtr<T>& first, const RasterPtr<U>& second)
    : ComputedRaster<T>(first), second_(second) {
  if (SetUp()) return;
  def_.Clear();
  this->ResetParent();
}

template <typename T, typename U>
bool OverlapRaster<T, U>::SetUp() {
  if (this->Parent().IsNull() || second_.IsNull()) return false;
  def_ = this->Parent()->GetRasterDef();
  const RasterDef second = second_->GetRasterDef();
  if (def_.geoRef.IsNull() || second.geoRef.IsNull()) return false;
  GeoRef& geoRef = *def_.geoRef;  // a copy of our own
  const std::optional<MapRect> area = detail::ExtentIn(geoRef, def_);
  const std::optional<MapRect> other = detail::ExtentIn(geoRef, second);
  if (!area || !other) return false;
  const MapRect clipped{std::max(area->minX, other->minX), std::max(area->minY, other->minY),
                        std::min(area->maxX, other->maxX), std::min(area->maxY, other->maxY)};
  if (!(clipped.minX < clipped.maxX && clipped.minY < clipped.maxY)) return false;
  geoRef.SetTieMap(clipped.minX, clipped.maxY);
  geoRef.SetTiePixel(0, 0);
  detail::PixelsOf(geoRef, clipped, def_.samples, def_.lines);
  if (def_.samples == 0 || def_.lines == 0) return false;
  geoRef.SetDimensions(def_.samples, def_.lines);
  return true;
}

template <typename T, typename U>
std::uint64_t OverlapRaster<T, U>::PixelCount(unsigned band, const IPC& ipc) {
  return this->Stats() != nullptr && band < def_.bands ? this->Stats()->PixelCount(band, ipc) : 0;
}

template <typename T, typename U>
RasterPtr<T> OverlapRaster<T, U>::PyramidLevel(unsigned level) {
  const RasterPtr<T> first = ComputedRaster<T>::PyramidLevel(level);
  const RasterPtr<U> second = second_ ? second_->PyramidLevel(level) : RasterPtr<U>();
  return first && second ? RasterPtr<T>(new OverlapRaster(first, second)) : RasterPtr<T>();
}

template <typename T, typename U>
RasterPtr<T> OverlapRaster<T, U>::StoredPyramidLevel(unsigned level) {
  const RasterPtr<T> first = ComputedRaster<T>::StoredPyramidLevel(level);
  const RasterPtr<U> second = second_ ? second_->StoredPyramidLevel(level) : RasterPtr<U>();
  return first && second ? RasterPtr<T>(new OverlapRaster(first, second)) : RasterPtr<T>();
}

template <typename T, typename U>
bool OverlapRaster<T, U>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                     Interleave interleave, Array<T>& pixels,
                                     Array<unsigned char>& state) {
  if (this->Parent().IsNull() || def_.samples == 0) return false;
  const unsigned lastX = def_.samples - 1, lastY = def_.lines - 1;
  const SubRect cut(std::min(rect.left, lastX), std::min(rect.top, lastY),
                    std::min(rect.right, lastX), std::min(rect.bottom, lastY));
  const BlockShape block(cut, bands, interleave);
  if (!block.Size(pixels, state)) return false;

  constexpr auto kNearest = PyramidResamplingMethod::kNearest;
  Array<T> firstPixels;
  Array<U> secondPixels;
  Array<unsigned char> firstState, secondState;
  const auto read = [&]<typename P>(Raster<P>& raster, Array<P>& into, Array<unsigned char>& of) {
    const Reprojection<P> reprojection(def_.geoRef, ReprojectionMethod::kPolynomial, kNearest);
    return reprojection.Run(raster, cut, block.bands, Interleave::BIP, into, of) !=
           Reprojection<P>::Outcome::kFailed;
  };
  if (!read(*this->Parent(), firstPixels, firstState)) return false;
  if (!read(*second_, secondPixels, secondState)) return false;

  OverlapRasterGetDataParallel<T> loop(
      block.width, block.height, block.count,
      {firstPixels.GetData(), firstState.GetData(), secondState.GetData()},
      BlockStrides(interleave, block.width, block.height, block.count), pixels.GetData(),
      state.GetData());
  RunParallelFor(loop);
  return true;
}

}  // namespace lumo
