#include <cmath>

#include "foundation/fault.h"
#include "fx/segment_command.h"
#include "stats/raster_histogram.h"

namespace lumo {
namespace {

RasterHistogramPtr<double> MakeBins(const GradientBins& bins) {
  const auto array = []<typename T>(T value) {
    Array<T> one{ArrayDims(1)};
    one[0] = value;
    return one;
  };
  const Array<double> min = array(bins.min), max = array(bins.max);
  constexpr double kMostWhole = 65001;
  constexpr unsigned kManyBins = 65000;
  const auto make = [&](const auto& sizes, Form form) {
    return RasterHistogramPtr<double>(
        new RasterHistogram<double>(1, sizes, min, max, HistogramSign::kBoth, form));
  };
  if (bins.count) return make(array(*bins.count), Form::kExact);
  if (std::trunc(bins.max - bins.min) < kMostWhole) return make(array(1.0), Form::kTold);
  return make(array(kManyBins), Form::kTold);
}

}  // namespace

bool CountGradientsOf(const BasicRasterPtr& raster, SegmentAlgorithm algorithm,
                      const GradientBins& bins, const TileRange& tiles, const IPC& ipc,
                      std::vector<std::uint64_t>& counts) {
  const RasterHistogramPtr<double> counted = MakeBins(bins);
  bool well = false;
  const bool isReal = DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
    RasterSegmentHistogramProcess<T> process(RasterPtr<T>(raster), algorithm, counted, ipc, tiles);
    well = process.RunProcess(process.kHere);
    return true;
  });
  if (!isReal) SetFault("SegmentURI: the raster has no real pixels of at most 64 bits");
  counts.assign(counted->Counts(0), counted->Counts(0) + counted->BinCount(0));
  return well;
}

bool MakeHistogram(const GradientBins& bins, const std::vector<std::uint64_t>& counts,
                   GradientHistogram& histogram) {
  const RasterHistogramPtr<double> empty = MakeBins(bins);
  const unsigned count = empty->BinCount(0);
  histogram.binSize = empty->BinSize(0);
  if (counts.size() != count || !histogram.shares.Resize(ArrayDims(count))) return false;
  double sum = 0;
  for (unsigned i = 0; i < count; ++i) {
    sum += static_cast<double>(counts[i]);
    histogram.shares[i] = sum;
  }
  if (sum > 0) {
    for (double& share : histogram.shares) share /= sum;
  }
  return true;
}

bool CountGradients(const BasicRasterPtr& raster, SegmentAlgorithm algorithm,
                    const GradientBins& bins, const IPC& ipc, GradientHistogram& histogram) {
  std::vector<std::uint64_t> counts;
  return CountGradientsOf(raster, algorithm, bins, {}, ipc, counts) &&
         MakeHistogram(bins, counts, histogram);
}

}  // namespace lumo
