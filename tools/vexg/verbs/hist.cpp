#include <algorithm>
#include <cmath>
#include <memory>
#include <numeric>
#include <optional>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "output/json_number.h"
#include "output/saved_values.h"
#include "pictures/histogram_plot.h"
#include "pictures/picture_writer.h"
#include "raster/band_values.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"
#include "stats/raster_histogram.h"
#include "stats/turn.h"

namespace lumo::host {
namespace {

struct Options {
  std::string file;  ///< what the user calls the raster
  std::string bands;
  std::optional<double> lower;
  std::optional<double> upper;
  std::optional<unsigned> bins;
  std::optional<double> binSize;
};

constexpr unsigned kUsualBins = 256;
constexpr unsigned kMostBins = 1U << 24;
constexpr const char* kStatsStep = "stats";
constexpr const char* kSaveCommand = "SaveRasterHistogramCommand";

/// The bins of a band, and what they counted.
template <typename T>
struct BandBins {
  unsigned band = 0;
  T lower{};
  T upper{};
  unsigned askedCount = 0;  ///< how many bins are asked for; 0: bins of the size
  double size = 0;
  std::vector<std::uint64_t> counts;

  bool HasBinsOf(const BandBins& other) const {
    return lower == other.lower && upper == other.upper && size == other.size &&
           askedCount == other.askedCount;
  }
};

/// A bound of the command line as a pixel value; the nearest one for a bound beyond them all.
template <typename T>
T BoundAs(double value, const char* option) {
  if (value <= static_cast<double>(std::numeric_limits<T>::lowest())) {
    return std::numeric_limits<T>::lowest();
  }
  if (value >= static_cast<double>(std::numeric_limits<T>::max())) {
    return std::numeric_limits<T>::max();
  }
  const bool isWhole = std::trunc(value) == value;
  if (!std::isnan(value) && (std::is_floating_point_v<T> || isWhole)) return static_cast<T>(value);
  throw HostError(kExitUsage, fmt::format("{}: the pixels can't be {}", option, value));
}

/// How many values lie between two bounds, both counted; of whole numbers.
template <typename T>
double ValuesBetween(T lower, T upper) {
  return static_cast<double>(upper) - static_cast<double>(lower) + 1;
}

template <typename T>
Array<T> ArrayOfOne(T value) {
  Array<T> array{ArrayDims(1)};
  array[0] = value;
  return array;
}

/// The histograms of one raster, whatever its pixel type.
class Histograms {
 public:
  virtual ~Histograms() = default;
  /// Adds the commands that count. @param raster  a variable or URI.
  virtual void AddSteps(JobDraft& draft, const String& raster) const = 0;
  /// Takes what they gave. Throws HostError where a band is missing.
  virtual void TakeCounts(const JobResults& results) = 0;
  virtual Json AsJson() const = 0;
  virtual std::string AsText() const = 0;
  virtual HistogramPlot Draw() const = 0;
};

template <typename T>
class TypedHistograms final : public Histograms {
 public:
  /// Chooses the bins; looks for the smallest and largest values where they decide.
  TypedHistograms(const Options& options, JobSession& session, ProgressStyle style,
                  const String& raster, const Array<unsigned>& bands)
      : options_(options), style_(style), bands_(bands) {
    all_ = ChooseBins(session, raster);
  }

