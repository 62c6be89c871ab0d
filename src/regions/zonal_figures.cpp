#include "regions/zonal_figures.h"

#include <algorithm>
#include <charconv>

#include "foundation/fault.h"
#include "foundation/near_name.h"

namespace lumo {
namespace {

constexpr struct {
  const char* name;
  ZonalFigure figure;
} kFigures[] = {{"count", ZonalFigure::kCount},       {"min", ZonalFigure::kMin},
                {"max", ZonalFigure::kMax},           {"mean", ZonalFigure::kMean},
                {"std", ZonalFigure::kStd},           {"sum", ZonalFigure::kSum},
                {"median", ZonalFigure::kMedian},     {"majority", ZonalFigure::kMajority},
                {"minority", ZonalFigure::kMinority}, {"variety", ZonalFigure::kVariety}};

/// Reads "p" and a percentage.
bool ReadPercentile(const std::string& text, double& percent) {
  if (text.size() < 2 || text[0] != 'p') return false;
  const char* const end = text.data() + text.size();
  const auto [at, fault] = std::from_chars(text.data() + 1, end, percent);
  return fault == std::errc() && at == end && percent >= 0 && percent <= 100;
}

}  // namespace

bool ParseZonalRequest(const std::string& text, ZonalRequest& request) {
  request = {ZonalFigure::kPercentile, 0, text};
  if (ReadPercentile(text, request.percent)) return true;
  std::vector<std::string> known;
  for (const auto& [name, figure] : kFigures) {
    known.emplace_back(name);
    if (text != name) continue;
    request.figure = figure;
    return true;
  }
  SetFault(String(std::string("\"").append(Printable(text)).append("\" is no figure of a zone") +
                  DidYouMean(text, known)));
  return false;
}

bool NeedsValues(ZonalFigure figure) {
  switch (figure) {
    case ZonalFigure::kMedian:
    case ZonalFigure::kMajority:
    case ZonalFigure::kMinority:
    case ZonalFigure::kVariety:
    case ZonalFigure::kPercentile:
      return true;
    default:
      return false;
  }
}

std::span<const EnumWord<ZonalWeights>> WordsOf(ZonalWeights) {
  static constexpr EnumWord<ZonalWeights> kWords[] = {{"None", ZonalWeights::kNone},
                                                      {"Coverage", ZonalWeights::kCoverage}};
  return kWords;
}

}  // namespace lumo
