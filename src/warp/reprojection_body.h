#pragma once

#include <algorithm>
#include <memory>
#include <vector>

#include "foundation/fault.h"
#include "georef/coordsys_log.h"
#include "raster/block_shape.h"
#include "raster/block_states.h"
#include "raster/pixel_states.h"
#include "raster/pixel_value.h"
#include "raster/raster_def.h"
#include "warp/footprint_sampler.h"
#include "warp/reprojection.h"
#include "warp/warp_samplers.h"

namespace lumo {

/// The raster, the block and the grid of a call.
template <typename T>
struct Reprojection<T>::Work {
  Raster<T>& parent;
  const GeoRef& grid;
  RasterDef source;
  SubRectProj rect;  // the whole rectangle, where a part's place counts from
  Array<unsigned> bands;
  Interleave interleave;
  std::vector<T> background;
  WarpTarget<T> target;                // of the whole rectangle
  std::shared_ptr<const WarpMap> map;  // of all positions, or empty
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
/// A rectangle with more pixels is warped in parts, as their positions may have to be kept.
constexpr std::int64_t kWarpMappedPixels = std::int64_t{1} << 20;
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

inline void LogSourceRect(const SubRectProj& rect, const BasicRaster& source) {
  LogCoordSys(CoordSysLog::kReprojection,
              "Reproject:            Src Rect l:%d, r:%d, t:%d, b:%d, pyramid lvl: %d", rect.left,
              rect.right, rect.top, rect.bottom, static_cast<int>(source.GetPyramidDef().level));
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

/// A piece of a mapped part, or some lines of one, that is worked on by one thread.
struct WarpStrip {
  std::size_t piece;
  SubRectProj rect;
  std::size_t positions;  ///< where those of its pixels begin, when each is transformed
};

}  // namespace detail

/// The pieces that the map makes of a part.
template <typename T>
struct Reprojection<T>::MappedPart {
  std::vector<WarpPiece> pieces;
  std::vector<detail::WarpStrip> strips;
  std::vector<double> positions;

  MappedPart(const WarpMap& map, const SubRectProj& part) {
    map.Cut(part, pieces);
    std::size_t points = 0;
    for (std::size_t i = 0; i < pieces.size(); ++i) {
      const SubRectProj& rect = pieces[i].rect;
      constexpr std::int64_t kPixelsOfStrip = 8192;
      const auto lines = static_cast<std::int32_t>(
          std::clamp<std::int64_t>(kPixelsOfStrip / rect.Width(), 1, rect.Height()));
      for (std::int64_t top = rect.top; top <= rect.bottom; top += lines) {
        const auto bottom = std::min<std::int64_t>(top + lines - 1, rect.bottom);
        const SubRectProj strip(rect.left, static_cast<std::int32_t>(top), rect.right,
                                static_cast<std::int32_t>(bottom));
        strips.push_back({i, strip, points});
        if (pieces[i].way == WarpPiece::Way::kTransform) {
          points += 2 * static_cast<std::size_t>(strip.Width() * strip.Height());
        }
      }
    }
    positions.resize(points);
    if (points == 0) return;
    ParallelFor(static_cast<unsigned>(strips.size()), nullptr, [&](unsigned i) {
      if (pieces[strips[i].piece].way != WarpPiece::Way::kTransform) return;
      map.Transform(strips[i].rect, &positions[strips[i].positions]);
    });
  }

  /// Pixels around a position that are read.
  /// @param least  as many as the resampling needs.
  std::int32_t Margin(std::int32_t least, WarpKernel kernel) const {
    if (kernel == WarpKernel::kTold || kernel == WarpKernel::kNearest) return least;
    double reach = least;
    for (const WarpPiece& piece : pieces) {
      if (piece.way == WarpPiece::Way::kOutside) continue;
      const double size = std::max(piece.footprint.width, piece.footprint.height);
      reach = std::max(reach, KernelReach(kernel, size) + 1);
    }
    constexpr double kMost = std::numeric_limits<std::int32_t>::max() / 2;
    return static_cast<std::int32_t>(std::min(std::ceil(reach), kMost));
  }

  /// The pixels of the source on which its positions fall.
  WarpBounds Bounds(const RasterDef& source) const {
    WarpBounds bounds(source.samples, source.lines);
    for (const WarpPiece& piece : pieces) {
      if (piece.way == WarpPiece::Way::kFit) bounds.AddFit(piece);
    }
    bounds.AddPositions(positions.data(), positions.size() / 2);
    return bounds;
  }
};

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
    const std::optional<T> own = background_ ? ToPixel<T>(*background_) : std::nullopt;
    background[i] = own                                ? *own
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
  Work work{parent, *grid, std::move(source), whole, wanted, interleave, background, target, map_};
  work.target.background = work.background.data();

