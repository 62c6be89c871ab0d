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
  kStd,
  kSum,
  kMedian,
  kMajority,
  kMinority,
  kVariety,
  kPercentile
};

/// A figure that is asked for.
struct ZonalRequest {
  ZonalFigure figure = ZonalFigure::kCount;
  double percent = 0;  ///< of a kPercentile
  std::string name;    ///< as it was asked for
};

/// Reads "count", "min", "max", "mean", "std", "sum", "median", "majority", "minority", "variety"
/// or "p" and a percentage from 0 to 100. @return false, with the fault told, for anything else.
VEXG_EXPORT bool ParseZonalRequest(const std::string& text, ZonalRequest& request);

/// Whether a figure needs to know the values, beside their sums.
VEXG_EXPORT bool NeedsValues(ZonalFigure figure);

/// How much a pixel of a zone weighs. None: each 1. Coverage: the share of it inside the polygon.
enum class ZonalWeights : std::int32_t { kNone = 0, kCoverage = 1 };

/// "None", "Coverage".
VEXG_EXPORT std::span<const EnumWord<ZonalWeights>> WordsOf(ZonalWeights);

}  // namespace lumo
