#pragma once

#include "data/ordered_read.h"
#include "orva/orva_connection.h"
#include "orva/orva_values.h"

namespace lumo::orva {

/// The reader of an ORVA raster. It has no pyramid; statistics, histograms and palettes are kept in
/// the header. The first pixel that is written takes stored statistics and histograms away, since
/// they belong to other pixels then.
template <typename T>
class Reader final : public RasterReader<T>, public ConcurrentReads, public OrderedReads<T> {
 public:
  Reader(Connection* connection, BandValues<T> values);

  bool OpBool() override { return true; }
  std::int32_t ReaderType() override { return 0; }
  lumo::RasterDef RasterDef() override { return this->connection_->RasterDef(); }
  unsigned Samples(unsigned level) override { return level == 0 ? Layout().samples : 0; }
  unsigned Lines(unsigned level) override { return level == 0 ? Layout().lines : 0; }
  unsigned Bands() override { return Layout().bands; }

  std::int32_t PyramidType() override { return 0; }
  std::int32_t PyramidResamplingMethod() override { return 0; }
  std::int32_t PyramidLevelMin() override { return 0; }
  std::int32_t PyramidLevelMax() override { return 0; }
  bool PyramidExists() override { return false; }
  bool PyramidBuild(std::int32_t, std::int32_t, std::int32_t, const TileDimensions&) override {
    return RefusePyramid();
  }
  bool PyramidRebuild() override { return RefusePyramid(); }
  bool PyramidDelete() override { return RefusePyramid(); }
  bool PyramidRefresh() override { return RefusePyramid(); }

  /// The statistics that all bands have stored; all kinds while none are stored.
  std::int32_t StatsMask() override;
  bool StatsExist(unsigned band) override { return values_.stats.contains(band); }
  /// True: the format has room for them. Whether the file can be written shows at the write.
  bool CanWriteStats() override { return kHasStats; }
  bool CanWriteHistogram() override { return kHasStats; }
  RasterBandStats<T> ReadStats(unsigned band) override;
  /// The statistics of each band in the list take the place of those that are stored for it. One
  /// without any takes away what this reader knows of, not what somebody else has stored since.
  bool WriteStats(const Array<RasterBandStats<T>>& stats) override;
  Array<RasterBandHistogram<T>> Histogram(unsigned band) override;
  /// The histograms take the place of all that this reader knows of.
  bool WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) override;

  bool HasNoDataValue(unsigned band) override { return noData_.contains(band); }
  T NoDataValue(unsigned band) override;
  bool CanInheritNoDataValues() override { return false; }
  void InheritNoDataValues(const lumo::RasterDef&) override {}

  bool HasPalette(unsigned band) override { return values_.palettes.contains(band); }
  lumo::Palette Palette(unsigned band) override;
  bool WritePalette(unsigned band, const lumo::Palette& palette) override;
  bool DeletePalette(unsigned band) override;

  bool CanWritePixels(unsigned level) override { return level == 0 && file_.CanWrite(); }
  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override;
  /// Reads blocks in the order of the file, of bands without a no-data value.
  std::optional<bool> ReadOrdered(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                  Interleave order, T* pixels, BlockStates& states) override;
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char* state) override;

 private:
  static constexpr bool kHasStats = std::is_arithmetic_v<T>;

  const FlatLayout& Layout() const { return file_.GetHeader().layout; }
  bool Fail(const char* what) const;
  bool RefusePyramid() const { return Fail("no pyramid is kept in this format"); }
  template <typename F>
  bool Change(F&& change);
  bool DropStats();

  File& file_;
  BandValues<T> values_;
  std::map<unsigned, T> noData_;
  bool hasWrittenPixels_ = false;
};

}  // namespace lumo::orva