  /// Bands of the same bins are counted in one pass.
  void AddSteps(JobDraft& draft, const String& raster) const override {
    const std::vector<BandBins<T>>& bands = all_;
    std::vector<bool> isDone(bands.size());
    for (std::size_t i = 0; i < bands.size(); ++i) {
      if (isDone[i]) continue;
      std::vector<unsigned> same;
      for (std::size_t j = i; j < bands.size(); ++j) {
        if (isDone[j] || !bands[j].HasBinsOf(bands[i])) continue;
        isDone[j] = true;
        same.push_back(bands[j].band);
      }
      Array<unsigned> list{ArrayDims(static_cast<unsigned>(same.size()))};
      std::copy(same.begin(), same.end(), list.begin());
      JobWriterCommand& count =
          draft.Step("count" + std::to_string(i), "CalculateRasterHistogramCommand");
      count.AddInput("URI", raster);
      count.AddInput("LowerBound", bands[i].lower);
      count.AddInput("UpperBound", bands[i].upper);
      if (bands[i].askedCount != 0) {
        count.AddInput("BinCount", bands[i].askedCount);
      } else {
        count.AddInput("BinSize", bands[i].size);
      }
      count.AddInput("Bands", list);
      count.AddInput("Bins", Form::kExact);
      count.AddInput("Wait", Waiting::kAlways);
    }
    for (const BandBins<T>& bins : bands) {
      Array<unsigned> band{ArrayDims(1)};
      band[0] = bins.band;
      JobWriterCommand& get = draft.Step(NameOf(bins), "GetRasterHistogramCommand");
      get.AddInput("URI", raster);
      get.AddInput("Bands", band);
      get.AddInput("Wait", Waiting::kAlways);
    }
  }

  /// A raster may have more histograms than those asked for. One that was stored may have the same
  /// bounds and sizes, and bins of the told form; the one that was counted comes last.
  void TakeCounts(const JobResults& results) override {
    for (BandBins<T>& bins : all_) {
      const auto found = ParseValue<Array<RasterBandHistogram<T>>>(
          results.Find(String(NameOf(bins))).returns.Find("Histograms"));
      const RasterBandHistogram<T>* chosen = nullptr;
      for (const RasterBandHistogram<T>& histogram : found) {
        const bool isAskedFor = histogram.band == bins.band &&
                                histogram.sign == HistogramSign::kBoth &&
                                histogram.min == bins.lower && histogram.max == bins.upper &&
                                histogram.binSize == bins.size;
        const bool isBetter = chosen == nullptr || histogram.source == StatsSource::kDynamic;
        if (isAskedFor && isBetter) chosen = &histogram;
      }
      if (chosen == nullptr) {
        throw HostError(kExitFailed, fmt::format("{}: there is no histogram of band {}",
                                                 options_.file, bins.band));
      }
      bins.counts.assign(chosen->counts.begin(), chosen->counts.end());
    }
  }

  Json AsJson() const override {
    Json list = Json::array();
    for (const BandBins<T>& bins : all_) {
      list.push_back({{"band", bins.band},
                      {"min", NumberAsJson(bins.lower)},
                      {"max", NumberAsJson(bins.upper)},
                      {"binSize", bins.size},
                      {"counts", bins.counts}});
    }
    return {{"file", options_.file}, {"bands", list}};
  }

  std::string AsText() const override {
    std::string text = Printable(options_.file) + "\n";
    for (const BandBins<T>& bins : all_) {
      const std::uint64_t counted =
          std::accumulate(bins.counts.begin(), bins.counts.end(), std::uint64_t{0});
      text += fmt::format("\nband {}: {} bins of {} from {} to {}, {} values\n", bins.band,
                          bins.counts.size(), bins.size, bins.lower, bins.upper, counted);
      for (std::size_t i = 0; i < bins.counts.size(); ++i) {
        if (bins.counts[i] == 0) continue;
        const double from = static_cast<double>(bins.lower) + static_cast<double>(i) * bins.size;
        text += fmt::format("{:>16.10g} {:>14}\n", from, bins.counts[i]);
      }
    }
    return text;
  }

  HistogramPlot Draw() const override {
    std::vector<PlottedHistogram> shown;
    for (const BandBins<T>& bins : all_) {
      shown.push_back({"band " + std::to_string(bins.band), static_cast<double>(bins.lower),
                       bins.size, bins.counts});
    }
    return HistogramPlot(shown);
  }

