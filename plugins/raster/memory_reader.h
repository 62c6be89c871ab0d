#pragma once

#include <map>

#include "data/ordered_read.h"
#include "foundation/fault.h"
#include "memory_connection.h"
#include "platform/far_copy.h"
#include "raster/no_data_marker.h"
#include "raster/pixel_value.h"

namespace lumo::memory {

/// The reader of a block of memory. Palettes last as long as the connection; nothing else is kept
/// beside the pixels.
template <typename T>
class Reader final : public RasterReader<T>, public ConcurrentReads {
 public:
  explicit Reader(Connection* connection)
      : RasterReader<T>(connection), block_(connection->Block()) {
    const lumo::RasterDef def = connection->RasterDef();
    for (unsigned band = 0; band < block_.layout.bands; ++band) {
      const auto value = def.noData.find(band);
      noData_.push_back(value != def.noData.end() ? ToPixel<T>(value->second) : std::nullopt);
    }
    std::uint64_t bytes = 0;
    isFar_ = block_.layout.GetBytes(sizeof(T), bytes) && bytes >= platform::kFarBytes;
  }

  bool OpBool() override { return true; }
  std::int32_t ReaderType() override { return 0; }
  lumo::RasterDef RasterDef() override { return this->connection_->RasterDef(); }
  unsigned Samples(unsigned level) override { return level == 0 ? block_.layout.samples : 0; }
  unsigned Lines(unsigned level) override { return level == 0 ? block_.layout.lines : 0; }
  unsigned Bands() override { return block_.layout.bands; }

  std::int32_t PyramidType() override { return 0; }
  std::int32_t PyramidResamplingMethod() override { return 0; }
  std::int32_t PyramidLevelMin() override { return 0; }
  std::int32_t PyramidLevelMax() override { return 0; }
  bool PyramidExists() override { return false; }
  bool PyramidBuild(std::int32_t, std::int32_t, std::int32_t, const TileDimensions&) override {
    return Fail("no pyramid");
  }
  bool PyramidRebuild() override { return Fail("no pyramid"); }
  bool PyramidDelete() override { return Fail("no pyramid"); }
  bool PyramidRefresh() override { return Fail("no pyramid"); }

  std::int32_t StatsMask() override { return 0; }
  bool StatsExist(unsigned) override { return false; }
  bool CanWriteStats() override { return false; }
  bool CanWriteHistogram() override { return false; }
  RasterBandStats<T> ReadStats(unsigned) override { return {}; }
  bool WriteStats(const Array<RasterBandStats<T>>&) override { return Fail("no statistics"); }
  Array<RasterBandHistogram<T>> Histogram(unsigned) override { return {}; }
  bool WriteHistogram(const Array<RasterBandHistogram<T>>&) override {
    return Fail("no histograms");
  }

  bool HasNoDataValue(unsigned band) override {
    return band < noData_.size() && noData_[band].has_value();
  }
  T NoDataValue(unsigned band) override { return HasNoDataValue(band) ? *noData_[band] : T{}; }
  bool CanInheritNoDataValues() override { return false; }
  void InheritNoDataValues(const lumo::RasterDef&) override {}

  bool HasPalette(unsigned band) override { return palettes_.contains(band); }
  lumo::Palette Palette(unsigned band) override {
    const auto found = palettes_.find(band);
    return found != palettes_.end() ? found->second : lumo::Palette();
  }
  bool WritePalette(unsigned band, const lumo::Palette& palette) override {
    if (band >= Bands()) return Fail("no such band");
    palettes_[band] = palette;
    return true;
  }
  bool DeletePalette(unsigned band) override {
    palettes_.erase(band);
    return true;
  }

  bool CanWritePixels(unsigned level) override { return level == 0; }

  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override {
    const bool isRead = ForEachRow({block_.layout, left, top, width, height, bands}, level,
                                   [&](const FlatBlock& rows, std::uint64_t row, T* span) {
                                     T* const to = pixels + rows.BlockBegin(row);
                                     if (rows.Picks()) {
                                       rows.PickBands(row, span, to, sizeof(T));
                                     } else {
                                       std::copy_n(span, rows.RowElements(row), to);
                                     }
                                   });
    if (!isRead) return false;
    std::vector<std::optional<T>> values;
    for (const unsigned band : bands) values.push_back(noData_[band]);
    const NoDataMarker<T> marker(std::move(values), block_.layout.interleave, width, height);
    marker.Mark(0, std::uint64_t{width} * height * bands.GetCount(), pixels, state);
    return true;
  }

  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char*) override {
    return ForEachRow({block_.layout, left, top, width, height, bands}, level,
                      [&](const FlatBlock& rows, std::uint64_t row, T* span) {
                        const T* const from = pixels + rows.BlockBegin(row);
                        if (rows.Picks()) {
                          rows.PlaceBands(row, from, span, sizeof(T));
                        } else if (isFar_) {
                          platform::CopyFar(span, from, rows.RowElements(row) * sizeof(T));
                        } else {
                          std::copy_n(from, rows.RowElements(row), span);
                        }
                      });
  }

 private:
  static bool Fail(const char* what) {
    SetFault(std::string("MemoryRaster: ").append(what));
    return false;
  }

  /// Calls `body(block, row, what the row spans in memory)`.
  template <typename Body>
  bool ForEachRow(const FlatBlock& rows, unsigned level, Body&& body) {
    if (level != 0 || !rows.IsInside()) return Fail("a block outside the raster");
    for (std::uint64_t row = 0; row < rows.Rows(); ++row) {
      body(rows, row, static_cast<T*>(block_.pixels) + rows.RowBegin(row));
    }
    return true;
  }

  const Description& block_;
  std::vector<std::optional<T>> noData_;  // by band
  bool isFar_ = false;                    // the block is too large for the caches
  std::map<unsigned, lumo::Palette> palettes_;
};

}  // namespace lumo::memory
