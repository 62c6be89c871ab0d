#include "rasters/segment_curves.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "commands/value_text.h"
#include "output/json_number.h"
#include "pictures/plot.h"

namespace lumo::host {
namespace {

/// The curve from its lower end on, without the last hundredth, which takes most of the width.
PlotPanel PanelOf(const char* title, const char* across, const char* up,
                  const SegmentCurve& curve) {
  PlotPanel panel{title, across, up, curve.low, curve.binSize > 0 ? curve.binSize : 1, {0}};
  panel.form = PlotPanel::Form::kCurve;
  constexpr double kEnd = 0.99, kPercent = 100;
  for (const double share : curve.shares) {
    panel.values.push_back(share * kPercent);
    if (share >= kEnd) break;
  }
  return panel;
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
  DrawPlot({PanelOf("Gradients below which a share of the pixels lies", "gradient",
                    "share of the pixels (%)", gradients),
            PanelOf("Costs below which a share of the merges lies", "cost of merging two segments",
                    "share of the merges (%)", costs)})
      .Write(output);
}

}  // namespace lumo::host