  const Outcome outcome = RunWhole(work);
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
typename Reprojection<T>::Outcome Reprojection<T>::RunWhole(Work& work) const {
  const bool isEachTransformed = method_ == ReprojectionMethod::kRigorous && pixelCentres_;
  if (!work.map && isEachTransformed) {
    const CoveredRect covered =
        BaseSubRectToSecSubRect(work.grid, work.rect, *work.source.geoRef, work.source.samples,
                                work.source.lines, resampling_);
    if (covered.misses && !covered.isPartial) return Outcome::kMissed;
    const GeoRefPtr& grid = outputGrid_ ? outputGrid_ : target_;
    work.map = std::make_shared<WarpMap>(grid, work.source.geoRef, work.source.samples,
                                         work.source.lines, 0.0, Form::kTold);
  }
  return work.map ? RunMapped(work, work.rect) : RunPart(work, work.rect);
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
    if (CanHalve(part)) return RunHalves(work, part);
    covered = cover(true);
  }
  if (covered.misses) {
    detail::FillBackground(detail::TargetOf(work.target, work.rect, part), part);
    return Outcome::kMissed;
  }
  const SubRectProj& from = covered.rect;
  detail::LogSourceRect(from, work.parent);
  const std::uint64_t bytes = static_cast<std::uint64_t>(from.Width() * from.Height()) *
                              work.bands.GetCount() * (sizeof(T) + 1);
  if (bytes > detail::kWarpWindowBytes && CanHalve(part)) return RunHalves(work, part);
  std::unique_ptr<Window> window = TakeWindow();
  const bool fetched = Fetch(work, from, *window);
  if (fetched) SamplePart(work, *window, part);
  GiveBack(std::move(window));
  return fetched ? Outcome::kDone : Outcome::kFailed;
}

template <typename T>
typename Reprojection<T>::Outcome Reprojection<T>::RunMapped(Work& work,
                                                             const SubRectProj& part) const {
  if (part.Width() * part.Height() > detail::kWarpMappedPixels && CanHalve(part)) {
    return RunHalves(work, part);
  }
  const MappedPart mapped(*work.map, part);
  const WarpBounds bounds = mapped.Bounds(work.source);
  if (bounds.IsEmpty()) {
    detail::FillBackground(detail::TargetOf(work.target, work.rect, part), part);
    return Outcome::kMissed;
  }
  const SubRectProj from = bounds.Pixels(mapped.Margin(SamplingMargin(resampling_), kernel_));
  detail::LogSourceRect(from, work.parent);
  const std::uint64_t bytes = static_cast<std::uint64_t>(from.Width() * from.Height()) *
                              work.bands.GetCount() * (sizeof(T) + 1);
  if (bytes > detail::kWarpWindowBytes && CanHalve(part)) return RunHalves(work, part);
  std::unique_ptr<Window> window = TakeWindow();
  const bool fetched = Fetch(work, from, *window);
  if (fetched) SampleMapped(work, *window, mapped);
  GiveBack(std::move(window));
  return fetched ? Outcome::kDone : Outcome::kFailed;
}

template <typename T>
void Reprojection<T>::SampleMapped(Work& work, const Window& window,
                                   const MappedPart& mapped) const {
  const SubRectProj all(0, 0, static_cast<std::int32_t>(work.source.samples) - 1,
                        static_cast<std::int32_t>(work.source.lines) - 1);
  ParallelFor(static_cast<unsigned>(mapped.strips.size()), nullptr, [&](unsigned i) {
    const detail::WarpStrip& strip = mapped.strips[i];
    const WarpPiece& piece = mapped.pieces[strip.piece];
    const WarpTarget<T> target = detail::TargetOf(work.target, work.rect, strip.rect);
    if (piece.way == WarpPiece::Way::kOutside) {
      detail::FillBackground(target, strip.rect);
      return;
    }
    // A polynomial moves edges by far more than noise.
    const bool isTransform = piece.way == WarpPiece::Way::kTransform;
    const double noise = work.map->IsAffine() ? WarpLimits::kAffineNoise
                         : isTransform        ? WarpLimits::kTransformNoise
                                              : 0.0;
    const auto width = static_cast<unsigned>(strip.rect.Width());
    const WarpPositions positions =
        isTransform ? WarpPositions(&mapped.positions[strip.positions], width)
                    : WarpPositions(piece.fit, width, double(strip.rect.left) - piece.originX + 0.5,
                                    double(strip.rect.top) - piece.originY + 0.5);
    const auto lines = static_cast<unsigned>(strip.rect.Height());
    const WarpRule rule = RuleOf(piece);
    const bool isOfFootprints = IsOfFootprints(rule);
    MakeSampler(positions, lines, LimitsIn(all, noise, isOfFootprints), window.source, target, rule)
        ->Body(0, lines);
  });
}

template <typename T>
typename Reprojection<T>::Outcome Reprojection<T>::RunHalves(Work& work,
                                                             const SubRectProj& part) const {
  const auto run = [&](const SubRectProj& half) {
    return work.map ? RunMapped(work, half) : RunPart(work, half);
  };
  const Outcome first = run(detail::HalfOf(part, false));
  if (first == Outcome::kFailed) return first;
  const Outcome second = run(detail::HalfOf(part, true));
  return second == Outcome::kMissed ? first : second;
}

template <typename T>
Reprojection<T>::Reprojection(const GeoRefPtr& target, ReprojectionMethod method,
                              PyramidResamplingMethod resampling)
    : target_(target), method_(method), resampling_(resampling) {}

template <typename T>
Reprojection<T>::~Reprojection() = default;

template <typename T>
void Reprojection<T>::SetKernel(WarpKernel kernel) {
  kernel_ = kernel;
  if (kernel == WarpKernel::kTold) return;
  sampling_ = WarpSampling::kCentred;
  using enum PyramidResamplingMethod;
  resampling_ = kernel == WarpKernel::kNearest  ? kNearest
                : kernel == WarpKernel::kLinear ? kLinear
                                                : kCubic;
}

/// Footprints may be so large that only a few pixels go together.
template <typename T>
bool Reprojection<T>::CanHalve(const SubRectProj& part) const {
  const std::int64_t least = kernel_ == WarpKernel::kTold ? detail::kWarpLeastSide : 1;
  return std::max(part.Width(), part.Height()) > least;
}

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
  BlockStates states(window.state);
  if (!GetBlockOf(work.parent, block, work.bands, work.interleave, window.pixels, states)) {
    return false;
  }
  const bool hasStates = states.AreMade();
  if (window.pixels.GetCount() != elements || (hasStates && window.state.GetCount() != elements)) {
    return false;
  }
  const bool allValid = !hasStates || AllValid(window.state.GetData(), elements);
  window.source = {window.pixels.GetData(), allValid ? nullptr : window.state.GetData(), rect,
                   BlockStrides(work.interleave, width, height, work.bands.GetCount())};
  return true;
}

