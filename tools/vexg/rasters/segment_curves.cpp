#include "rasters/segment_curves.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "commands/value_text.h"
#include "output/json_number.h"
#include "pictures/histogram_plot.h"

namespace lumo::host {
namespace {

/// Leaves out the last hundredth, which takes most of the width.
PlottedHistogram Plot(const char* title, const SegmentCurve& curve) {
  PlottedHistogram plot{title, curve.low, curve.binSize > 0 ? curve.binSize : 1, {}};
  constexpr double kEnd = 0.99, kHeight = 100;  // percent
  for (const double share : curve.shares) {
    plot.counts.push_back(static_cast<std::uint64_t>(std::lround(share * kHeight)));
    if (share >= kEnd) break;
  }
  if (plot.counts.empty()) plot.counts.push_back(0);
  return plot;
}

Json CurveAsJson(const SegmentCurve& curve) {
  return {{"low", curve.low}, {"binSize", curve.binSize}, {"shares", curve.shares}};
}

}  // namespace

double SegmentCurve::At(double share) const {
  if (shares.empty() || shares.back() == 0) return 0;  // nothing counts
  const auto bin = std::lower_bound(shares.begin(), shares.end(), share);
  const double before = bin == shares.begin() ? 0.0 : *(bin - 1);
  const double within =
      bin == shares.end() || *bin <= before ? 0 : (share - before) / (*bin - before);
  return low + (static_cast<double>(bin - shares.begin()) + within) * binSize;
}

SegmentCurves SegmentCurves::Read(const Map<String, String>& fit,
                                  const Map<String, String>& gradients,
                                  const Map<String, String>& costs) {
  SegmentCurves curves;
  curves.gradients.low = ParseValue<double>(fit.Find("MinGradient"));
  curves.gradients.binSize = ParseValue<double>(gradients.Find("SegmentBinSize"));
  for (const double share : ParseValue<Array<double>>(gradients.Find("SegmentHistogram"))) {
    curves.gradients.shares.push_back(share);
  }
  curves.costs.binSize = ParseValue<double>(costs.Find("LambdaBinSize"));
  const auto counts = ParseValue<Array<unsigned>>(costs.Find("LambdaHistogram"));
  const double all = counts.GetCount() == 0 ? 0 : counts[counts.GetCount() - 1];
  for (const unsigned count : counts) {
    curves.costs.shares.push_back(all == 0 ? 0 : count / all);
  }
  return curves;
}

std::string SegmentCurves::AsText() const {
  std::string text = "percent       gradient     merge cost\n";
  for (const double percent :
       {5.0, 10.0, 20.0, 30.0, 40.0, 50.0, 60.0, 70.0, 80.0, 90.0, 95.0, 99.0}) {
    text += fmt::format("{:>7g} {:>14.6g} {:>14.6g}\n", percent, gradients.At(percent / 100),
                        costs.At(percent / 100));
  }
  return text;
}

std::string SegmentCurves::AsJson(const std::string& file) const {
  return Json{{"file", file}, {"gradients", CurveAsJson(gradients)}, {"costs", CurveAsJson(costs)}}
             .dump(2) +
         "\n";
}

void SegmentCurves::Draw(const OutputFile& output) const {
  HistogramPlot({Plot("gradients", gradients), Plot("costs", costs)}).Write(output);
}

}  // namespace lumo::host
