#pragma once

#include "raster/band_values.h"
#include "raster/raster.h"

namespace lumo {

/// The histograms of the bands of a raster while they are counted: their bins and counts. Exists
/// for TenTypes.
///
/// A band has bins from `min` on, each `binSize` wide.
///
/// In the told form, made with bin counts, the size of a bin is
/// (upper - lower) / (bins - 1), upper - lower + 1 for one bin, and the upper bound becomes
/// lower + bins * size - 1; for integers in whole numbers, with sizes of 1 at least and the bound
/// limited to the type's largest value. Made with bin sizes, there are
/// trunc((upper - lower) / size) + 1 bins; integers find theirs by the whole part of the size. A
/// value behind the last bin is not counted.
///
/// In the exact form every value within the bounds is in one bin. Bin i holds the values v with
/// lower + i * size <= v < lower + (i + 1) * size, the last one the upper bound as well. Made with
/// bin counts, the size is (upper - lower) / bins, or 1 where the bounds are equal; an integer v
/// stands for all from v to v + 1, so that theirs is (upper - lower + 1) / bins. Made with bin
/// sizes, there are as many bins as hold the upper bound. The bounds stay as they are.
///
/// In both, a band with neither has no bins and counts nothing.
///
/// Failure: bins for which there is no memory, or 2^31 and more of them, leave an object that is
///          not valid.
template <typename T>
class RasterHistogram : public Object {
 public:
  static const unsigned TypeCode;

  /// Arrays have an element for each band; a missing one stands for zeros.
  RasterHistogram(unsigned bandCount, const Array<double>& binSizes, const Array<T>& mins,
                  const Array<T>& maxes, HistogramSign sign, Form bins = Form::kTold);
  RasterHistogram(unsigned bandCount, const Array<unsigned>& binCounts, const Array<T>& mins,
                  const Array<T>& maxes, HistogramSign sign, Form bins = Form::kTold);

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }

  /// Computes the sizes or numbers of bins that are missing, and makes all counts 0.
  /// @return whether it is valid then.
  bool FillBins();

  /// Bands that are counted.
  unsigned BandCount() const { return bandCount_; }
  HistogramSign Sign() const { return sign_; }
  Form Bins() const { return bins_; }
  /// Width of the bins of a band, in pixel values.
  double BinSize(unsigned band) const { return binSizes_[band]; }
  unsigned BinCount(unsigned band) const { return binCounts_[band]; }
  T Min(unsigned band) const { return mins_[band]; }   ///< where the first bin begins
  T Max(unsigned band) const { return maxes_[band]; }  ///< upper bound, inclusive

  /// The counts of a band's bins.
  unsigned long long* Counts(unsigned band) {
    return counts_.GetData() + std::size_t{band} * counts_.GetExtent(1);
  }
  const unsigned long long* Counts(unsigned band) const {
    return counts_.GetData() + std::size_t{band} * counts_.GetExtent(1);
  }

  /// True when a value may be counted: for integers an upper bound below the lower one is an error.
  bool CanCount() const;

  /// Adds the counts of another one. @return false, with no change, unless the numbers of bands and
  /// bins, the signs and the forms are the same.
  bool Join(const RasterHistogram& other);

  /// The histogram of one band as a value, under the number that the raster has for it.
  RasterBandHistogram<T> BandHistogram(unsigned band, unsigned numberInRaster) const;

 private:
  static constexpr unsigned kMostBins = 0x7FFFFFFE;

  void FillBand(unsigned band);
  void FillBandExactly(unsigned band);

  unsigned bandCount_;
  Array<unsigned long long> counts_;  // bands by the most bins of one
  Array<double> binSizes_;
  Array<unsigned> binCounts_;
  Array<T> mins_;
  Array<T> maxes_;
  HistogramSign sign_;
  Form bins_;
};

template <typename T>
using RasterHistogramPtr = Pointer<RasterHistogram<T>>;

VEXG_EXTERN(TEN, RasterHistogram);

}  // namespace lumo
