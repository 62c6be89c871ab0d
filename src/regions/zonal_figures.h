#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "commands/value_text.h"

namespace lumo {

/// Figures of the pixels of a zone.
enum class ZonalFigure {
  kCount,
  kMin,
  kMax,
  kMean,
  kStd,  ///< of a sample: divided by n - 1
  kSum,
  kMedian,
  kMajority,   ///< the most frequent value
  kMinority,   ///< the least frequent value
  kVariety,    ///< the number of different values
  kPercentile  ///< the value below which a percentage of the pixels lies
};

/// A figure that is asked for.
struct ZonalRequest {
  ZonalFigure figure = ZonalFigure::kCount;
  double percent = 0;  ///< of a kPercentile
  std::string name;    ///< as it was asked for
};

/// Reads "count", "min", "max", "mean", "std", "sum", "median", "majority", "minority", "variety"
/// or "p" and a percentage from 0 to 100. @return false, with the fault set, for anything else.
VEXG_EXPORT bool ParseZonalRequest(const std::string& text, ZonalRequest& request);

/// True for a figure that needs the values, beside their sums.
VEXG_EXPORT bool NeedsValues(ZonalFigure figure);

/// Says how much a pixel of a zone weighs. None: each 1. Coverage: the share of it inside the
/// polygon.
enum class ZonalWeights : std::int32_t { kNone = 0, kCoverage = 1 };

/// "None", "Coverage".
VEXG_EXPORT std::span<const EnumWord<ZonalWeights>> WordsOf(ZonalWeights);

}  // namespace lumo
