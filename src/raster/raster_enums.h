#pragma once

#include <cstdint>
#include <span>

#include "commands/value_text.h"

// The enumerations of rasters, with the words that they have in text. WordsOf gives the words of
// one in the order of its values; UnknownWordOf and UnknownValueOf stand for a value without a
// word, and a word without a value.

namespace lumo {

/// The order of the three axes of a pixel block, slowest first.
enum class Interleave : std::int32_t {
  None = -1,  ///< lines, samples: one band
  BIP = 0,    ///< lines, samples, bands
  BIL = 1,    ///< lines, bands, samples
  BSQ = 2,    ///< bands, lines, samples
};
VEXG_EXPORT std::span<const EnumWord<Interleave>> WordsOf(Interleave);
inline Interleave UnknownValueOf(Interleave) {
  return Interleave::None;
}
inline const char* UnknownWordOf(Interleave) {
  return "Unknown";
}

/// Who keeps the pyramid of a raster.
enum class PyramidType : unsigned {
  kNone = 0,
  kOrva = 1,    ///< the library's own pyramid file
  kDriver = 2,  ///< the format's driver
  kManual = 3,
};
VEXG_EXPORT std::span<const EnumWord<PyramidType>> WordsOf(PyramidType);
inline const char* UnknownWordOf(PyramidType) {
  return "None";
}

/// How pixels of a reduced level come about.
enum class PyramidResamplingMethod : unsigned {
  kUnknown = 0,
  kImpl = 1,      ///< the implementation's choice
  kNearest = 2,   ///< the pixel at the place
  kLinear = 3,    ///< from the pixels around it, by distance
  kCubic = 4,     ///< from 4 by 4 pixels
  kMajority = 5,  ///< the value that most of the pixels have
};
VEXG_EXPORT std::span<const EnumWord<PyramidResamplingMethod>> WordsOf(PyramidResamplingMethod);
inline const char* UnknownWordOf(PyramidResamplingMethod) {
  return "Unknown";
}

/// Which statistics a computation gives: all but the products between bands, or these too.
enum class StatsMode : unsigned { kBasic = 0, kExtended = 1 };
VEXG_EXPORT std::span<const EnumWord<StatsMode>> WordsOf(StatsMode);

/// Where statistics come from.
enum class StatsSource : unsigned {
  kUnknown = 0,
  kNative = 1,   ///< the data source
  kDynamic = 2,  ///< computed
  kOrva = 3,     ///< the library's own pyramid file
};
VEXG_EXPORT std::span<const EnumWord<StatsSource>> WordsOf(StatsSource);
inline const char* UnknownWordOf(StatsSource) {
  return "Unknown";
}

/// Which values a histogram counts: all, those from 0, or those below 0.
enum class HistogramSign : unsigned { kBoth = 0, kPositive = 1, kNegative = 2 };
VEXG_EXPORT std::span<const EnumWord<HistogramSign>> WordsOf(HistogramSign);

/// Bits of a pixel's state byte, one for each reason that it doesn't count. A pixel is valid when
/// none of the three is set.
struct PixelValueState {
  enum Code : unsigned char {
    Valid = 0,
    NoData = 1,      ///< it holds a no-data value, or is padding that stands for none
    Masked = 2,      ///< a mask excludes it
    OutsideROI = 4,  ///< it lies outside the region of interest
    NotValid = 7,    ///< all of them
  };
};

/// True when a pixel with this state counts.
constexpr bool IsValidState(unsigned char state) {
  return (state & PixelValueState::NotValid) == 0;
}

/// Bits that say which values of a RasterBandStats are at hand, or are asked for.
struct StatsMask {
  enum Code : unsigned {
    None = 0,
    Min = 1,  ///< and the pixel count
    Max = 2,
    Mean = 4,
    Std = 8,  ///< of a sample: divided by n - 1
    Sum = 16,
    Sum2 = 32,       ///< sum of the squares
    RMS = 64,        ///< square root of the mean of the squares
    SumXY = 128,     ///< sums of products with other bands
    Cov = 256,       ///< covariances with other bands
    Pairs = 384,     ///< SumXY and Cov, those between two bands
    Basic = 127,     ///< what StatsMode::kBasic gives
    Extended = 511,  ///< what StatsMode::kExtended gives
  };
};

}  // namespace lumo
