#pragma once

#include "data/band_answers.h"
#include "data/dc_srv_call.h"
#include "data/mt_connection.h"
#include "data/ordered_read_body.h"
#include "data/packed_levels.h"

namespace lumo {

/// The proxy of a raster reader. It belongs to its connection, on whose thread every call runs.
template <typename T>
class MtRasterReader final : public RasterReader<T>, public OrderedReads<T>, public PackedLevels {
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
    return Change(22, "DcSrvCmdRrPyramidBuild", [&](auto& reader) {
      return reader.PyramidBuild(levelMin, levelMax, resamplingMethod, tiles);
    });
  }
  bool PyramidRebuild() override {
    return Change(23, "DcSrvCmdRrPyramidRebuild",
                  [](auto& reader) { return reader.PyramidRebuild(); });
  }
  bool PyramidDelete() override {
    return Change(24, "DcSrvCmdRrPyramidDelete",
                  [](auto& reader) { return reader.PyramidDelete(); });
  }
  bool PyramidRefresh() override {
    return Change(25, "DcSrvCmdRrPyramidRefresh",
                  [](auto& reader) { return reader.PyramidRefresh(); });
  }

  std::int32_t StatsMask() override {
    return Call<std::int32_t>(26, "DcSrvCmdRrStatsMask",
                              [](auto& reader) { return reader.StatsMask(); });
  }
  bool StatsExist(unsigned band) override {
    return Ask(statsExist_, 27, "DcSrvCmdRrStatsExist", band,
               [](auto& reader, unsigned each) { return reader.StatsExist(each); });
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
    return Change(30, "DcSrvCmdRrWriteStats",
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
    return Change(33, "DcSrvCmdRrWriteHistogram",
                  [&](auto& reader) { return reader.WriteHistogram(histograms); });
  }

  bool HasNoDataValue(unsigned band) override {
    return Ask(hasNoDataValue_, 34, "DcSrvCmdRrHasNoDataValue", band,
               [](auto& reader, unsigned each) { return reader.HasNoDataValue(each); });
  }
  T NoDataValue(unsigned band) override {
    return Ask(noDataValue_, 35, "DcSrvCmdRrNoDataValue", band,
               [](auto& reader, unsigned each) { return reader.NoDataValue(each); });
  }
  bool CanInheritNoDataValues() override {
    return Call<bool>(36, "DcSrvCmdRrCanInheritNoDataValues",
                      [](auto& reader) { return reader.CanInheritNoDataValues(); });
  }
  void InheritNoDataValues(const lumo::RasterDef& from) override {
    Change(37, "DcSrvCmdRrInheritNoDataValues", [&](auto& reader) {
      reader.InheritNoDataValues(from);
      return true;
    });
  }

  bool HasPalette(unsigned band) override {
    return Ask(hasPalette_, 38, "DcSrvCmdRrHasPalette", band,
               [](auto& reader, unsigned each) { return reader.HasPalette(each); });
  }
  lumo::Palette Palette(unsigned band) override {
    return Call<lumo::Palette>(39, "DcSrvCmdRrPalette",
                               [&](auto& reader) { return reader.Palette(band); });
  }
  bool DeletePalette(unsigned band) override {
    return Change(40, "DcSrvCmdRrDeletePalette",
                  [&](auto& reader) { return reader.DeletePalette(band); });
  }
  bool WritePalette(unsigned band, const lumo::Palette& palette) override {
    return Change(41, "DcSrvCmdRrWritePalette",
                  [&](auto& reader) { return reader.WritePalette(band, palette); });
  }

  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override {
    return Call<bool>(42, "DcSrvCmdRrReadPixels", [&](auto& reader) {
      return reader.ReadPixels(left, top, width, height, bands, level, pixels, state);
    });
  }
  std::optional<bool> ReadOrdered(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                  Interleave order, T* pixels, BlockStates& states) override {
    using Answer = std::optional<bool>;
    if (!maybeOrders_) return Answer();
    return CallWith<Answer>(42, "DcSrvCmdRrReadPixels", [&](auto& reader, Answer& result) {
      result = detail::ReadAsked(reader, rect, bands, level, order, pixels, states);
      if (dynamic_cast<OrderedReads<T>*>(&reader) == nullptr &&
          dynamic_cast<ConcurrentReads*>(&reader) == nullptr) {
        maybeOrders_ = false;
      }
    });
  }
  bool CanWritePixels(unsigned level) override {
    return Call<bool>(43, "DcSrvCmdRrCanWritePixels",
                      [&](auto& reader) { return reader.CanWritePixels(level); });
  }
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned level, const T* pixels,
                   const unsigned char* state) override {
    return Change(44, "DcSrvCmdRrWritePixels", [&](auto& reader) {
      return reader.WritePixels(left, top, width, height, bands, level, pixels, state);
    });
  }
  std::optional<Packing> GetLevelPacking() override {
    using Answer = std::optional<Packing>;
    return CallWith<Answer>(44, "DcSrvCmdRrWritePixels", [](auto& reader, Answer& result) {
      auto* const levels = dynamic_cast<PackedLevels*>(&reader);
      if (levels != nullptr) result = levels->GetLevelPacking();
    });
  }
  bool WritePackedTiles(const PackedTileRow& row) override {
    return Change(44, "DcSrvCmdRrWritePixels", [&](auto& reader) {
      auto* const levels = dynamic_cast<PackedLevels*>(&reader);
      return levels != nullptr && levels->WritePackedTiles(row);
    });
  }