 private:
  std::vector<BandBins<T>> ChooseBins(JobSession& session, const String& raster) {
    const bool isBeyond =
        options_.lower.value_or(0) > static_cast<double>(std::numeric_limits<T>::max()) ||
        options_.upper.value_or(0) < static_cast<double>(std::numeric_limits<T>::lowest());
    if (isBeyond) {
      throw HostError(kExitUsage, "between the bounds there is no value that the pixels can have");
    }
    Array<T> lowest{bands_.GetDims()}, highest{bands_.GetDims()};
    constexpr bool kIsByte = sizeof(T) == 1;
    if (!kIsByte && !(options_.lower && options_.upper)) {
      ReadExtremes(session, raster, lowest, highest);
    }
    std::vector<BandBins<T>> all;
    for (unsigned i = 0; i < bands_.GetCount(); ++i) {
      BandBins<T> bins;
      bins.band = bands_[i];
      bins.lower = kIsByte ? std::numeric_limits<T>::min() : lowest[i];
      bins.upper = kIsByte ? std::numeric_limits<T>::max() : highest[i];
      if (options_.lower) bins.lower = BoundAs<T>(*options_.lower, "--lower");
      if (options_.upper) bins.upper = BoundAs<T>(*options_.upper, "--upper");
      if (bins.upper < bins.lower) {
        throw HostError(kExitUsage, fmt::format("band {}: the lower bound {} is above the upper "
                                                "one, {}",
                                                bins.band, bins.lower, bins.upper));
      }
      ChooseSize(bins);
      all.push_back(bins);
    }
    return all;
  }

  /// Bins of the size that is asked for, or as many as are; by default 256, or of whole numbers
  /// those of the smallest whole size that makes no more.
  void ChooseSize(BandBins<T>& bins) const {
    constexpr bool kIsWhole = std::is_integral_v<T>;
    if (options_.binSize) {
      bins.size = *options_.binSize;
      CheckSize(bins);
      return;
    }
    if (kIsWhole && !options_.bins) {
      bins.size = std::ceil(ValuesBetween(bins.lower, bins.upper) / kUsualBins);
      return;
    }
    bins.askedCount = options_.bins.value_or(kUsualBins);
    if (kIsWhole && ValuesBetween(bins.lower, bins.upper) < bins.askedCount) {
      bins.askedCount = static_cast<unsigned>(ValuesBetween(bins.lower, bins.upper));
    }
    bins.size = RasterHistogram<T>(1, ArrayOfOne(bins.askedCount), ArrayOfOne(bins.lower),
                                   ArrayOfOne(bins.upper), HistogramSign::kBoth, Form::kExact)
                    .BinSize(0);
  }

  void CheckSize(const BandBins<T>& bins) const {
    const double span = static_cast<double>(bins.upper) - static_cast<double>(bins.lower);
    if (span / bins.size >= kMostBins) {
      throw HostError(kExitUsage, fmt::format("--bin-size: from {} to {} there would be more than "
                                              "{} bins",
                                              bins.lower, bins.upper, kMostBins));
    }
  }

  /// Smallest and largest values of the bands.
  void ReadExtremes(JobSession& session, const String& raster, Array<T>& lowest,
                    Array<T>& highest) {
    JobDraft draft;
    AddBandView(draft, "bands", raster, bands_);
    JobWriterCommand& stats = draft.Step(kStatsStep, "GetBasicRasterStatsCommand");
    stats.AddVariableInput("URI", "$bands");
    stats.AddInput("Wait", Waiting::kAlways);
    draft.Close("close.bands", "$bands");
    const ProgressView view(ProgressOfStep(session, draft, kStatsStep), style_);
    const JobResults results = session.Run(draft);
    const Map<String, String>& returns = results.Find(kStatsStep).returns;
    lowest = ParseValue<Array<T>>(returns.Find("Min"));
    highest = ParseValue<Array<T>>(returns.Find("Max"));
    if (lowest.GetCount() == bands_.GetCount() && highest.GetCount() == bands_.GetCount()) return;
    throw HostError(kExitFailed, options_.file + ": there are no statistics of all bands");
  }

  static std::string NameOf(const BandBins<T>& bins) { return "bins" + std::to_string(bins.band); }

