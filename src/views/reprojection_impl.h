#pragma once

#include <algorithm>
#include <vector>

#include "data/block_shape.h"
#include "foundation/fault.h"
#include "georef/coordsys_log.h"
#include "raster/raster_def.h"
#include "stats/plane_kernels.h"
#include "views/reprojection.h"
#include "views/warp_samplers.h"

namespace lumo {

/// What a call works on.
template <typename T>
struct Reprojection<T>::Work {
  Raster<T>& parent;
  const GeoRef& grid;
  RasterDef source;
  SubRectProj rect;  // the whole rectangle, where a part's place counts from
  Array<unsigned> bands;
  Interleave interleave;
  std::vector<T> background;
  WarpTarget<T> target;  // of the whole rectangle
};

/// A block of the source.
template <typename T>
struct Reprojection<T>::Window {
  Array<T> pixels;
  Array<unsigned char> state;
  WarpSource<T> source;
};

namespace detail {

/// Above it a rectangle is warped in parts, so that memory stays bounded when a small rectangle
/// covers much of the source.
constexpr std::uint64_t kWarpWindowBytes = std::uint64_t{96} << 20;
/// Rectangles up to it are not cut any more.
constexpr std::int64_t kWarpLeastSide = 32;

/// The first or second half of a rectangle, cut across its longer side.
inline SubRectProj HalfOf(const SubRectProj& rect, bool second) {
  SubRectProj half = rect;
  const bool wide = rect.Width() >= rect.Height();
  std::int32_t& low = wide ? half.left : half.top;
  std::int32_t& high = wide ? half.right : half.bottom;
  const std::int32_t middle = low + (high - low) / 2;
  (second ? low : high) = second ? middle + 1 : middle;
  return half;
}

inline bool CanHalve(const SubRectProj& rect) {
  return std::max(rect.Width(), rect.Height()) > kWarpLeastSide;
}

/// Makes pixels of a rectangle that lie outside the source.
template <typename T>
void FillBackground(const WarpTarget<T>& target, const SubRectProj& rect) {
  for (unsigned band = 0; band < target.bands; ++band) {
    for (std::int64_t line = 0; line < rect.Height(); ++line) {
      std::size_t at =
          band * target.strides.band + static_cast<std::size_t>(line) * target.strides.line;
      for (std::int64_t x = 0; x < rect.Width(); ++x, at += target.strides.pixel) {
        target.pixels[at] = target.background[band];
        target.state[at] = PixelValueState::NoData;
      }
    }
  }
}

/// The place of a part in the block of the whole rectangle.
template <typename T>
WarpTarget<T> TargetOf(const WarpTarget<T>& whole, const SubRectProj& rect,
                       const SubRectProj& part) {
  const std::size_t at = static_cast<std::size_t>(part.top - rect.top) * whole.strides.line +
                         static_cast<std::size_t>(part.left - rect.left) * whole.strides.pixel;
  WarpTarget<T> target = whole;
  target.pixels += at;
  target.state += at;
  return target;
}

}  // namespace detail

template <typename T>
typename Reprojection<T>::Outcome Reprojection<T>::Run(Raster<T>& parent, const SubRect& rect,
                                                       const Array<unsigned>& bands,
                                                       Interleave interleave, Array<T>& data,
                                                       Array<unsigned char>& state) const {
  const GeoRefPtr& grid = outputGrid_ ? outputGrid_ : target_;
  constexpr unsigned kMost = std::numeric_limits<std::int32_t>::max();
  RasterDef source = parent.GetRasterDef();
  if (!grid || !source.geoRef || rect.right > kMost || rect.bottom > kMost) return Outcome::kFailed;
  const BlockShape block(rect, bands, interleave);
  if (!block.Size(data, state)) return Outcome::kFailed;
  const Array<unsigned>& wanted = block.bands;
  std::fill(state.begin(), state.end(), static_cast<unsigned char>(PixelValueState::Valid));

  std::vector<T> background(wanted.GetCount());
  for (unsigned i = 0; i < wanted.GetCount(); ++i) {
    background[i] = background_                        ? static_cast<T>(*background_)
                    : parent.HasNoDataValue(wanted[i]) ? parent.NoDataValue(wanted[i])
                                                       : T();
  }
  const SubRectProj whole(static_cast<std::int32_t>(rect.left), static_cast<std::int32_t>(rect.top),
                          static_cast<std::int32_t>(rect.right),
                          static_cast<std::int32_t>(rect.bottom));
  const WarpTarget<T> target{
      data.GetData(), state.GetData(),
      BlockStrides(interleave, rect.Width(), rect.Height(), wanted.GetCount()), wanted.GetCount(),
      background.data()};
  Work work{parent, *grid, std::move(source), whole, wanted, interleave, background, target};
  work.target.background = work.background.data();

  const Outcome outcome = RunPart(work, whole);
  if (outcome == Outcome::kDone) return outcome;
  detail::FillBackground(work.target, whole);
  if (outcome == Outcome::kMissed) {
    LogCoordSys(CoordSysLog::kErrors, "Reproject: Error: Bounds err in BaseSubRectToSecSubRect.");
  } else {
    LogCoordSys(CoordSysLog::kReprojection,
                "Reproject: Error: GetSubRect on parent raster failed.");
  }
  return outcome;
}

template <typename T>
typename Reprojection<T>::Outcome Reprojection<T>::RunPart(Work& work,
                                                           const SubRectProj& part) const {
  const auto cover = [&](bool everyPixel) {
    return BaseSubRectToSecSubRect(work.grid, part, *work.source.geoRef, work.source.samples,
                                   work.source.lines, resampling_, everyPixel);
  };
  CoveredRect covered = cover(false);
  if (covered.isPartial) {
    if (detail::CanHalve(part)) return RunHalves(work, part);
    covered = cover(true);
  }
  if (covered.misses) {
    detail::FillBackground(detail::TargetOf(work.target, work.rect, part), part);
    return Outcome::kMissed;
  }
  const SubRectProj& from = covered.rect;
  LogCoordSys(CoordSysLog::kReprojection,
              "Reproject:            Src Rect l:%d, r:%d, t:%d, b:%d, pyramid lvl: %d", from.left,
              from.right, from.top, from.bottom,
              static_cast<int>(work.parent.GetPyramidDef().level));
  const std::uint64_t bytes = static_cast<std::uint64_t>(from.Width() * from.Height()) *
                              work.bands.GetCount() * (sizeof(T) + 1);
  if (bytes > detail::kWarpWindowBytes && detail::CanHalve(part)) return RunHalves(work, part);
  std::unique_ptr<Window> window = TakeWindow();
  const bool fetched = Fetch(work, from, *window);
  if (fetched) SamplePart(work, *window, part);
  GiveBack(std::move(window));
  return fetched ? Outcome::kDone : Outcome::kFailed;
}

template <typename T>
typename Reprojection<T>::Outcome Reprojection<T>::RunHalves(Work& work,
                                                             const SubRectProj& part) const {
  const Outcome first = RunPart(work, detail::HalfOf(part, false));
  if (first == Outcome::kFailed) return first;
  const Outcome second = RunPart(work, detail::HalfOf(part, true));
  return second == Outcome::kMissed ? first : second;
}

template <typename T>
Reprojection<T>::Reprojection(const GeoRefPtr& target, ReprojectionMethod method,
                              PyramidResamplingMethod resampling)
    : target_(target), method_(method), resampling_(resampling) {}

template <typename T>
Reprojection<T>::~Reprojection() = default;

template <typename T>
std::unique_ptr<typename Reprojection<T>::Window> Reprojection<T>::TakeWindow() const {
  const std::lock_guard lock(windowsLock_);
  if (windows_.empty()) return std::make_unique<Window>();
  std::unique_ptr<Window> window = std::move(windows_.back());
  windows_.pop_back();
  return window;
}

template <typename T>
void Reprojection<T>::GiveBack(std::unique_ptr<Window> window) const {
  constexpr std::size_t kKept = 4;
  const std::lock_guard lock(windowsLock_);
  if (windows_.size() < kKept) windows_.push_back(std::move(window));
}

template <typename T>
bool Reprojection<T>::Fetch(Work& work, const SubRectProj& rect, Window& window) const {
  const auto width = static_cast<std::size_t>(rect.Width());
  const auto height = static_cast<std::size_t>(rect.Height());
  const std::size_t elements = width * height * work.bands.GetCount();
  if (elements > std::numeric_limits<std::uint32_t>::max()) {
    SetFault("a few pixels cover too much of the source to be warped");
    return false;
  }
  const SubRect block(static_cast<unsigned>(rect.left), static_cast<unsigned>(rect.top),
                      static_cast<unsigned>(rect.right), static_cast<unsigned>(rect.bottom));
  if (!work.parent.GetSubRect(block, work.bands, work.interleave, window.pixels, window.state)) {
    return false;
  }
  if (window.pixels.GetCount() != elements || window.state.GetCount() != elements) return false;
  const bool allValid = AllValid(window.state.GetData(), elements);
  window.source = {window.pixels.GetData(), allValid ? nullptr : window.state.GetData(), rect,
                   BlockStrides(work.interleave, width, height, work.bands.GetCount())};
  return true;
}

template <typename T>
void Reprojection<T>::SamplePart(Work& work, const Window& window, const SubRectProj& part) const {
  const GeoRef& source = *work.source.geoRef;
  bool byPolynomial = method_ != ReprojectionMethod::kRigorous;
  WarpPolynomial fit;
  if (byPolynomial) {
    const bool isWhole = part.Width() == work.rect.Width() && part.Height() == work.rect.Height();
    SubRectProj points = window.source.window;
    if (!isWhole) {
      const CoveredRect covered = BaseSubRectToSecSubRect(
          work.grid, part, source, work.source.samples, work.source.lines, resampling_);
      if (!covered.misses) points = covered.rect;
    }
    byPolynomial = FitWarp(work.grid, part, source, points, Centre(), fit);
    if (byPolynomial && fit.worst > tolerance_) {
      if (detail::CanHalve(part)) {
        SamplePart(work, window, detail::HalfOf(part, false));
        SamplePart(work, window, detail::HalfOf(part, true));
        return;
      }
      byPolynomial = false;
    }
  }
  const auto width = static_cast<unsigned>(part.Width());
  const WarpPositions positions = byPolynomial ? WarpPositions(fit, width, Centre())
                                               : WarpPositions(work.grid, source, part, Centre());
  const bool isNearest = resampling_ == PyramidResamplingMethod::kNearest;
  const bool isCorner = sampling_ == WarpSampling::kCorner;
  const SubRectProj& from = window.source.window;
  const int last = isNearest && isCorner && method_ == ReprojectionMethod::kRigorous ? 0 : 1;
  const WarpLimits limits{double(from.left), double(from.top), double(from.right) + last,
                          double(from.bottom) + last, isNearest || isCorner ? 0.0 : 0.5};
  const WarpTarget<T> target = detail::TargetOf(work.target, work.rect, part);
  const auto lines = static_cast<unsigned>(part.Height());
  if (isNearest) {
    NearestNeighborParallel<T> loop(positions, lines, limits, window.source, target, sampling_);
    RunParallelFor(loop);
  } else if (resampling_ == PyramidResamplingMethod::kLinear) {
    LinearInterpolateParallel<T> loop(positions, lines, limits, window.source, target, sampling_);
    RunParallelFor(loop);
  } else {
    CubicInterpolateParallel<T> loop(positions, lines, limits, window.source, target, sampling_);
    RunParallelFor(loop);
  }
}

}  // namespace lumo
