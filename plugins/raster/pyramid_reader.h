#pragma once

#include "data/packed_levels.h"
#include "pyramid_connection.h"
#include "pyramid_values.h"

namespace lumo::pyramid {

/// The reader of a pyramid file. Exists for TwelveTypes.
///
/// Level 0 has the size of the raster, whether its pixels are stored or not. While a build goes on,
/// what is read comes from the file that stands; what is written goes to the build.
template <typename T>
class Reader final : public PlainRasterReader<T>, public PackedLevels {
 public:
  explicit Reader(Connection* connection)
      : PlainRasterReader<T>(connection), pyramid_(*connection) {}

  /// Reads the values of the bands. False for values that can't be read.
  bool LoadValues();

  lumo::RasterDef RasterDef() override;
  unsigned Samples(unsigned level) override;
  unsigned Lines(unsigned level) override;

  std::int32_t PyramidType() override { return static_cast<std::int32_t>(PyramidType::kOrva); }
  std::int32_t PyramidResamplingMethod() override;
  std::int32_t PyramidLevelMin() override;
  std::int32_t PyramidLevelMax() override;
  bool PyramidExists() override { return pyramid_.File() != nullptr; }
  bool PyramidBuild(std::int32_t levelMin, std::int32_t levelMax, std::int32_t resamplingMethod,
                    const TileDimensions& tiles) override;
  bool PyramidRebuild() override;
  bool PyramidDelete() override;
  bool PyramidRefresh() override;

  std::int32_t StatsMask() override {
    return kHasStats ? lumo::StatsMask::Extended : lumo::StatsMask::None;
  }
  bool StatsExist(unsigned band) override { return values_.stats.contains(band); }
  bool CanWriteStats() override { return kHasStats && CanChangeValues(); }
  bool CanWriteHistogram() override { return kHasStats && CanChangeValues(); }
  RasterBandStats<T> ReadStats(unsigned band) override;
  /// The statistics of each band in the list take the place of those that are stored for it.
  bool WriteStats(const Array<RasterBandStats<T>>& stats) override;
  Array<RasterBandHistogram<T>> Histogram(unsigned band) override;
  /// The histograms take the place of all that are stored.
  bool WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) override;

  bool HasNoDataValue(unsigned band) override { return values_.noData.contains(band); }
  T NoDataValue(unsigned band) override;
  bool CanInheritNoDataValues() override { return true; }
  /// Takes over what there is of the raster now; a file that is built from then on keeps it.
  void InheritNoDataValues(const lumo::RasterDef& from) override;

  /// Levels of the build that is under way.
  bool CanWritePixels(unsigned level) override;
  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override;
  /// Takes whole tiles side by side in one row, one after the other from left to right, each a
  /// block of its own: of all bands, or of one where the raster is stored band by band.
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char* state) override;
  std::optional<Packing> GetLevelPacking() override { return pyramid_.GetPacking(); }
  bool WritePackedTiles(const PackedTileRow& row) override;

 private:
  static constexpr bool kHasStats = std::is_arithmetic_v<T>;

  struct Block;

  bool CanChangeValues() const;
  template <typename F>
  bool Change(F&& change);
  bool HasSize(unsigned level) const;
  bool CopyTiles(const Block& block);
  bool CopyTile(const Block& block, const TilePlace& place, std::string& fault);

  Connection& pyramid_;
  Values<T> values_;
  bool isInherited_ = false;    // the no-data values are those of the raster
  std::string inheritedState_;  // of the file of the raster
};

VEXG_EXTERN_HIDDEN(TWELVE, Reader);

}  // namespace lumo::pyramid
