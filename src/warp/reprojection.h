#pragma once

#include <cmath>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "raster/raster.h"
#include "warp/warp_map.h"

namespace lumo {

struct WarpLimits;
struct WarpRule;
class WarpPositions;
template <typename T>
class WarpParallel;
template <typename T>
struct WarpSource;
template <typename T>
struct WarpTarget;

/// Names the ways in which a sampler reads the neighbours of a position.
enum class WarpSampling : unsigned {
  /// Linear and cubic weigh from the corners of pixels and round toward zero; a pixel's state is
  /// that of the pixel it falls into. A rigorous nearest leaves out the last column and line.
  kCorner = 0,
  /// Linear and cubic weigh from the centres of pixels and round to the nearest number; neighbours
  /// that are not valid are left out.
  kCentred = 1
};

VEXG_EXPORT std::span<const EnumWord<WarpSampling>> WordsOf(WarpSampling);

/// Shows pixels of a raster in the grid of another geo-reference: maps a rectangle of the grid back
/// to the raster, reads what it covers, works out where every pixel falls, and resamples. Exists
/// for EightTypes.
///
/// At first a polynomial is fitted to each rectangle that is asked for, so that a pixel's position
/// depends on the rectangle too. With SetMap it depends on the pixel alone, as it always does
/// within one coordinate system and by the rigorous method.
///
/// A pixel of the source holds the positions from its left and upper edge up to the next pixel's,
/// that one's edge left out; WarpLimits::noise says how positions by an affine map, or by the
/// transforms of a WarpMap, are freed from the errors of arithmetic.
///
/// Threads:   Reproject may run on many threads at once, where the raster allows it.
/// Failure:   see Reproject. A polynomial that can't be fitted is replaced by the rigorous method
///            for that rectangle.
template <typename T>
class Reprojection {
 public:
  /// The outcome for a rectangle.
  enum class Outcome {
    kDone,    ///< its pixels are there
    kMissed,  ///< it lies outside the raster
    kFailed   ///< the raster could not be read
  };

  /// @param resampling  kNearest, kLinear, or else kCubic.
  Reprojection(const GeoRefPtr& target, ReprojectionMethod method,
               PyramidResamplingMethod resampling);
  ~Reprojection();
  Reprojection(const Reprojection&) = delete;
  Reprojection& operator=(const Reprojection&) = delete;

  /// Shows another grid of the target's system in place of the target.
  void SetOutputGrid(const GeoRefPtr& grid) { outputGrid_ = grid; }
  /// Takes positions at the centre of each pixel, as at first, or at its corner.
  void SetPixelCentres(bool at) { pixelCentres_ = at; }
  /// Chooses how neighbours are read, kCorner at first.
  void SetSampling(WarpSampling sampling) { sampling_ = sampling; }
  /// Has positions come from a map of the grid, of the raster that Reproject is given, and no
  /// longer from the method.
  void SetMap(std::shared_ptr<const WarpMap> map) { map_ = std::move(map); }
  /// Replaces the resampling by a kernel that reads from centres. It wants a map, and one that
  /// widens wants a map that measures footprints.
  void SetKernel(WarpKernel kernel);
  /// Sets the value of pixels outside the source; at first, and with one that T can't hold, it is
  /// the source's no-data value, or 0.
  void SetBackground(double value) { background_ = value; }

  /// Fills a rectangle of the grid from the raster.
  /// @param rect  normalised; width by height pixels of the grid.
  /// @param data,state  [out] resized to the block. A pixel outside the raster has the background
  ///                    value and state NoData.
  /// @return false when the rectangle misses the raster or that can't be read; all pixels are then
  ///         outside. False with no block where there is no grid, or no memory.
  bool Reproject(Raster<T>& parent, const SubRect& rect, const Array<unsigned>& bands,
                 Interleave interleave, Array<T>& data, Array<unsigned char>& state) const {
    return Run(parent, rect, bands, interleave, data, state) == Outcome::kDone;
  }

  /// Does the same, and distinguishes a rectangle that misses the raster from one that can't be
  /// read.
  Outcome Run(Raster<T>& parent, const SubRect& rect, const Array<unsigned>& bands,
              Interleave interleave, Array<T>& data, Array<unsigned char>& state) const;

 private:
  struct Work;
  struct Window;

  struct MappedPart;

  Outcome RunWhole(Work& work) const;
  Outcome RunPart(Work& work, const SubRectProj& part) const;
  Outcome RunMapped(Work& work, const SubRectProj& part) const;
  Outcome RunHalves(Work& work, const SubRectProj& part) const;
  bool Fetch(Work& work, const SubRectProj& rect, Window& window) const;
  void SamplePart(Work& work, const Window& window, const SubRectProj& part) const;
  void SampleMapped(Work& work, const Window& window, const MappedPart& mapped) const;
  std::unique_ptr<WarpParallel<T>> MakeSampler(const WarpPositions& positions, unsigned lines,
                                               const WarpLimits& limits,
                                               const WarpSource<T>& source,
                                               const WarpTarget<T>& target,
                                               const WarpRule& rule) const;
  bool CanHalve(const SubRectProj& part) const;
  WarpRule RuleOf(const WarpPiece& piece) const;
  WarpLimits LimitsIn(const SubRectProj& pixels, double noise, bool isOfFootprints = false) const;
  std::unique_ptr<Window> TakeWindow() const;
  void GiveBack(std::unique_ptr<Window> window) const;

  double Centre() const { return pixelCentres_ ? 0.5 : 0.0; }

  GeoRefPtr target_;
  ReprojectionMethod method_;
  PyramidResamplingMethod resampling_;
  GeoRefPtr outputGrid_;
  bool pixelCentres_ = true;
  WarpSampling sampling_ = WarpSampling::kCorner;
  WarpKernel kernel_ = WarpKernel::kTold;
  std::shared_ptr<const WarpMap> map_;
  std::optional<double> background_;
  mutable std::mutex windowsLock_;
  mutable std::vector<std::unique_ptr<Window>> windows_;  // not in use; their memory is used again
};

VEXG_EXTERN(EIGHT, Reprojection);

}  // namespace lumo