template <typename T>
WarpRule Reprojection<T>::RuleOf(const WarpPiece& piece) const {
  return {sampling_, kernel_, piece.footprint};
}

template <typename T>
WarpLimits Reprojection<T>::LimitsIn(const SubRectProj& pixels, double noise,
                                     bool isOfFootprints) const {
  const bool isNearest = resampling_ == PyramidResamplingMethod::kNearest;
  const bool isCorner = sampling_ == WarpSampling::kCorner;
  const int last = isNearest && isCorner && method_ == ReprojectionMethod::kRigorous ? 0 : 1;
  return {double(pixels.left),
          double(pixels.top),
          double(pixels.right) + last,
          double(pixels.bottom) + last,
          isNearest || isCorner || isOfFootprints ? 0.0 : 0.5,
          noise};
}

template <typename T>
std::unique_ptr<WarpParallel<T>> Reprojection<T>::MakeSampler(
    const WarpPositions& positions, unsigned lines, const WarpLimits& limits,
    const WarpSource<T>& source, const WarpTarget<T>& target, const WarpRule& rule) const {
  const auto make = [&]<typename Sampler>() {
    return std::make_unique<Sampler>(positions, lines, limits, source, target, rule);
  };
  if (IsOfFootprints(rule)) return make.template operator()<FootprintParallel<T>>();
  if (resampling_ == PyramidResamplingMethod::kNearest) {
    return make.template operator()<NearestNeighborParallel<T>>();
  }
  if (resampling_ == PyramidResamplingMethod::kLinear) {
    return make.template operator()<LinearInterpolateParallel<T>>();
  }
  return make.template operator()<CubicInterpolateParallel<T>>();
}

template <typename T>
void Reprojection<T>::SamplePart(Work& work, const Window& window, const SubRectProj& part) const {
  const GeoRef& source = *work.source.geoRef;
  const auto width = static_cast<unsigned>(part.Width());
  const bool isRigorous = method_ == ReprojectionMethod::kRigorous;
  WarpPolynomial fit;
  WarpPositions positions(work.grid, source, part, Centre());
  const std::optional<AffineLink> affine =
      isRigorous ? std::nullopt : FindAffineLink(work.grid, source);
  if (affine) {
    fit = PolynomialOf(*affine);
    positions = WarpPositions(fit, width, part.left + Centre(), part.top + Centre());
  } else if (!isRigorous) {
    const bool isWhole = part.Width() == work.rect.Width() && part.Height() == work.rect.Height();
    SubRectProj points = window.source.window;
    if (!isWhole) {
      const CoveredRect covered = BaseSubRectToSecSubRect(
          work.grid, part, source, work.source.samples, work.source.lines, resampling_);
      if (!covered.misses) points = covered.rect;
    }
    if (FitWarp(work.grid, part, source, points, Centre(), fit)) {
      positions = WarpPositions(fit, width, Centre(), Centre());
    }
  }
  const WarpTarget<T> target = detail::TargetOf(work.target, work.rect, part);
  const auto sampler =
      MakeSampler(positions, static_cast<unsigned>(part.Height()),
                  LimitsIn(window.source.window, affine ? WarpLimits::kAffineNoise : 0.0),
                  window.source, target, {sampling_});
  RunParallelFor(*sampler);
}

}  // namespace lumo
