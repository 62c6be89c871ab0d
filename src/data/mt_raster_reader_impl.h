#pragma once

#include "data/dc_srv_call.h"
#include "data/mt_connection.h"

namespace lumo {

/// The proxy of a raster reader. It belongs to its connection, on whose thread every call runs.
template <typename T>
class MtRasterReader final : public RasterReader<T> {
 public:
  explicit MtRasterReader(MtRasterDataConnection* connection)
      : RasterReader<T>(connection), proxy_(connection) {}

  bool OpBool() override {
    return Call<bool>(11, "DcSrvCmdRrOpBool", [](auto& reader) { return reader.OpBool(); });
  }
  std::int32_t ReaderType() override {
    return Call<std::int32_t>(12, "DcSrvCmdRrReaderType",
                              [](auto& reader) { return reader.ReaderType(); });
  }
  lumo::RasterDef RasterDef() override {
    return Call<lumo::RasterDef>(13, "DcSrvCmdRrRasterDef",
                                 [](auto& reader) { return reader.RasterDef(); });
  }
  unsigned Samples(unsigned level) override {
    return Call<unsigned>(14, "DcSrvCmdRrSamples",
                          [&](auto& reader) { return reader.Samples(level); });
  }
  unsigned Lines(unsigned level) override {
    return Call<unsigned>(15, "DcSrvCmdRrLines", [&](auto& reader) { return reader.Lines(level); });
  }
  unsigned Bands() override {
    return Call<unsigned>(16, "DcSrvCmdRrBands", [](auto& reader) { return reader.Bands(); });
  }

  std::int32_t PyramidType() override {
    return Call<std::int32_t>(17, "DcSrvCmdRrPyramidType",
                              [](auto& reader) { return reader.PyramidType(); });
  }
  std::int32_t PyramidResamplingMethod() override {
    return Call<std::int32_t>(18, "DcSrvCmdRrPyramidResamplingMethod",
                              [](auto& reader) { return reader.PyramidResamplingMethod(); });
  }
  std::int32_t PyramidLevelMin() override {
    return Call<std::int32_t>(19, "DcSrvCmdRrPyramidLevelMin",
                              [](auto& reader) { return reader.PyramidLevelMin(); });
  }
  std::int32_t PyramidLevelMax() override {
    return Call<std::int32_t>(20, "DcSrvCmdRrPyramidLevelMax",
                              [](auto& reader) { return reader.PyramidLevelMax(); });
  }
  bool PyramidExists() override {
    return Call<bool>(21, "DcSrvCmdRrPyramidExists",
                      [](auto& reader) { return reader.PyramidExists(); });
  }
  bool PyramidBuild(std::int32_t levelMin, std::int32_t levelMax, std::int32_t resamplingMethod,
                    const TileDimensions& tiles) override {
    return Call<bool>(22, "DcSrvCmdRrPyramidBuild", [&](auto& reader) {
      return reader.PyramidBuild(levelMin, levelMax, resamplingMethod, tiles);
    });
  }
  bool PyramidRebuild() override {
    return Call<bool>(23, "DcSrvCmdRrPyramidRebuild",
                      [](auto& reader) { return reader.PyramidRebuild(); });
  }
  bool PyramidDelete() override {
    return Call<bool>(24, "DcSrvCmdRrPyramidDelete",
                      [](auto& reader) { return reader.PyramidDelete(); });
  }
  bool PyramidRefresh() override {
    return Call<bool>(25, "DcSrvCmdRrPyramidRefresh",
                      [](auto& reader) { return reader.PyramidRefresh(); });
  }

