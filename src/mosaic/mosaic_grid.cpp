#include "mosaic/mosaic_grid.h"

#include <algorithm>
#include <cmath>

#include "georef/covering_grid.h"
#include "mosaic/raster_outline.h"

namespace lumo {
namespace {

/// True for a grid whose lines run along the map.
bool IsPlain(const GeoRef& model) {
  return model.GetType() == GeoRef::kStd && model.Rotation() == 0;
}

RasterDef DefOf(const MosaicScene& scene) {
  RasterDef def;
  def.samples = scene.header.samples;
  def.lines = scene.header.lines;
  def.SetGeoRef(scene.header.geoRef);
  return def;
}

/// A box of pixels that grows.
struct GrowingBox {
  double low[2], high[2];

  /// Takes the whole pixels in that hold a raster; false when no part of it can be carried.
  bool Add(const GeoRef& grid, const RasterDef& def) {
    constexpr double kNoise = 1e-3;  // pixels
    const auto outline = OutlineIn(grid, def);
    for (const std::array<double, 2>& point : outline) {
      for (const unsigned axis : {0U, 1U}) {
        low[axis] = std::min(low[axis], std::floor(point[axis] + kNoise));
        high[axis] = std::max(high[axis], std::ceil(point[axis] - kNoise));
      }
    }
    return !outline.empty();
  }
};

}  // namespace

GeoRefPtr ChooseMosaicGrid(const std::vector<MosaicScene>& scenes, const MosaicGridWish& wish,
                           std::string& fault) {
  const MosaicSceneHeader& first = scenes.front().header;
  const CoordSys& system = wish.system.IsEmpty() ? first.geoRef->CoordinateSystem() : wish.system;
  const bool isOwn = wish.system.IsEmpty() && wish.pixelSize == 0 && IsPlain(*first.geoRef);
  const GeoRefPtr grid =
      isOwn ? CloneOf(first.geoRef) : CoveringGrid(*first.geoRef, system, wish.pixelSize);
  if (!grid) {
    fault = scenes.front().file + ": the raster can't be carried to the grid of the mosaic";
    return {};
  }
  GrowingBox box{{0, 0}, {double(grid->Samples()), double(grid->Lines())}};
  for (const MosaicScene& scene : scenes) {
    if (&scene == &scenes.front() || box.Add(*grid, DefOf(scene))) continue;
    fault = scene.file + ": the raster can't be carried to the grid of the mosaic";
    return {};
  }
  constexpr double kMost = 0x7FFFFFFF;
  const double samples = box.high[0] - box.low[0], lines = box.high[1] - box.low[1];
  if (!(samples <= kMost && lines <= kMost)) {
    fault = "the grid of the mosaic would have more than 2^31 - 1 samples or lines";
    return {};
  }
  double mapX = 0, mapY = 0;
  if (!grid->PixelToMap(box.low[0], box.low[1], mapX, mapY)) {
    fault = "the grid of the mosaic has no corner on the map";
    return {};
  }
  grid->SetDimensions(0, 0);
  grid->SetTieMap(mapX, mapY);
  grid->SetTiePixel(0, 0);
  grid->SetDimensions(static_cast<unsigned>(samples), static_cast<unsigned>(lines));
  return grid;
}

}  // namespace lumo
