#pragma once

#include <algorithm>
#include <array>
#include <cmath>
#include <vector>

#include "georef/affine_link.h"
#include "georef/derived_georef.h"
#include "mosaic/overlap_raster.h"
#include "mosaic/raster_outline.h"
#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "tasks/parallel_ranges.h"
#include "warp/reprojection.h"

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

/// The part of a polygon where a coordinate is not below, or not above, a limit (Sutherland and
/// Hodgman, Reentrant polygon clipping, 1974).
inline std::vector<std::array<double, 2>> ClipAt(const std::vector<std::array<double, 2>>& polygon,
                                                 unsigned axis, double limit, bool isLower) {
  std::vector<std::array<double, 2>> clipped;
  const auto isInside = [&](const std::array<double, 2>& p) {
    return isLower ? p[axis] >= limit : p[axis] <= limit;
  };
  for (std::size_t i = 0; i < polygon.size(); ++i) {
    const auto &from = polygon[i], &to = polygon[(i + 1) % polygon.size()];
    if (isInside(from)) clipped.push_back(from);
    if (isInside(from) == isInside(to)) continue;
    const double t = (limit - from[axis]) / (to[axis] - from[axis]);
    std::array<double, 2> cut = {from[0] + t * (to[0] - from[0]), from[1] + t * (to[1] - from[1])};
    cut[axis] = limit;
    clipped.push_back(cut);
  }
  return clipped;
}

/// The pixels of the first raster whose centre lies in the rectangle of its pixels around what it
/// has in common with the second one; nothing when there are none.
inline std::optional<SubRect> CommonPixels(const RasterDef& first, const RasterDef& second) {
  auto outline = OutlineIn(*first.geoRef, second);
  const double sizes[] = {double(first.samples), double(first.lines)};
  for (const unsigned axis : {0U, 1U}) {
    outline = ClipAt(outline, axis, 0, true);
    outline = ClipAt(outline, axis, sizes[axis], false);
  }
  if (outline.empty()) return std::nullopt;
  unsigned low[2], high[2];
  for (const unsigned axis : {0U, 1U}) {
    const auto less = [axis](const auto& a, const auto& b) { return a[axis] < b[axis]; };
    const auto [least, most] = std::ranges::minmax_element(outline, less);
    constexpr double kNoise = 0.001;  // of a camera's inverse
    const double from = std::ceil((*least)[axis] - 0.5 - kNoise);
    const double to = std::floor((*most)[axis] - 0.5 + kNoise);
    if (to < from) return std::nullopt;
    low[axis] = static_cast<unsigned>(std::max(from, 0.0));
    high[axis] = static_cast<unsigned>(std::min(to, sizes[axis] - 1));
  }
  return SubRect(low[0], low[1], high[0], high[1]);
}

}  // namespace detail

/// Gives pixels of the first raster, and marks where both are valid, over the lines of a block: one
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
          state_[at] = IsValidState(both) ? PixelValueState::Valid : PixelValueState::NoData;
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
  const bool isAlongTheMap = def_.geoRef->GetType() != GeoRef::kRpc && def_.geoRef->Rotation() == 0;
  if (!(isAlongTheMap ? CutInMap(second) : CutInPixels(second))) return false;
  const bool isCamera =
      def_.geoRef->GetType() == GeoRef::kRpc || second.geoRef->GetType() == GeoRef::kRpc;
  if (isCamera) {
    map_ = std::make_shared<WarpMap>(def_.geoRef, second.geoRef, second.samples, second.lines,
                                     WarpMap::kUsualTolerance);
  }
  return true;
}

/// Cuts the map rectangle of the first raster to that of the second one. The first pixel lies in
/// the corner where the first raster's does.
template <typename T, typename U>
bool OverlapRaster<T, U>::CutInMap(const RasterDef& second) {
  GeoRef& geoRef = *def_.geoRef;  // a copy of our own
  const std::optional<MapRect> area = detail::ExtentIn(geoRef, def_);
  const std::optional<MapRect> other = detail::ExtentIn(geoRef, second);
  if (!area || !other) return false;
  const MapRect clipped{std::max(area->minX, other->minX), std::max(area->minY, other->minY),
                        std::min(area->maxX, other->maxX), std::min(area->maxY, other->maxY)};
  if (!(clipped.minX < clipped.maxX && clipped.minY < clipped.maxY)) return false;
  const double tieX = geoRef.PixelSizeX() > 0 ? clipped.minX : clipped.maxX;
  const double tieY = geoRef.PixelSizeY() > 0 ? clipped.maxY : clipped.minY;
  double x = 0, y = 0;
  if (!geoRef.MapToPixel(tieX, tieY, x, y)) return false;
  MoveCamera(geoRef, x, y);
  geoRef.SetTieMap(tieX, tieY);
  geoRef.SetTiePixel(0, 0);
  detail::PixelsOf(geoRef, clipped, def_.samples, def_.lines);
  if (def_.samples == 0 || def_.lines == 0) return false;
  geoRef.SetDimensions(def_.samples, def_.lines);
  return true;
}

/// Cuts the pixels of the first raster, where its lines don't run along the map, to those that it
/// has in common with the second one.
template <typename T, typename U>
bool OverlapRaster<T, U>::CutInPixels(const RasterDef& second) {
  part_ = detail::CommonPixels(def_, second);
  if (!part_) return false;
  def_.samples = part_->Width();
  def_.lines = part_->Height();
  def_.SetGeoRef(PartGeoRef(*def_.geoRef, *part_, Form::kExact));
  return true;
}

template <typename T, typename U>
std::uint64_t OverlapRaster<T, U>::PixelCount(unsigned band, const IPC& ipc) {
  return this->Stats() != nullptr && band < def_.bands ? this->Stats()->PixelCount(band, ipc) : 0;
}

template <typename T, typename U>
std::uint64_t OverlapRaster<T, U>::WriteCount() const {
  return ComputedRaster<T>::WriteCount() + (second_ ? second_->WriteCount() : 0);
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

  Array<T> firstPixels;
  Array<U> secondPixels;
  Array<unsigned char> firstState, secondState;
  const auto read = [&]<typename P>(Raster<P>& raster, const std::shared_ptr<const WarpMap>& map,
                                    Array<P>& into, Array<unsigned char>& of) {
    Reprojection<P> reprojection(def_.geoRef, ReprojectionMethod::kPolynomial,
                                 PyramidResamplingMethod::kNearest);
    reprojection.SetMap(map);
    return reprojection.Run(raster, cut, block.bands, Interleave::BIP, into, of) !=
           Reprojection<P>::Outcome::kFailed;
  };
  if (part_) {
    const SubRect inFirst(cut.left + part_->left, cut.top + part_->top, cut.right + part_->left,
                          cut.bottom + part_->top);
    if (!this->Parent()->GetSubRect(inFirst, block.bands, Interleave::BIP, firstPixels,
                                    firstState)) {
      return false;
    }
  } else if (!read(*this->Parent(), {}, firstPixels, firstState)) {
    return false;
  }
  if (!read(*second_, map_, secondPixels, secondState)) return false;

  OverlapRasterGetDataParallel<T> loop(
      block.width, block.height, block.count,
      {firstPixels.GetData(), firstState.GetData(), secondState.GetData()},
      BlockStrides(interleave, block.width, block.height, block.count), pixels.GetData(),
      state.GetData());
  RunParallelFor(loop);
  return true;
}

}  // namespace lumo