  const Options& options_;
  const ProgressStyle style_;
  const Array<unsigned> bands_;
  std::vector<BandBins<T>> all_;
};

class HistVerb final : public FileVerb {
 public:
  explicit HistVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Without bounds, the bins reach from the smallest to the largest value of each band, or "
        "over all values of an 8-bit type; there are 256, or fewer where whole numbers fill fewer "
        "bins of one whole size. Every value within the bounds is in one bin; the last bin holds "
        "the upper bound too. Values outside the bounds do not count; bounds that the pixels can't "
        "reach are limited to what they can. With --json: \"file\" and \"bands\", a list of "
        "objects with \"band\", \"min\", \"max\", \"binSize\" and \"counts\". -o draws them.");
    line.AddExample("vexg hist scene.tif --bands 0,1,2 -o scene-histogram.png");
    line.Add("--bands", options_.bands, "Bands, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    line.Add("--lower", options_.lower, "Smallest value that counts").Shows("VALUE");
    line.Add("--upper", options_.upper, "Largest value that counts").Shows("VALUE");
    line.Add("--bins", options_.bins, "How many bins; no more than there are whole numbers")
        .Within(1, kMostBins);
    line.Add("--bin-size", options_.binSize, "Width of a bin").Shows("SIZE");
    line.Add("--output,-o", output_, "A picture of the histograms, a PNG or JPEG")
        .IsFile("OUT.png|jpg");
    AddOverwriteTo(line, "a picture that is there");
    line.Add("--save", saves_, "Store the histograms with the raster");
    line.Add("--json", isJson_, "As JSON");
  }

 private:
  void CheckOptions() override {
    options_.file = GetSource().file;
    if (options_.bins && options_.binSize) {
      throw HostError(kExitUsage, "--bins and --bin-size exclude each other");
    }
    if (options_.binSize && !(*options_.binSize > 0 && std::isfinite(*options_.binSize))) {
      throw HostError(kExitUsage, "--bin-size: the size of a bin is above 0");
    }
    if (!output_.empty()) CheckPictureName(output_);
  }

  std::vector<std::string> GetOutputs() const override {
    return output_.empty() ? std::vector<std::string>() : std::vector{output_};
  }

  std::vector<std::string> GetChangedFiles() const override {
    return saves_ ? FilesOfSavedValues(GetSource()) : std::vector<std::string>();
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpenWithPyramid(draft, "raster", GetSource());
    AddQuery(draft, "raster", "$raster");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    raster_ = opened.Find("raster").returns.Find("URI");
    const RasterInfo info = ReadInfo(opened, "raster");
    const Array<unsigned> bands = ParseBands(options_.bands, info);
    const bool isReal = DispatchType(TenTypes{}, info.dataType, [&]<typename T>() {
      histograms_ = std::make_unique<TypedHistograms<T>>(options_, session, GetProgressStyle(),
                                                         raster_, bands);
      return true;
    });
    if (isReal) return;
    throw HostError(kExitFailed, GetSource().file + ": complex pixels have no histogram");
  }

  JobDraft GetJob(const Outputs& /*outputs*/) const override {
    JobDraft draft;
    AddOpenWithPyramid(draft, "raster", GetSource());
    histograms_->AddSteps(draft, "$raster");
    if (saves_) AddSave(draft, kSaveCommand, "$raster");
    draft.Close("close", "$raster");
    return draft;
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    JobDraft draft;
    histograms_->AddSteps(draft, raster_);
    {
      const ProgressView view(session.GetProgress(), GetProgressStyle());
      histograms_->TakeCounts(session.Run(draft));
    }
    if (!output_.empty()) histograms_->Draw().Write(outputs.Get(0));
  }

  void Save(JobSession& session) override {
    if (saves_) SaveValues(session, GetSource(), kSaveCommand, raster_, "histograms");
  }

  std::string Describe() const override {
    if (isJson_) return histograms_->AsJson().dump(2) + "\n";
    return output_.empty() ? histograms_->AsText() : std::string();
  }

  Options options_;
  std::string output_;
  bool saves_ = false;
  bool isJson_ = false;

  String raster_;  // URI
  std::unique_ptr<Histograms> histograms_;
};

const VerbRegistration registration("hist", "Counts the values of a raster's bands into bins",
                                    &SetUp<HistVerb>);

}  // namespace
}  // namespace lumo::host
