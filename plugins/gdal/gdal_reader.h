#pragma once

#include <optional>
#include <vector>

#include "data/plain_raster_reader.h"
#include "gdal_raster.h"

namespace lumo::gdal {

/// Reads and writes a raster that GDAL holds open. Exists for TwelveTypes.
template <typename T>
class Reader final : public PlainRasterReader<T> {
 public:
  /// @param raster    outlives the reader.
  Reader(RasterDataConnection* connection, OpenRaster& raster, const RasterDef& def);

  lumo::RasterDef RasterDef() override { return def_; }
  unsigned Samples(unsigned level) override;
  unsigned Lines(unsigned level) override;
  unsigned Bands() override { return def_.bands; }

  std::int32_t PyramidType() override {
    return static_cast<std::int32_t>(lumo::PyramidType::kDriver);
  }
  std::int32_t PyramidResamplingMethod() override;
  std::int32_t PyramidLevelMin() override;
  std::int32_t PyramidLevelMax() override;
  bool PyramidExists() override { return raster_.Levels().size() > 1; }
  /// GDAL chooses the tiles.
  bool PyramidBuild(std::int32_t levelMin, std::int32_t levelMax, std::int32_t resamplingMethod,
                    const TileDimensions& tiles) override;
  bool PyramidRebuild() override;
  bool PyramidDelete() override;
  /// Builds the levels anew where pixels were written since; else looks for those that another
  /// connection has made.
  bool PyramidRefresh() override;

  std::int32_t StatsMask() override;
  bool StatsExist(unsigned band) override;
  RasterBandStats<T> ReadStats(unsigned band) override;
  bool CanWriteStats() override { return kHasStats; }
  bool WriteStats(const Array<RasterBandStats<T>>& stats) override;
  /// The one that the source holds. Its bounds are the whole numbers inside the edges of the bins,
  /// or the edges themselves.
  Array<RasterBandHistogram<T>> Histogram(unsigned band) override;
  bool CanWriteHistogram() override { return kHasStats; }
  /// Stores the last one of each band that counts values of both signs. False when a band has only
  /// others.
  bool WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) override;

  bool HasNoDataValue(unsigned band) override;
  T NoDataValue(unsigned band) override;

  bool HasPalette(unsigned band) override;
  lumo::Palette Palette(unsigned band) override;
  bool WritePalette(unsigned band, const lumo::Palette& palette) override;
  bool DeletePalette(unsigned band) override;

  bool CanWritePixels(unsigned level) override { return level == 0 && raster_.CanWrite(); }
  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override;
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char* state) override;

 private:
  static constexpr bool kHasStats = std::is_arithmetic_v<T>;

  bool ChangePalette(unsigned band, const lumo::Palette* palette);
  std::vector<unsigned char> FindUntold(const BlockPlace& place, const T* pixels,
                                        const unsigned char* state) const;

  OpenRaster& raster_;
  lumo::RasterDef def_;
  std::vector<std::optional<T>> noData_;  // by band
  unsigned alphaBand_ = 0;                // of a new raster; the number of bands for none
  std::int32_t builtMethod_ = 0;          // of the levels that this connection made
  bool areLevelsOld_ = false;             // they don't show what was written since
};

}  // namespace lumo::gdal
