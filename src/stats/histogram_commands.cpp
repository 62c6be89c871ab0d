#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "stats/turn.h"

namespace lumo {
namespace {

const InputDeclaration kUri{"URI", Presence::kRequired, ValueKind::kURI, "the raster"};

const CommandDeclaration kCalculate{
    "CalculateRasterHistogramCommand",
    "Statistics",
    "Counts the histograms of bands; GetRasterHistogramCommand then has them.",
    {kUri,
     {"LowerBound", Presence::kRequired, ValueKind::kNumber, "smallest value that counts"},
     {"UpperBound", Presence::kRequired, ValueKind::kNumber, "largest value that counts"},
     {"BinCount", Presence::kOptional, ValueKind::kInteger, "how many bins"},
     {"BinSize", Presence::kOptional, ValueKind::kNumber,
      "width of a bin, where there is no BinCount"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray,
      "which bands; all when absent, with a BinCount"},
     {"Sign", Presence::kOptional, ValueKind::kWord,
      "Both, Positive (0 and above), Negative; Both when absent", "", &WordsIn<HistogramSign>},
     WaitInput()},
    {}};

class CalculateRasterHistogramCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const AsyncPtr pyramid = raster->PyramidAsync();
    if (pyramid) pyramid->WaitFinished();
    if (!HasInput("BinCount") && !(HasInput("BinSize") && HasInput("Bands"))) {
      return Fail("neither BinCount, nor BinSize and Bands are given");
    }
    const auto bands = Read<Array<unsigned>>("Bands");
    if (HasInput("Bands") && !CheckBands(*raster, bands)) return Fail();
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    AsyncPtr run;
    const bool typed = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      if (source) run = Start(*source, bands);
      // Another run may have begun meanwhile.
      while (source && !run && raster->HistogramAsync() && turn.AwaitRuns()) {
        run = Start(*source, bands);
      }
      return bool(source);
    });
    if (!typed) return Fail("histograms are of real numbers, and the raster has others");
    if (!run) return Fail(FaultOr("the run could not be started"));
    run->WaitFinished();
    if (run->IsValid()) return run->IsAborted() ? Fail("the run was aborted") : Succeed();
    raster->HistogramAsync();  // takes the run's fault over
    return Fail(FaultOr("the pixels could not be counted"));
  }

  template <typename T>
  AsyncPtr Start(Raster<T>& raster, const Array<unsigned>& bands) {
    const T lower = Read<T>("LowerBound");
    const T upper = Read<T>("UpperBound");
    const auto sign = Read<HistogramSign>("Sign");
    if (!HasInput("BinCount")) {
      return raster.HistogramByBinSize(lower, upper, Read<double>("BinSize"), bands, sign,
                                       GetIPC());
    }
    const auto count = Read<unsigned>("BinCount");
    if (!HasInput("Bands")) return raster.HistogramAllBands(lower, upper, count, sign, GetIPC());
    return raster.HistogramByBinCount(lower, upper, count, bands, sign, GetIPC());
  }

  /// The fault that was told; `text` when none was.
  static String FaultOr(const char* text) {
    const String fault = TakeFault();
    return fault.GetLength() != 0 ? fault : String(text);
  }
};

const CommandFactoryT<CalculateRasterHistogramCommand> calculateFactory(kCalculate);

const CommandDeclaration kGet{
    "GetRasterHistogramCommand",
    "Statistics",
    "Gives the histograms at hand of bands.",
    {kUri,
     {"Bands", Presence::kRequired, ValueKind::kIntegerArray, "the bands, in the order wanted"},
     WaitInput()},
    {{"Histograms", ValueKind::kText,
      "array of histograms: band, sign, bin size, bins, bounds, source and counts of each"}}};

class GetRasterHistogramCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto bands = Read<Array<unsigned>>("Bands");
    if (!CheckBands(*raster, bands)) return Fail();
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    const bool typed = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      if (source) WriteHistograms(*source, bands);
      return bool(source);
    });
    return typed ? Succeed() : Fail("histograms are of real numbers, and the raster has others");
  }

  template <typename T>
  void WriteHistograms(const Raster<T>& raster, const Array<unsigned>& bands) {
    std::vector<RasterBandHistogram<T>> found;
    for (const unsigned band : bands) {
      const Array<RasterBandHistogram<T>> ofBand = raster.BandHistogram(band);
      found.insert(found.end(), ofBand.begin(), ofBand.end());
    }
    Array<RasterBandHistogram<T>> histograms{ArrayDims(static_cast<unsigned>(found.size()))};
    std::copy(found.begin(), found.end(), histograms.begin());
    Write("Histograms", histograms);
  }
};

const CommandFactoryT<GetRasterHistogramCommand> getFactory(kGet);

const CommandDeclaration kSet{"SetRasterBandHistogramCommand",
                              "Statistics",
                              "Enters a known histogram of one band.",
                              {kUri,
                               {"RasterBandHistogram", Presence::kRequired, ValueKind::kText,
                                "band, sign, bin size, bins, bounds, source and counts"},
                               WaitInput()},
                              {}};

class SetRasterBandHistogramCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    const bool set = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      const auto histogram = Read<RasterBandHistogram<T>>("RasterBandHistogram");
      if (!source || histogram.source == StatsSource::kUnknown ||
          histogram.band >= source->Bands()) {
        return false;
      }
      source->SetBandHistogram(histogram);
      return true;
    });
    return set ? Succeed() : Fail("RasterBandHistogram holds no histogram of a band of the raster");
  }
};

const CommandFactoryT<SetRasterBandHistogramCommand> setFactory(kSet);

const CommandDeclaration kSave{
    "SaveRasterHistogramCommand",
    "Statistics",
    "Stores the histograms of a raster through its data source.",
    {kUri, WaitInput()},
    {{"Return", ValueKind::kBoolean, "they are stored, or the source has no place for them"}}};

class SaveRasterHistogramCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    Write("Return", raster->WriteHistogram());
    return Succeed();
  }
};

const CommandFactoryT<SaveRasterHistogramCommand> saveFactory(kSave);

}  // namespace
}  // namespace lumo
