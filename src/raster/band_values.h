#pragma once

#include "raster/pixel_types.h"
#include "raster/raster_enums.h"

namespace lumo {

/// The statistics of one band. A plain value; `mask` tells which of its fields are at hand.
///
/// Its text form is band, mask, min, max, mean, std, sum, sum2, rms, then sumXY and cov as arrays,
/// separated by white space. Numbers are written so that they read back to the same value. The
/// pixel count is not part of it. Exists for TenTypes.
template <typename T>
struct RasterBandStats {
  unsigned band = 0;
  std::uint64_t pixelCount = 0;
  unsigned mask = StatsMask::None;
  T min{};
  T max{};
  double mean = 0;
  double std = 0;
  double sum = 0;
  double sum2 = 0;
  double rms = 0;
  Array<double> sumXY;  ///< entry i: sum of the products with band i
  Array<double> cov;    ///< entry i: covariance with band i

  /// Sets the entry of `otherBand`, the last of the array from then on, and the bit of the mask.
  void SetSumXY(unsigned otherBand, double value);
  void SetCov(unsigned otherBand, double value);
};

template <typename T>
std::ostream& operator<<(std::ostream& out, const RasterBandStats<T>& stats);
/// A text that breaks off fails the stream and leaves the default.
template <typename T>
std::istream& operator>>(std::istream& in, RasterBandStats<T>& stats);

/// The histogram of one band. A plain value; `source` kUnknown marks an empty one.
///
/// Its text form is band, sign, binSize, binCount, min, max, the word of the source and the counts,
/// separated by one blank; floating-point numbers in scientific form with 16 digits after the
/// point. The bounds of an 8-bit type are single characters, in UTF-8, where the value stands for a
/// printing one; every other value is a number of two digits at least ("00"). Exists for TenTypes.
template <typename T>
struct RasterBandHistogram {
  unsigned band = 0;
  double binSize = 0;
  unsigned binCount = 0;
  Array<unsigned long long> counts;  ///< binCount entries
  T min{};                           ///< bounds, both inclusive
  T max{};
  StatsSource source = StatsSource::kUnknown;
  unsigned reserved = 0;
  HistogramSign sign = HistogramSign::kBoth;
  Form bins = Form::kTold;  ///< how values found their bins; not compared, nor part of the text
};

/// Which values of which bands are to be counted, into which bins. RasterHistogram tells the bins
/// of both forms.
template <typename T>
struct HistogramRequest {
  T lower{};  ///< of the values that count, both inclusive
  T upper{};
  double binSize = 0;     ///< above 0: the width of a bin
  unsigned binCount = 0;  ///< how many bins, where there is no size
  Array<unsigned> bands;  ///< none: all
  HistogramSign sign = HistogramSign::kBoth;
  Form bins = Form::kTold;
};

/// Equal in everything but the bin size.
template <typename T>
bool operator==(const RasterBandHistogram<T>& a, const RasterBandHistogram<T>& b);
template <typename T>
std::ostream& operator<<(std::ostream& out, const RasterBandHistogram<T>& histogram);
/// A text that breaks off fails the stream and leaves the default.
template <typename T>
std::istream& operator>>(std::istream& in, RasterBandHistogram<T>& histogram);

}  // namespace lumo
