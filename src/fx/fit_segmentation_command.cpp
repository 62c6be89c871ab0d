#include <algorithm>
#include <type_traits>

#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/segment_command.h"

namespace lumo {
namespace {

constexpr double kManyLevels = 65000;

const CommandDeclaration kFitSegmentation{
    "FitSegmentationCommand",
    "Feature extraction",
    "Finds what FxTileSegmentMergeCommand needs to know of the gradients of a raster, and of what "
    "merging costs.",
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
      "percentage of all merges to do; MergeValue is their cost"}},
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
    passes_ = 1 + (HasInput("SegmentPercent") ? 1 : 0) + (HasInput("MergePercent") ? 1 : 0);
    if (!FindLimits() || !FindSegmentValue() || !FindMergeValue()) {
      return Fail(TakeFaultOr("the raster could not be read"));
    }
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

  bool FindLimits() {
    bool well = false, isWhole = false;
    const bool isReal = DispatchType(EightTypes{}, segment_->DataType(), [&]<typename T>() {
      RasterSegmentLimitsProcess<T> process(RasterPtr<T>(segment_), ReadAlgorithm(), NextPass());
      well = process.RunProcess(process.kHere);
      if (well && process.Least() <= process.Most()) {
        low_ = process.Least();
        high_ = process.Most();
      }
      isWhole = std::is_integral_v<T>;
      return true;
    });
    if (!isReal) SetFault("SegmentURI: the raster has no real pixels of at most 64 bits");
    if (ReadAlgorithm() == SegmentAlgorithm::kSobel) low_ = 0;
    constexpr double kMostLevels = 1 << 24;
    const double range = high_ - low_;
    stretch_ = isWhole && range <= kMostLevels ? std::max(range, 1.0) : kManyLevels;
    isWhole_ = isWhole && range < kManyLevels;
    return well;
  }

  bool FindSegmentValue() {
    segmentValue_ = HasInput("SegmentValue") ? Read<double>("SegmentValue") : low_;
    if (!HasInput("SegmentPercent") || !(high_ > low_)) return true;
    GradientBins bins{low_, high_, {}};
    if (!isWhole_) bins.count = static_cast<unsigned>(kManyLevels);
    GradientHistogram histogram;
    if (!CountGradients(segment_, ReadAlgorithm(), bins, NextPass(), histogram)) return false;
    const double share = Read<double>("SegmentPercent") / 100;
    segmentValue_ = std::min(low_ + BinAt(histogram.shares, share) * histogram.binSize, high_);
    return true;
  }

  bool FindMergeValue() {
    if (!HasInput("MergePercent") || Read<double>("MergePercent") == 0) return true;
    SegmentRequest request;
    request.algorithm = ReadAlgorithm();
    request.stretch = {low_, high_, 0.0, stretch_};
    request.limits = ClipLimits::Of(low_, high_, segmentValue_, stretch_);
    const Pointer<Array<unsigned>> histogram(new Array<unsigned>(ArrayDims(kLambdaBins)));
    std::fill(histogram->begin(), histogram->end(), 0U);
    const ScalarPtr<double> binSize(new Scalar<double>(0.0));
    bool well = false;
    DispatchType(EightTypes{}, segment_->DataType(), [&]<typename T>() {
      RasterTileWatershedSegmentFLSEstimateProcess<T> process(
          RasterPtr<T>(segment_), RasterPtr<T>(merge_), request, histogram, binSize, NextPass());
      well = process.RunProcess(process.kHere);
      return true;
    });
    mergeValue_ = BinAt(*histogram, Read<double>("MergePercent") / 100) * binSize->value;
    return well;
  }

  BasicRasterPtr segment_, merge_;
  double passes_ = 1;
  bool isWhole_ = false;  // gradients are integers of few values
  double low_ = 0, high_ = 0, stretch_ = 0, segmentValue_ = 0, mergeValue_ = 0;
};

const CommandFactoryT<FitSegmentationCommand> fitSegmentationFactory(kFitSegmentation);

}  // namespace
}  // namespace lumo
