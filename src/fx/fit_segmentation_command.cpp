#include <algorithm>
#include <cstdlib>
#include <limits>
#include <type_traits>

#include <fmt/format.h>

#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/lambda_tasks.h"
#include "fx/segment_command.h"

namespace lumo {
namespace {

constexpr double kManyLevels = 65000;

const CommandDeclaration kFitSegmentation{
    "FitSegmentationCommand",
    "Feature extraction",
    "Finds what FxTileSegmentMergeCommand needs to know of the gradients of a raster, and of what "
    "merging costs.",
    WithShareInputs(
        {{"SegmentURI", Presence::kRequired, ValueKind::kURI,
          "the raster from which the gradients are computed"},
         {"SegmentAlgorithm", Presence::kRequired, ValueKind::kInteger,
          "1: the largest Sobel gradient of the bands; else the mean of the bands"},
         {"SegmentValue", Presence::kOptional, ValueKind::kNumber,
          "gradients up to this one are one flat level; the smallest gradient when absent"},
         {"SegmentPercent", Presence::kOptional, ValueKind::kNumber,
          "percentage of the pixels whose gradients are one flat level, instead of SegmentValue"},
         {"MergeURI", Presence::kOptional, ValueKind::kURI,
          "the raster whose bands drive merging; that of SegmentURI when absent"},
         {"MergePercent", Presence::kOptional, ValueKind::kNumber,
          "percentage of all merges to do; MergeValue is their cost"}}),
    {{"MinGradient", ValueKind::kNumber, "the smallest gradient; 0 with SegmentAlgorithm 1"},
     {"MaxGradient", ValueKind::kNumber, "the largest gradient"},
     {"StretchValue", ValueKind::kNumber,
      "a highest level that keeps integer gradients apart, or 65000"},
     {"SegmentValue", ValueKind::kNumber, "gradients up to this one are one flat level"},
     {"MergeValue", ValueKind::kNumber, "cost up to which segments are merged; 0 for none"}}};

/// Finds where a share of what is counted is reached: in bins, with the part of the last one.
template <typename T>
double BinAt(const Array<T>& cumulative, double share) {
  const unsigned count = cumulative.GetCount();
  if (count == 0 || !(cumulative[count - 1] > T())) return 0;
  const double wanted = share * static_cast<double>(cumulative[count - 1]);
  unsigned bin = 0;
  while (bin + 1 < count && static_cast<double>(cumulative[bin]) < wanted) ++bin;
  const double before = bin == 0 ? 0.0 : static_cast<double>(cumulative[bin - 1]);
  const double within = static_cast<double>(cumulative[bin]) - before;
  return bin + (within > 0 ? std::clamp((wanted - before) / within, 0.0, 1.0) : 0.0);
}

/// The passes over the raster.
unsigned PassesOf(bool hasSegmentPercent, double mergePercent) {
  return 1 + (hasSegmentPercent ? 1 : 0) + (mergePercent != 0 ? 1 : 0);
}

class FitSegmentationCommand final : public SegmentCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    segment_ = FindRaster("SegmentURI");
    if (!segment_) return Fail();
    merge_ = HasInput("MergeURI") ? FindRaster("MergeURI") : segment_;
    if (!merge_ || !CheckAlike(*segment_, *merge_)) return Fail();
    for (const char* const name : {"SegmentPercent", "MergePercent"}) {
      const auto percent = Read<double>(name);
      if (!(percent >= 0 && percent <= 100)) return Fail(String(name) + ": 0 to 100 percent");
    }
    passes_ = PassesOf(HasInput("SegmentPercent"), Read<double>("MergePercent"));
    if (!ReadShares(KeyOfShares(), passes_)) return Fail();
    if (!FindLimits() || !FindSegmentValue() || !FindMergeValue()) {
      return Fail(TakeFaultOr("the raster could not be read"));
    }
    if (IsShare()) return Succeed();
    Write("MinGradient", low_);
    Write("MaxGradient", high_);
    Write("StretchValue", stretch_);
    Write("SegmentValue", segmentValue_);
    Write("MergeValue", mergeValue_);
    return Succeed();
  }

