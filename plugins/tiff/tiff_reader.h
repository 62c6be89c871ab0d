#pragma once

#include <optional>

#include "data/ordered_read.h"
#include "data/plain_raster_reader.h"
#include "tiff/tiff_source.h"

namespace lumo::tiff {

/// Reads a Source; what that can't do itself goes to GDAL's reader, and so does everything that
/// changes the file, and what is read after it.
template <typename T>
class Reader final : public PlainRasterReader<T>, public OrderedReads<T> {
 public:
  /// @param source    outlives the reader.
  Reader(RasterDataConnection* connection, Source& source, const RasterDef& def);

  lumo::RasterDef RasterDef() override { return def_; }
  unsigned Samples(unsigned level) override;
  unsigned Lines(unsigned level) override;

  std::int32_t PyramidType() override {
    return static_cast<std::int32_t>(lumo::PyramidType::kDriver);
  }
  std::int32_t PyramidResamplingMethod() override;
  std::int32_t PyramidLevelMin() override;
  std::int32_t PyramidLevelMax() override;
  bool PyramidExists() override;
  bool PyramidBuild(std::int32_t levelMin, std::int32_t levelMax, std::int32_t resamplingMethod,
                    const TileDimensions& tiles) override;
  bool PyramidRebuild() override;
  bool PyramidDelete() override;
  bool PyramidRefresh() override;

  std::int32_t StatsMask() override;
  bool StatsExist(unsigned band) override;
  RasterBandStats<T> ReadStats(unsigned band) override;
  bool CanWriteStats() override { return std::is_arithmetic_v<T>; }
  bool WriteStats(const Array<RasterBandStats<T>>& stats) override;
  Array<RasterBandHistogram<T>> Histogram(unsigned band) override;
  bool CanWriteHistogram() override { return std::is_arithmetic_v<T>; }
  bool WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) override;

  bool HasNoDataValue(unsigned band) override { return noData_.has_value() && band < def_.bands; }
  T NoDataValue(unsigned band) override { return HasNoDataValue(band) ? *noData_ : T(); }

  bool HasPalette(unsigned band) override;
  lumo::Palette Palette(unsigned band) override;
  bool WritePalette(unsigned band, const lumo::Palette& palette) override;
  bool DeletePalette(unsigned band) override;

  bool CanWritePixels(unsigned level) override { return level == 0 && source_.CanWrite(); }
  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override;
  /// Takes bands that lie pixel by pixel apart while blocks are decoded. States are made where the
  /// bands have a no-data value.
  std::optional<bool> ReadOrdered(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                  Interleave order, T* pixels, BlockStates& states) override;
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char* state) override;

 private:
  RasterReader<T>* Inner();
  RasterReader<T>* Opened() { return source_.HasInner() ? Inner() : nullptr; }
  RasterReader<T>* Changing();
  void MarkNoData(unsigned width, unsigned height, unsigned bands, Interleave order,
                  const T* pixels, unsigned char* state) const;
  bool ReadMasked(const Rect& rect, const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state);
  bool IsInside(unsigned left, unsigned top, unsigned width, unsigned height,
                const Array<unsigned>& bands, unsigned level) const;

  Source& source_;
  lumo::RasterDef def_;
  std::optional<T> noData_;
  bool hasChanged_ = false;  // pixels or levels may be others than the source knows
};

VEXG_EXTERN(TWELVE, Reader);

}  // namespace lumo::tiff
