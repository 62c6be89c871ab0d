#include <cmath>
#include <limits>
#include <optional>

#include <fmt/format.h>

#include "commands/share_scope.h"
#include "raster/raster_command.h"
#include "stats/histogram_run.h"
#include "stats/raster_histogram.h"

namespace lumo {
namespace {

constexpr unsigned kUsualBins = 256;
constexpr unsigned kMostBins = 1U << 24;

const CommandDeclaration kFit{
    "FitRasterHistogramCommand",
    "Statistics",
    "Chooses bins for the values of bands, counts them, and gives the histograms. (An addition of "
    "this library.)",
    WithShareInputs(
        {RasterURIInput(),
         {"Bands", Presence::kOptional, ValueKind::kIntegerArray, "which bands; all when absent"},
         {"Lowest", Presence::kOptional, ValueKind::kNumberArray,
          "for each of the bands its smallest value, from which its bins begin; the type's for 8 "
          "bits"},
         {"Highest", Presence::kOptional, ValueKind::kNumberArray,
          "for each of the bands its largest value"},
         {"LowerBound", Presence::kOptional, ValueKind::kNumber,
          "smallest value that counts, instead of Lowest"},
         {"UpperBound", Presence::kOptional, ValueKind::kNumber,
          "largest value that counts, instead of Highest"},
         {"BinCount", Presence::kOptional, ValueKind::kInteger,
          "how many bins; 256 when absent, or fewer of the smallest whole size that whole numbers "
          "fit "
          "into; no more than there are whole numbers"},
         {"BinSize", Presence::kOptional, ValueKind::kNumber,
          "width of a bin, instead of BinCount"},
         WaitInput()}),
    {{"Histograms", ValueKind::kText,
      "array of histograms, one for each of the bands: band, sign, bin size, bins, bounds, source "
      "and counts; every value within the bounds is in one bin"}}};

/// How many values lie between two bounds, both counted; of whole numbers.
template <typename T>
double ValuesBetween(T lower, T upper) {
  return static_cast<double>(upper) - static_cast<double>(lower) + 1;
}

template <typename T>
std::string TextOf(const T& value) {
  return FormatValue(value).ToUTF8();
}

template <typename T>
Array<T> ArrayOfOne(T value) {
  Array<T> array{ArrayDims(1)};
  array[0] = value;
  return array;
}

class FitRasterHistogramCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    auto bands = Read<Array<unsigned>>("Bands");
    if (!HasInput("Bands")) {
      bands.Resize(ArrayDims(raster->Bands()));
      for (unsigned band = 0; band < bands.GetCount(); ++band) bands[band] = band;
    }
    if (!CheckBands(*raster, bands)) return Fail();
    if (HasInput("BinCount") && HasInput("BinSize")) {
      return Fail("BinCount and BinSize exclude each other");
    }
    String why;
    const std::string key =
        fmt::format("histograms {} {} {} {} {}", raster->DataType(), FormatValue(bands).ToUTF8(),
                    raster->Bands(), raster->Samples(), raster->Lines());
    ShareScope shares;
    if (!shares.Begin({HasInput(kShareInput), Read<Array<unsigned>>(kShareInput),
                       Read<String>(kShareFileInput), Read<Array<String>>(kShareFilesInput)},
                      key)) {
      return Fail();
    }
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    const bool isReal = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      if (source) why = Fit(*source, bands, turn);
      return bool(source);
    });
    if (!isReal) return Fail("histograms are of real numbers, and the raster has others");
    if (why.GetLength() != 0) return Fail(why);
    return shares.End() ? Succeed() : Fail();
  }

  /// Counts and writes. Gives no text, or why that could not be done.
  template <typename T>
  String Fit(Raster<T>& raster, const Array<unsigned>& bands, const Turn& turn) {
    std::vector<HistogramRequest<T>> requests;
    for (unsigned i = 0; i < bands.GetCount(); ++i) {
      HistogramRequest<T>& request = requests.emplace_back();
      request.bins = Form::kExact;
      request.bands = ArrayOfOne(bands[i]);
      std::string why = ChooseBounds(i, request);
      if (why.empty()) why = ChooseSize(request);
      if (!why.empty()) return "band " + std::to_string(bands[i]) + ": " + why;
    }
    if (const String why = CountAll(raster, requests, turn); why.GetLength() != 0) return why;
    const ShareScope* const shares = ShareScope::Current();
    if (shares != nullptr && shares->IsShare()) return {};
    Array<RasterBandHistogram<T>> histograms(bands.GetDims());
    for (unsigned i = 0; i < bands.GetCount(); ++i) {
      const std::optional<RasterBandHistogram<T>> found = Find(raster, requests[i]);
      if (!found) return "band " + std::to_string(bands[i]) + ": there is no histogram of it";
      histograms[i] = *found;
    }
    Write("Histograms", histograms);
    return {};
  }

  /// Finds the bounds of the band at a place of the list. Gives no text, or why there are none.
  template <typename T>
  std::string ChooseBounds(unsigned place, HistogramRequest<T>& request) {
    constexpr auto kLeast = std::numeric_limits<T>::lowest();
    constexpr auto kMost = std::numeric_limits<T>::max();
    request.lower = kLeast;
    request.upper = kMost;
    if (HasInput("Lowest") || HasInput("Highest")) {
      const auto lowest = Read<Array<T>>("Lowest"), highest = Read<Array<T>>("Highest");
      if (place >= lowest.GetCount() || place >= highest.GetCount()) {
        return "Lowest and Highest have no value for it";
      }
      request.lower = lowest[place];
      request.upper = highest[place];
    } else if (sizeof(T) > 1 && !(HasInput("LowerBound") && HasInput("UpperBound"))) {
      return "neither Lowest and Highest nor both bounds are given";
    }
    const bool isBeyond =
        (HasInput("LowerBound") && Read<double>("LowerBound") > static_cast<double>(kMost)) ||
        (HasInput("UpperBound") && Read<double>("UpperBound") < static_cast<double>(kLeast));
    if (isBeyond) return "between the bounds there is no value that the pixels can have";
    for (const auto& [name, bound] :
         {std::pair("LowerBound", &request.lower), std::pair("UpperBound", &request.upper)}) {
      if (!HasInput(name)) continue;
      const auto value = Read<double>(name);
      if (value <= static_cast<double>(kLeast)) {
        *bound = kLeast;
      } else if (value >= static_cast<double>(kMost)) {
        *bound = kMost;
      } else if (std::isnan(value) || (std::is_integral_v<T> && std::trunc(value) != value)) {
        return "the pixels can't be " + TextOf(value) + ", which is " + name;
      } else {
        *bound = static_cast<T>(value);
      }
    }
    if (request.lower <= request.upper) return {};
    return "the lower bound " + TextOf(request.lower) + " is above the upper one, " +
           TextOf(request.upper);
  }

  template <typename T>
  std::string ChooseSize(HistogramRequest<T>& request) {
    if (HasInput("BinSize")) {
      request.binSize = Read<double>("BinSize");
      if (!(request.binSize > 0 && std::isfinite(request.binSize))) return "BinSize is not above 0";
      const double span = static_cast<double>(request.upper) - static_cast<double>(request.lower);
      if (span / request.binSize < kMostBins) return {};
      return "from " + TextOf(request.lower) + " to " + TextOf(request.upper) +
             " there would be more than " + std::to_string(kMostBins) + " bins";
    }
    const bool isWhole = std::is_integral_v<T>;
    const double values = ValuesBetween(request.lower, request.upper);
    if (isWhole && !HasInput("BinCount")) {
      request.binSize = std::ceil(values / kUsualBins);
      return {};
    }
    request.binCount = HasInput("BinCount") ? Read<unsigned>("BinCount") : kUsualBins;
    if (request.binCount == 0 || request.binCount > kMostBins) {
      return "BinCount is not in 1 to " + std::to_string(kMostBins);
    }
    if (isWhole && values < request.binCount) request.binCount = static_cast<unsigned>(values);
    return {};
  }

  /// Counts the bands, those of the same bins in one pass.
  template <typename T>
  String CountAll(Raster<T>& raster, const std::vector<HistogramRequest<T>>& requests,
                  const Turn& turn) {
    std::vector<bool> isDone(requests.size());
    for (std::size_t i = 0; i < requests.size(); ++i) {
      if (isDone[i]) continue;
      HistogramRequest<T> request = requests[i];
      for (std::size_t j = i + 1; j < requests.size(); ++j) {
        const bool isSame =
            requests[j].lower == request.lower && requests[j].upper == request.upper &&
            requests[j].binSize == request.binSize && requests[j].binCount == request.binCount;
        if (isDone[j] || !isSame) continue;
        isDone[j] = true;
        const unsigned at = request.bands.GetCount();
        if (!request.bands.Resize(ArrayDims(at + 1))) return "out of memory";
        request.bands[at] = requests[j].bands[0];
      }
      const String why = RunHistogram(raster, request, turn, GetIPC());
      if (why.GetLength() != 0) return why;
    }
    return {};
  }

  /// The histogram at hand that was asked for. A raster may have others of the same bounds and
  /// sizes that were stored, in bins of the told form; the one that was counted comes last.
  template <typename T>
  static std::optional<RasterBandHistogram<T>> Find(const Raster<T>& raster,
                                                    const HistogramRequest<T>& request) {
    double size = request.binSize;
    if (request.binCount != 0) {
      size = RasterHistogram<T>(1, ArrayOfOne(request.binCount), ArrayOfOne(request.lower),
                                ArrayOfOne(request.upper), request.sign, request.bins)
                 .BinSize(0);
    }
    std::optional<RasterBandHistogram<T>> found;
    for (const RasterBandHistogram<T>& histogram : raster.BandHistogram(request.bands[0])) {
      const bool isAskedFor = histogram.sign == request.sign && histogram.min == request.lower &&
                              histogram.max == request.upper && histogram.binSize == size;
      if (isAskedFor && (!found || histogram.source == StatsSource::kDynamic)) found = histogram;
    }
    return found;
  }
};

const CommandFactoryT<FitRasterHistogramCommand> fitFactory(kFit);
const DivisionRegistration fitDivision({.command = "FitRasterHistogramCommand",
                                        .kind = DivisionKind::kShares,
                                        .source = "URI"});

}  // namespace
}  // namespace lumo
