#include "rasters/band_bins.h"

#include <fmt/format.h>

#include "raster/band_values.h"
#include "raster/pixel_types.h"
#include "rasters/raster_source.h"
#include "stats/turn.h"

namespace lumo::host {
namespace {

constexpr const char* kCountStep = "count";
constexpr const char* kStatsStep = "stats";

template <typename T>
std::vector<BandBins> ReadBinsOf(const String& histograms) {
  std::vector<BandBins> all;
  for (const auto& histogram : ParseValue<Array<RasterBandHistogram<T>>>(histograms)) {
    all.push_back({histogram.band,
                   NumberAsJson(histogram.min),
                   NumberAsJson(histogram.max),
                   fmt::format("{} to {}", histogram.min, histogram.max),
                   static_cast<double>(histogram.min),
                   histogram.binSize,
                   {histogram.counts.begin(), histogram.counts.end()}});
  }
  return all;
}

}  // namespace

void AddCounting(JobDraft& draft, const String& raster, const Array<unsigned>& bands,
                 unsigned dataType, const BinLimits& limits) {
  const bool needsExtremes = DataTypeBytes(dataType) > 1 && !(limits.lower && limits.upper);
  if (needsExtremes) {
    AddBandView(draft, "bands", raster, bands);
    JobWriterCommand& stats = draft.Step(kStatsStep, "GetBasicRasterStatsCommand");
    stats.AddVariableInput("URI", "$bands");
    stats.AddInput("Wait", Waiting::kAlways);
    stats.AddOutput("Min", "$lowest");
    stats.AddOutput("Max", "$highest");
    draft.Close("close.bands", "$bands");
  }
  JobWriterCommand& count = draft.Step(kCountStep, "FitRasterHistogramCommand");
  count.AddInput("URI", raster);
  count.AddInput("Bands", bands);
  if (needsExtremes) {
    count.AddVariableInput("Lowest", "$lowest");
    count.AddVariableInput("Highest", "$highest");
  }
  if (limits.lower) count.AddInput("LowerBound", *limits.lower);
  if (limits.upper) count.AddInput("UpperBound", *limits.upper);
  if (limits.binCount) count.AddInput("BinCount", *limits.binCount);
  if (limits.binSize) count.AddInput("BinSize", *limits.binSize);
  count.AddInput("Wait", Waiting::kAlways);
}

std::vector<BandBins> ReadBins(const JobResults& results, unsigned dataType) {
  std::vector<BandBins> all;
  DispatchType(TenTypes{}, dataType, [&]<typename T>() {
    all = ReadBinsOf<T>(results.Find(kCountStep).returns.Find("Histograms"));
    return true;
  });
  return all;
}

Json AsJson(const std::vector<BandBins>& all) {
  Json list = Json::array();
  for (const BandBins& bins : all) {
    list.push_back({{"band", bins.band},
                    {"min", bins.min},
                    {"max", bins.max},
                    {"binSize", bins.size},
                    {"counts", bins.counts}});
  }
  return list;
}

}  // namespace lumo::host
