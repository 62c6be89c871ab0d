#pragma once

#include <algorithm>
#include <limits>

#include "foundation/fault.h"
#include "pyramid/exact_levels.h"
#include "raster/pixel_value.h"
#include "raster/raster_details.h"
#include "warp/projected_raster.h"

namespace lumo {

namespace detail {

/// The methods and resamplings that there are.
inline ReprojectionMethod KnownMethod(ReprojectionMethod method) {
  return method == ReprojectionMethod::kRigorous ? method : ReprojectionMethod::kPolynomial;
}
inline PyramidResamplingMethod KnownResampling(PyramidResamplingMethod resampling) {
  const bool known = resampling == PyramidResamplingMethod::kLinear ||
                     resampling == PyramidResamplingMethod::kCubic;
  return known ? resampling : PyramidResamplingMethod::kNearest;
}

}  // namespace detail

template <typename T>
ProjectedRaster<T>::ProjectedRaster(const RasterPtr<T>& parent, const GeoRefPtr& target,
                                    ReprojectionMethod method, PyramidResamplingMethod resampling,
                                    const ProjectedRasterOptions& options)
    : ComputedRaster<T>(parent, options.grid == ProjectedGrid::kExact
                                    ? ComputedRaster<T>::StatsOf::kThis
                                    : ComputedRaster<T>::StatsOf::kParent),
      target_(CloneOf(target)),
      method_(detail::KnownMethod(method)),
      resampling_(detail::KnownResampling(resampling)),
      options_(options),
      reprojection_(target_, method_, resampling_) {
  if (SetUp()) return;
  this->ResetParent();
  def_.Clear();
}

template <typename T>
bool ProjectedRaster<T>::SetUp() {
  const RasterPtr<T>& parent = this->Parent();
  if (parent.IsNull() || target_.IsNull()) return false;
  if (target_->GetType() != GeoRef::kStd) {
    SetFault("the grid of a reprojection isn't a plain one");
    return false;
  }
  def_ = parent->GetRasterDef();
  if (def_.geoRef.IsNull()) {
    SetFault("the raster to be reprojected has no geo-reference");
    return false;
  }
  tiles_ = parent->TileDimensions();
  GeoRefPtr grid;
  if (options_.grid == ProjectedGrid::kExact) {
    constexpr unsigned kSquares = 256;
    grid = CloneOf(target_);
    const bool isRigorous = method_ == ReprojectionMethod::kRigorous;
    const auto map = std::make_shared<WarpMap>(grid, def_.geoRef, def_.samples, def_.lines,
                                               isRigorous ? 0.0 : WarpMap::kUsualTolerance);
    if (options_.kernel != WarpKernel::kTold) map->MeasureFootprints();
    reprojection_.SetMap(map);
    def_.tileWidth = def_.tileHeight = kSquares;  // squares cover least of a turned source
  } else {
    grid = ComputedGrid(*def_.geoRef);
  }
  constexpr unsigned kMost = std::numeric_limits<std::int32_t>::max();
  if (grid.IsNull() || grid->Samples() - 1 >= kMost || grid->Lines() - 1 >= kMost) {
    SetFault("the raster can't be carried to the grid of the reprojection");
    return false;
  }
  def_.samples = grid->Samples();
  def_.lines = grid->Lines();
  def_.SetGeoRef(grid);
  KeepDetails(def_.metadata, KeptDetails::kBands);
  if (options_.noData) {
    for (unsigned band = 0; band < def_.bands; ++band) def_.noData[band] = *options_.noData;
    reprojection_.SetBackground(*options_.noData);
  }
  reprojection_.SetSampling(options_.sampling);
  if (options_.grid == ProjectedGrid::kExact) reprojection_.SetKernel(options_.kernel);
  reprojection_.SetOutputGrid(def_.geoRef);
  return true;
}

/// The target's system with a tie point, a pixel size and a size that show all of the parent; null
/// when it can't be carried there.
template <typename T>
GeoRefPtr ProjectedRaster<T>::ComputedGrid(const GeoRef& source) const {
  OutputGrid computed;
  if (!ComputeOutputGrid(*target_, source, def_.samples, def_.lines, computed)) return {};
  const GeoRefPtr grid = CloneOf(target_);
  grid->SetTieMap(computed.tieX, computed.tieY);
  grid->SetTiePixel(0, 0);
  grid->SetPixelSize(computed.pixelSizeX, computed.pixelSizeY);
  grid->SetDimensions(computed.samples, computed.lines);
  return grid;
}

template <typename T>
bool ProjectedRaster<T>::HasNoDataValue(unsigned band) const {
  if (!options_.noData) return ComputedRaster<T>::HasNoDataValue(band);
  return band < def_.bands && ToPixel<T>(*options_.noData).has_value();
}

template <typename T>
T ProjectedRaster<T>::NoDataValue(unsigned band) const {
  return options_.noData ? ToPixel<T>(*options_.noData).value_or(T())
                         : ComputedRaster<T>::NoDataValue(band);
}

template <typename T>
RasterPtr<T> ProjectedRaster<T>::PyramidLevel(unsigned level) {
  const ExactLevels exactly(options_.grid == ProjectedGrid::kExact);
  return OnLevel(ComputedRaster<T>::PyramidLevel(level));
}

template <typename T>
RasterPtr<T> ProjectedRaster<T>::StoredPyramidLevel(unsigned level) {
  const ExactLevels exactly(options_.grid == ProjectedGrid::kExact);
  return OnLevel(ComputedRaster<T>::StoredPyramidLevel(level));
}

/// This view over a level of the parent; empty over none.
template <typename T>
RasterPtr<T> ProjectedRaster<T>::OnLevel(const RasterPtr<T>& level) const {
  if (level.IsNull()) return {};
  const GeoRefPtr target = CloneOf(target_);
  if (options_.grid == ProjectedGrid::kExact && level->Samples() != 0 && level->Lines() != 0) {
    const auto reduced = [](unsigned size, unsigned parent, unsigned ofLevel) {
      return std::max(1U, static_cast<unsigned>(std::uint64_t{size} * ofLevel / parent));
    };
    const unsigned samples =
        reduced(target->Samples(), this->Parent()->Samples(), level->Samples());
    const unsigned lines = reduced(target->Lines(), this->Parent()->Lines(), level->Lines());
    const double scaleX = double(target->Samples()) / samples;
    const double scaleY = double(target->Lines()) / lines;
    target->SetTiePixel(target->TiePixelX() / scaleX, target->TiePixelY() / scaleY);
    target->SetPixelSize(target->PixelSizeX() * scaleX, target->PixelSizeY() * scaleY);
    target->SetDimensions(samples, lines);
  }
  const RasterPtr<T> view(new ProjectedRaster(level, target, method_, resampling_, options_));
  return view->IsValid() ? view : RasterPtr<T>();
}

template <typename T>
bool ProjectedRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                    Interleave interleave, Array<T>& pixels,
                                    Array<unsigned char>& state) {
  const RasterPtr<T>& parent = this->Parent();
  if (parent.IsNull()) return false;
  const SubRect ordered(rect.left, rect.top, rect.right, rect.bottom);
  using Outcome = typename Reprojection<T>::Outcome;
  const Outcome outcome = reprojection_.Run(*parent, ordered, bands, interleave, pixels, state);
  return outcome == Outcome::kDone ||
         (outcome == Outcome::kMissed && options_.grid == ProjectedGrid::kExact);
}

}  // namespace lumo
