#pragma once

#include "raster/pixel_types.h"
#include "raster/raster_enums.h"

namespace lumo {

/// The value of one statistic of a band: for Min and Max a pixel, for every other a number.
template <typename T>
struct StatValue {
  T pixel{};          ///< of Min and Max
  double number = 0;  ///< of every other statistic
};

/// Holds the statistics of the valid pixels of one band. A plain value; `mask` says which of its
/// fields are at hand.
///
/// Its text form is band, mask, min, max, mean, std, sum, sum2, rms, then sumXY and cov as arrays,
/// separated by white space. Numbers are written so that they read back to the same value. The
/// pixel count is not part of it. Exists for TenTypes.
///
///     const RasterBandStats<float> stats = raster->ComputeBandStats(0, StatsMask::Basic, ipc);
///     if ((stats.mask & StatsMask::Basic) != StatsMask::Basic) return false;  // it failed
///     const double cv = stats.std / stats.mean;
template <typename T>
struct RasterBandStats {
  unsigned band = 0;                ///< from 0, in the raster that gave them
  std::uint64_t pixelCount = 0;     ///< valid pixels
  unsigned mask = StatsMask::None;  ///< bits of StatsMask
  T min{};
  T max{};
  double mean = 0;
  double std = 0;  ///< of a sample: divided by n - 1
  double sum = 0;
  double sum2 = 0;      ///< sum of the squares
  double rms = 0;       ///< square root of the mean of the squares
  Array<double> sumXY;  ///< entry i: sum of the products with band i
  Array<double> cov;    ///< entry i: covariance with band i

  /// Sets the entry of `otherBand`, the last of the array from then on, and the bit of the mask.
  void SetSumXY(unsigned otherBand, double value);
  void SetCov(unsigned otherBand, double value);  ///< likewise

  /// The field of a statistic that is a number of the band alone; null for every other.
  static double RasterBandStats::*NumberField(StatsMask::Code stat) {
    switch (stat) {
      case StatsMask::Mean:
        return &RasterBandStats::mean;
      case StatsMask::Std:
        return &RasterBandStats::std;
      case StatsMask::Sum:
        return &RasterBandStats::sum;
      case StatsMask::Sum2:
        return &RasterBandStats::sum2;
      case StatsMask::RMS:
        return &RasterBandStats::rms;
      default:
        return nullptr;
    }
  }
  /// The value of a statistic as it stands here, at hand or not; of a pair that there isn't 0.
  StatValue<T> ValueOf(StatsMask::Code stat, unsigned otherBand) const {
    if (stat == StatsMask::Min || stat == StatsMask::Max) {
      return {stat == StatsMask::Min ? min : max, 0};
    }
    if (const auto field = NumberField(stat)) return {T(), this->*field};
    const Array<double>& pairs = stat == StatsMask::SumXY ? sumXY : cov;
    return {T(), otherBand < pairs.GetCount() ? pairs[otherBand] : 0.0};
  }
};

/// Writes the text form.
template <typename T>
std::ostream& operator<<(std::ostream& out, const RasterBandStats<T>& stats);
/// A text that breaks off fails the stream and leaves the default.
template <typename T>
std::istream& operator>>(std::istream& in, RasterBandStats<T>& stats);

/// Holds the histogram of one band: counts[i] values lie in bin i, which begins at min + i *
/// binSize. A plain value; `source` kUnknown marks an empty one.
///
/// Its text form is band, sign, binSize, binCount, min, max, the word of the source and the counts,
/// separated by one blank; floating-point numbers in scientific form with 16 digits after the
/// point. The bounds of an 8-bit type are single characters, in UTF-8, where the value stands for a
/// printing one; every other value is a number of two digits at least ("00"). Exists for TenTypes.
template <typename T>
struct RasterBandHistogram {
  unsigned band = 0;
  double binSize = 0;  ///< width of a bin, in pixel values
  unsigned binCount = 0;
  Array<unsigned long long> counts;  ///< binCount entries
  T min{};                           ///< bounds, both inclusive
  T max{};
  StatsSource source = StatsSource::kUnknown;  ///< who counted
  unsigned reserved = 0;                       ///< 0
  HistogramSign sign = HistogramSign::kBoth;   ///< which values of the bounds counted
  Form bins = Form::kTold;  ///< how values found their bins; not compared, nor part of the text
};

/// Says which values of which bands are to be counted, into which bins. RasterHistogram explains
/// the bins of both forms.
///
///     HistogramRequest<float> request{0.0F, 1.0F};
///     request.binCount = 256;
///     const AsyncPtr run = raster->CountHistogram(request, ipc);
template <typename T>
struct HistogramRequest {
  T lower{};  ///< of the values that count, both inclusive
  T upper{};
  double binSize = 0;     ///< above 0: the width of a bin
  unsigned binCount = 0;  ///< how many bins, where there is no size
  Array<unsigned> bands;  ///< none: all
  HistogramSign sign = HistogramSign::kBoth;
  Form bins = Form::kTold;  ///< which rule gives a value its bin
};

/// Equal in everything but the bin size.
template <typename T>
bool operator==(const RasterBandHistogram<T>& a, const RasterBandHistogram<T>& b);
/// Writes the text form.
template <typename T>
std::ostream& operator<<(std::ostream& out, const RasterBandHistogram<T>& histogram);
/// A text that breaks off fails the stream and leaves the default.
template <typename T>
std::istream& operator>>(std::istream& in, RasterBandHistogram<T>& histogram);

}  // namespace lumo
