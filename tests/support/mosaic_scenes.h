#pragma once

#include "mosaic/mosaic_raster.h"
#include "support/placed_raster.h"
#include "views/spatial_subset_raster.h"

namespace lumo::test {

/// A scene in memory with statistics and histograms of its own; pixels of the no-data value, where
/// there is one, don't count.
template <typename T>
RasterPtr<T> MakeScene(const GeoRefPtr& grid, unsigned bands,
                       const typename PlacedRaster<T>::Value& value,
                       std::optional<T> noData = std::nullopt) {
  const auto placed = MakePlaced<T>(grid, bands, value);
  placed->noData = noData;
  for (std::size_t i = 0; i < placed->pixels.size(); ++i) {
    if (noData && placed->pixels[i] == *noData) placed->states[i] = PixelValueState::NoData;
  }
  return RasterPtr<T>(new SpatialSubsetRaster<T>(
      RasterPtr<T>(placed), SubRect(0, 0, grid->Samples() - 1, grid->Lines() - 1)));
}

/// A mosaic of scenes on a grid.
template <typename T>
MosaicRasterPtr<T> MakeMosaic(const std::vector<RasterPtr<T>>& scenes, const GeoRefPtr& grid,
                              const MosaicSettings& settings) {
  Array<RasterPtr<T>> list{ArrayDims(static_cast<unsigned>(scenes.size()))};
  std::copy(scenes.begin(), scenes.end(), list.begin());
  RasterDef def;
  def.samples = grid->Samples();
  def.lines = grid->Lines();
  def.bands = scenes.front() ? scenes.front()->Bands() : 1;
  def.SetGeoRef(grid);
  return MosaicRasterPtr<T>(
      new MosaicRaster<T>(MosaicRasterDefPtr<T>(new MosaicRasterDef<T>(list, settings)), def));
}

}  // namespace lumo::test
