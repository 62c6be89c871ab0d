#include <limits>

#include "raster/raster_command.h"
#include "stats/histogram_run.h"
#include "stats/saving_command.h"

namespace lumo {
namespace {

const CommandDeclaration kCalculate{
    "CalculateRasterHistogramCommand",
    "Statistics",
    "Counts the histograms of bands; GetRasterHistogramCommand then has them.",
    {RasterURIInput(),
     {"LowerBound", Presence::kRequired, ValueKind::kNumber,
      "smallest value that counts; one that the pixel type can't hold is limited to it"},
     {"UpperBound", Presence::kRequired, ValueKind::kNumber,
      "largest value that counts; limited as well"},
     {"BinCount", Presence::kOptional, ValueKind::kInteger, "how many bins"},
     {"BinSize", Presence::kOptional, ValueKind::kNumber,
      "width of a bin, where there is no BinCount"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray,
      "which bands; all when absent, with a BinCount"},
     {"Sign", Presence::kOptional, ValueKind::kWord,
      "Both, Positive (0 and above), Negative; Both when absent", "", &WordsIn<HistogramSign>},
     {"Bins", Presence::kOptional, ValueKind::kWord,
      "Told: sizes of bin counts hold one bin less, integers have whole sizes, and values behind "
      "the last bin do not count; Exact: every value within the bounds is in one bin",
      "", &WordsIn<Form>},
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
    String why;
    const bool typed = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      if (source) why = Count(*source, bands, turn);
      return bool(source);
    });
    if (!typed) return Fail("histograms are of real numbers, and the raster has others");
    return why.GetLength() == 0 ? Succeed() : Fail(why);
  }

  /// Counts, and gives no text, or why that could not be done.
  template <typename T>
  String Count(Raster<T>& raster, const Array<unsigned>& bands, const Turn& turn) {
    HistogramRequest<T> request;
    if (!ReadBounds(request)) {
      return "LowerBound and UpperBound hold between them no value that pixels may have";
    }
    request.bands = bands;
    request.sign = Read<HistogramSign>("Sign");
    request.bins = Read<Form>("Bins");
    if (HasInput("BinCount")) {
      request.binCount = Read<unsigned>("BinCount");
    } else {
      request.binSize = Read<double>("BinSize");
    }
    return RunHistogram(raster, request, turn, GetIPC());
  }

  /// Reads the bounds, limited to the pixel type. @return false when neither of them nor what lies
  /// between is a value of it.
  template <typename T>
  bool ReadBounds(HistogramRequest<T>& request) {
    const auto lower = Read<double>("LowerBound"), upper = Read<double>("UpperBound");
    constexpr auto kLeast = std::numeric_limits<T>::lowest();
    constexpr auto kMost = std::numeric_limits<T>::max();
    // A double may be rounded up to the first value behind those of a 64-bit type.
    const auto limited = [&](double bound, const char* name) {
      if (bound < static_cast<double>(kLeast)) return kLeast;
      if (bound > static_cast<double>(kMost)) return kMost;
      if (bound == static_cast<double>(kMost) && Read<T>(name) == T()) return kMost;
      return Read<T>(name);
    };
    request.lower = limited(lower, "LowerBound");
    request.upper = limited(upper, "UpperBound");
    return !(lower > static_cast<double>(kMost) || upper < static_cast<double>(kLeast));
  }
};

const CommandFactoryT<CalculateRasterHistogramCommand> calculateFactory(kCalculate);

const CommandDeclaration kGetHistogram{
    "GetRasterHistogramCommand",
    "Statistics",
    "Gives the histograms at hand of bands.",
    {RasterURIInput(),
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

const CommandFactoryT<GetRasterHistogramCommand> getRasterHistogramFactory(kGetHistogram);

const CommandDeclaration kSet{"SetRasterBandHistogramCommand",
                              "Statistics",
                              "Enters a known histogram of one band.",
                              {RasterURIInput(),
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

const CommandDeclaration kSaveHistogram{
    "SaveRasterHistogramCommand",
    "Statistics",
    "Stores the histograms of a raster through its data source.",
    {RasterURIInput(), WaitInput()},
    {{"Return", ValueKind::kBoolean, "they are stored, or the source has no place for them"},
     {"Fault", ValueKind::kText, "why they could not be stored; only then"}}};

class SaveRasterHistogramCommand final : public SavingCommand {
  bool Save(BasicRaster& raster) override { return raster.WriteHistogram(); }
};

const CommandFactoryT<SaveRasterHistogramCommand> saveRasterHistogramFactory(kSaveHistogram);

}  // namespace
}  // namespace lumo