 private:
  /// A call of the plug-in's reader of type T, where there is one. How it is found is compiled
  /// once, and not in each of the calls.
  class ReaderCall final : public DcSrvCmd {
   public:
    template <typename Body>
    ReaderCall(std::int32_t code, const char* name, Body& body)
        : DcSrvCmd(code, name),
          body_(&body),
          run_([](void* work, RasterReader<T>& reader) { (*static_cast<Body*>(work))(reader); }) {}
    void Execute(DcSrvContext& context) override;

   private:
    void* body_;
    void (*run_)(void* body, RasterReader<T>& reader);
  };

  /// Runs `body(reader, result)` with the plug-in's reader of type T on the source's thread; gives
  /// Result() when there is no such reader.
  template <typename Result, typename Body>
  Result CallWith(std::int32_t code, const char* name, Body&& body) {
    Result result{};
    DcSrv* const server = proxy_->Server();
    if (server == nullptr) return result;
    auto run = [&](RasterReader<T>& reader) { body(reader, result); };
    ReaderCall call(code, name, run);
    server->Execute(call);
    return result;
  }

  /// Gives `body(reader)`.
  template <typename Result, typename Body>
  Result Call(std::int32_t code, const char* name, Body&& body) {
    return CallWith<Result>(code, name,
                            [&](auto& reader, Result& result) { result = body(reader); });
  }

  /// Gives `body(reader, band)`, asked ahead where one band is asked about after another.
  template <typename Value, typename Body>
  Value Ask(BandAnswers<Value>& answers, std::int32_t code, const char* name, unsigned band,
            const Body& body) {
    return answers.Get(band, [&](unsigned first, unsigned count) {
      using Values = std::vector<Value>;
      return CallWith<Values>(code, name, [&](auto& reader, Values& values) {
        const unsigned bands = count > 1 ? reader.Bands() : 0;
        const unsigned end = bands > first ? first + std::min(count, bands - first) : first + 1;
        for (unsigned each = first; each < end; ++each) values.push_back(body(reader, each));
      });
    });
  }

  /// Gives `body(reader)`, after which bands may answer otherwise.
  template <typename Body>
  bool Change(std::int32_t code, const char* name, Body&& body) {
    const bool isDone = Call<bool>(code, name, body);
    statsExist_.Forget();
    hasNoDataValue_.Forget();
    noDataValue_.Forget();
    hasPalette_.Forget();
    return isDone;
  }

  MtRasterDataConnection* proxy_;
  std::atomic<bool> maybeOrders_{true};  // until the plug-in's reader has been looked at
  BandAnswers<bool> statsExist_;
  BandAnswers<bool> hasNoDataValue_;
  BandAnswers<T> noDataValue_;
  BandAnswers<bool> hasPalette_;
};

template <typename T>
void MtRasterReader<T>::ReaderCall::Execute(DcSrvContext& context) {
  const RasterDataConnectionPtr source(context.conn);
  if (!source) return;
  const RasterReaderDispatchPtr dispatch = source->RasterReaderDispatch();
  if (!dispatch) return;
  const RasterReaderPtr<T> reader = dispatch->template Get<T>();
  if (reader) run_(body_, *reader);
}

}  // namespace lumo