  std::int32_t StatsMask() override {
    return Call<std::int32_t>(26, "DcSrvCmdRrStatsMask",
                              [](auto& reader) { return reader.StatsMask(); });
  }
  bool StatsExist(unsigned band) override {
    return Call<bool>(27, "DcSrvCmdRrStatsExist",
                      [&](auto& reader) { return reader.StatsExist(band); });
  }
  RasterBandStats<T> ReadStats(unsigned band) override {
    return Call<RasterBandStats<T>>(28, "DcSrvCmdRrReadStats",
                                    [&](auto& reader) { return reader.ReadStats(band); });
  }
  bool CanWriteStats() override {
    return Call<bool>(29, "DcSrvCmdRrCanWriteStats",
                      [](auto& reader) { return reader.CanWriteStats(); });
  }
  bool WriteStats(const Array<RasterBandStats<T>>& stats) override {
    return Call<bool>(30, "DcSrvCmdRrWriteStats",
                      [&](auto& reader) { return reader.WriteStats(stats); });
  }
  Array<RasterBandHistogram<T>> Histogram(unsigned band) override {
    return Call<Array<RasterBandHistogram<T>>>(
        31, "DcSrvCmdRrHistogram", [&](auto& reader) { return reader.Histogram(band); });
  }
  bool CanWriteHistogram() override {
    return Call<bool>(32, "DcSrvCmdRrCanWriteHistogram",
                      [](auto& reader) { return reader.CanWriteHistogram(); });
  }
  bool WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) override {
    return Call<bool>(33, "DcSrvCmdRrWriteHistogram",
                      [&](auto& reader) { return reader.WriteHistogram(histograms); });
  }

  bool HasNoDataValue(unsigned band) override {
    return Call<bool>(34, "DcSrvCmdRrHasNoDataValue",
                      [&](auto& reader) { return reader.HasNoDataValue(band); });
  }
  T NoDataValue(unsigned band) override {
    return Call<T>(35, "DcSrvCmdRrNoDataValue",
                   [&](auto& reader) { return reader.NoDataValue(band); });
  }
  bool CanInheritNoDataValues() override {
    return Call<bool>(36, "DcSrvCmdRrCanInheritNoDataValues",
                      [](auto& reader) { return reader.CanInheritNoDataValues(); });
  }
  void InheritNoDataValues(const lumo::RasterDef& from) override {
    Call<bool>(37, "DcSrvCmdRrInheritNoDataValues", [&](auto& reader) {
      reader.InheritNoDataValues(from);
      return true;
    });
  }

  bool HasPalette(unsigned band) override {
    return Call<bool>(38, "DcSrvCmdRrHasPalette",
                      [&](auto& reader) { return reader.HasPalette(band); });
  }
  lumo::Palette Palette(unsigned band) override {
    return Call<lumo::Palette>(39, "DcSrvCmdRrPalette",
                               [&](auto& reader) { return reader.Palette(band); });
  }
  bool DeletePalette(unsigned band) override {
    return Call<bool>(40, "DcSrvCmdRrDeletePalette",
                      [&](auto& reader) { return reader.DeletePalette(band); });
  }
  bool WritePalette(unsigned band, const lumo::Palette& palette) override {
    return Call<bool>(41, "DcSrvCmdRrWritePalette",
                      [&](auto& reader) { return reader.WritePalette(band, palette); });
  }

  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override {
    return Call<bool>(42, "DcSrvCmdRrReadPixels", [&](auto& reader) {
      return reader.ReadPixels(left, top, width, height, bands, level, pixels, state);
    });
  }
  bool CanWritePixels(unsigned level) override {
    return Call<bool>(43, "DcSrvCmdRrCanWritePixels",
                      [&](auto& reader) { return reader.CanWritePixels(level); });
  }
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char* state) override {
    return Call<bool>(44, "DcSrvCmdRrWritePixels", [&](auto& reader) {
      return reader.WritePixels(left, top, width, height, bands, level, pixels, state);
    });
  }

 private:
  /// Runs `body` with the plug-in's reader of type T on the source's thread; Result() when there is
  /// no such reader.
  template <typename Result, typename Body>
  Result Call(std::int32_t code, const char* name, Body&& body) {
    return detail::CallServer(
        proxy_->Server(), code, name, Result(), [&](DcSrvContext& context, Result& result) {
          const RasterDataConnectionPtr source(context.conn);
          if (!source) return;
          const RasterReaderDispatchPtr dispatch = source->RasterReaderDispatch();
          if (!dispatch) return;
          const RasterReaderPtr<T> reader = dispatch->template Get<T>();
          if (reader) result = body(*reader);
        });
  }

  MtRasterDataConnection* proxy_;
};

}  // namespace lumo