  /// The abort flag, and the next of the passes' shares of the progress.
  IPC NextPass() const {
    return IPC(GetIPC().abort,
               ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, passes_)));
  }

  std::string KeyOfShares() const {
    return fmt::format("gradients {} {} {} {} {} {} {} {}", segment_->DataType(),
                       segment_->Samples(), segment_->Lines(), segment_->Bands(), merge_->Bands(),
                       static_cast<int>(ReadAlgorithm()), Read<double>("SegmentPercent"),
                       Read<double>("SegmentValue"));
  }

  /// Does a pass over the tiles, or takes what its shares have come to, or does one of these and
  /// writes its file; then nothing else is to be done.
  /// @param compute  does a part of the tiles, and adds to what is found.
  /// @param put,get  hand what is found, or what a share has found, to a file, and add it.
  template <typename Compute, typename Put, typename Get>
  bool DoPass(const Compute& compute, const Put& put, const Get& get) {
    const unsigned pass = pass_++;
    const SegmentShares* const shares = Shares();
    if (shares == nullptr) return compute(TileRange{});
    if (pass < shares->Rounds()) {
      for (unsigned share = 0; share < shares->Count(); ++share) {
        ShareReader from;
        if (!shares->Open(pass, share, 0, from)) return false;
        if (!get(from) || !from.IsAtEnd()) return shares->Refuse(pass, share);
      }
      return true;
    }
    if (pass > shares->Rounds()) return true;  // the share is done
    std::uint64_t tiles = 0;
    DispatchType(EightTypes{}, segment_->DataType(), [&]<typename T>() {
      const SegmentGrid grid = GradientGrid<T>(*segment_);
      tiles = std::uint64_t{grid.columns} * grid.rows;
      return true;
    });
    const TileRange range = TileRange::Of(GetShare(), tiles);
    if (range.count != 0 && !compute(range)) return false;
    ShareWriter out;
    put(out);
    return shares->Write(out, ShareFile(), GetShare().index);
  }

  bool FindLimits() {
    bool isWhole = false;
    double least = std::numeric_limits<double>::infinity(), most = -least;
    const auto add = [&](double low, double high) {
      least = std::min(least, low);
      most = std::max(most, high);
    };
    const auto compute = [&](const TileRange& tiles) {
      bool well = false;
      DispatchType(EightTypes{}, segment_->DataType(), [&]<typename T>() {
        RasterSegmentLimitsProcess<T> process(RasterPtr<T>(segment_), ReadAlgorithm(), NextPass(),
                                              tiles);
        well = process.RunProcess(process.kHere);
        add(process.Least(), process.Most());
        return true;
      });
      return well;
    };
    const auto put = [&](ShareWriter& to) {
      to.Put(least);
      to.Put(most);
    };
    const auto get = [&](ShareReader& from) {
      double low = 0, high = 0;
      if (!from.Get(low) || !from.Get(high)) return false;
      add(low, high);
      return true;
    };
    const bool isReal = DispatchType(EightTypes{}, segment_->DataType(), [&]<typename T>() {
      isWhole = std::is_integral_v<T>;
      return true;
    });
    if (!isReal) {
      SetFault("SegmentURI: the raster has no real pixels of at most 64 bits");
      return false;
    }
    if (!DoPass(compute, put, get)) return false;
    if (least <= most) {
      low_ = least;
      high_ = most;
    }
    if (ReadAlgorithm() == SegmentAlgorithm::kSobel) low_ = 0;
    constexpr double kMostLevels = 1 << 24;
    const double range = high_ - low_;
    stretch_ = isWhole && range <= kMostLevels ? std::max(range, 1.0) : kManyLevels;
    isWhole_ = isWhole && range < kManyLevels;
    return true;
  }

  bool FindSegmentValue() {
    segmentValue_ = HasInput("SegmentValue") ? Read<double>("SegmentValue") : low_;
    if (!HasInput("SegmentPercent")) return true;
    GradientBins bins{low_, high_, {}};
    if (!isWhole_) bins.count = static_cast<unsigned>(kManyLevels);
    const bool isFlat = !(high_ > low_);  // there is nothing to count then
    std::vector<std::uint64_t> counts;
    const auto add = [&counts](const std::vector<std::uint64_t>& more) {
      counts.resize(std::max(counts.size(), more.size()));
      for (std::size_t i = 0; i < more.size(); ++i) counts[i] += more[i];
    };
    const bool isDone = DoPass(
        [&](const TileRange& tiles) {
          std::vector<std::uint64_t> found;
          if (!isFlat &&
              !CountGradientsOf(segment_, ReadAlgorithm(), bins, tiles, NextPass(), found)) {
            return false;
          }
          add(found);
          return true;
        },
        [&](ShareWriter& to) { PutList(to, counts); },
        [&](ShareReader& from) {
          std::vector<std::uint64_t> found;
          if (!GetList(from, found)) return false;
          add(found);
          return true;
        });
    if (!isDone) return false;
    if (isFlat || IsShareDone()) return true;
    GradientHistogram histogram;
    if (!MakeHistogram(bins, counts, histogram)) return false;
    const double share = Read<double>("SegmentPercent") / 100;
    segmentValue_ = std::min(low_ + BinAt(histogram.shares, share) * histogram.binSize, high_);
    return true;
  }

  /// True when the share is done, and what comes behind is of no use.
  bool IsShareDone() const { return IsShare() && pass_ > Shares()->Rounds(); }

  bool FindMergeValue() {
    if (!HasInput("MergePercent") || Read<double>("MergePercent") == 0) return true;
    SegmentRequest request;
    request.algorithm = ReadAlgorithm();
    request.stretch = {low_, high_, 0.0, stretch_};
    request.limits = ClipLimits::Of(low_, high_, segmentValue_, stretch_);
    const Pointer<Array<unsigned>> histogram(new Array<unsigned>(ArrayDims(kLambdaBins)));
    std::fill(histogram->begin(), histogram->end(), 0U);
    const ScalarPtr<double> binSize(new Scalar<double>(0.0));
    std::vector<double> lambdas;
    const auto compute = [&](const TileRange& tiles) {
      bool well = false;
      DispatchType(EightTypes{}, segment_->DataType(), [&]<typename T>() {
        RasterTileWatershedSegmentFLSEstimateProcess<T> process(
            RasterPtr<T>(segment_), RasterPtr<T>(merge_), request, histogram, binSize, NextPass(),
            tiles, &lambdas);
        well = process.RunProcess(process.kHere);
        return true;
      });
      return well;
    };
    const auto get = [&](ShareReader& from) {
      std::vector<double> found;
      if (!GetList(from, found)) return false;
      lambdas.insert(lambdas.end(), found.begin(), found.end());
      return true;
    };
    if (!DoPass(
            compute, [&](ShareWriter& to) { PutList(to, lambdas); }, get))
      return false;
    CountLambdas(lambdas, *histogram, binSize->value);
    mergeValue_ = BinAt(*histogram, Read<double>("MergePercent") / 100) * binSize->value;
    return true;
  }

  BasicRasterPtr segment_, merge_;
  unsigned passes_ = 1, pass_ = 0;
  bool isWhole_ = false;  // gradients are integers of few values
  double low_ = 0, high_ = 0, stretch_ = 0, segmentValue_ = 0, mergeValue_ = 0;
};

const CommandFactoryT<FitSegmentationCommand> fitSegmentationFactory(kFitSegmentation);
const DivisionRegistration fitSegmentationDivision(
    {.command = "FitSegmentationCommand",
     .kind = DivisionKind::kShares,
     .source = "SegmentURI",
     .rounds =
         [](unsigned, const DivisionInputs& inputs) {
           const std::string* const percent = inputs("MergePercent");
           return PassesOf(inputs("SegmentPercent") != nullptr,
                           percent != nullptr ? std::atof(percent->c_str()) : 0);
         },
     .whyNot = [](const DivisionInputs& inputs, unsigned) -> std::string {
       const std::string* const percent = inputs("MergePercent");
       return percent != nullptr && percent->starts_with('$') ? "MergePercent isn't known before"
                                                              : "";
     }});

}  // namespace
}  // namespace lumo
