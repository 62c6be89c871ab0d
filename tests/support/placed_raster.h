#pragma once

#include <functional>
#include <optional>

#include "georef/std_georef.h"
#include "raster/raster_def.h"
#include "support/coordsys_support.h"
#include "support/test_rasters.h"

namespace lumo {

/// A grid with square pixels, its upper left corner at (x, y).
inline GeoRefPtr MakeGrid(double x, double y, double pixelSize, unsigned samples, unsigned lines,
                          const char* coordSys = nullptr) {
  const GeoRefPtr grid(new StdGeoRef);
  if (coordSys != nullptr) grid->SetCoordinateSystem(test::MakeCoordSys(coordSys));
  grid->SetTieMap(x, y);
  grid->SetPixelSize(pixelSize, pixelSize);
  grid->SetDimensions(samples, lines);
  return grid;
}

/// Pixels and states in memory at a place on Earth, which can be read in any order.
template <typename T>
class PlacedRaster final : public TestRaster<T> {
 public:
  using Value = std::function<T(unsigned sample, unsigned line, unsigned band)>;

  /// As large as the grid.
  PlacedRaster(const GeoRefPtr& grid, unsigned bands, const Value& value)
      : TestRaster<T>(grid->Samples(), grid->Lines(), bands), geoRef(CloneOf(grid)) {
    pixels.reserve(std::size_t{grid->Samples()} * grid->Lines() * bands);
    for (unsigned y = 0; y < grid->Lines(); ++y)
      for (unsigned x = 0; x < grid->Samples(); ++x)
        for (unsigned band = 0; band < bands; ++band) pixels.push_back(value(x, y, band));
    states.resize(pixels.size());
  }

  RasterDef GetRasterDef() const override {
    RasterDef def = TestRaster<T>::GetRasterDef();
    def.geoRef = CloneOf(geoRef);
    if (noData) def.noData[0] = static_cast<double>(*noData);
    return def;
  }
  bool HasNoDataValue(unsigned) const override { return noData.has_value(); }
  T NoDataValue(unsigned) const override { return noData.value_or(T()); }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& block, Array<unsigned char>& state) override {
    const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
    const ArrayDims dims = BlockDims(interleave, width, height, count);
    if (fails || rect.right >= this->Samples() || rect.bottom >= this->Lines()) return false;
    if (!block.Resize(dims) || !state.Resize(dims)) return false;
    ++reads;
    std::vector<T> bip;
    std::vector<unsigned char> bipState;
    for (unsigned y = rect.top; y <= rect.bottom; ++y)
      for (unsigned x = rect.left; x <= rect.right; ++x)
        for (const unsigned band : bands) {
          bip.push_back(pixels[At(x, y, band)]);
          bipState.push_back(states[At(x, y, band)]);
        }
    return ConvertInterleave(bip.data(), Interleave::BIP, block.GetData(), interleave, width,
                             height, count, sizeof(T)) &&
           ConvertInterleave(bipState.data(), Interleave::BIP, state.GetData(), interleave, width,
                             height, count, 1);
  }

  std::size_t At(std::size_t sample, std::size_t line, std::size_t band) const {
    return (line * this->Samples() + sample) * this->Bands() + band;
  }

  GeoRefPtr geoRef;
  std::vector<T> pixels;  // pixel-interleaved
  std::vector<unsigned char> states;
  std::optional<T> noData;
  bool fails = false;
  std::atomic<unsigned> reads{0};
};

template <typename T>
Pointer<PlacedRaster<T>> MakePlaced(const GeoRefPtr& grid, unsigned bands,
                                    const typename PlacedRaster<T>::Value& value) {
  return Pointer<PlacedRaster<T>>(new PlacedRaster<T>(grid, bands, value));
}

}  // namespace lumo
