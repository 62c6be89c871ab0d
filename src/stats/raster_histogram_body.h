#pragma once

#include <algorithm>

#include "stats/exact_bins.h"
#include "stats/raster_histogram.h"

namespace lumo {
namespace detail {

/// Gives an array that isn't there so many zeros.
template <typename E>
void FillMissing(Array<E>& array, unsigned count) {
  if (array.GetCount() != 0 || !array.Resize(ArrayDims(count))) return;
  std::fill(array.begin(), array.end(), E());
}

}  // namespace detail

template <typename T>
RasterHistogram<T>::RasterHistogram(unsigned bandCount, const Array<double>& binSizes,
                                    const Array<T>& mins, const Array<T>& maxes, HistogramSign sign,
                                    Form bins)
    : bandCount_(bandCount),
      binSizes_(binSizes),
      mins_(mins),
      maxes_(maxes),
      sign_(sign),
      bins_(bins) {
  FillBins();
}

template <typename T>
RasterHistogram<T>::RasterHistogram(unsigned bandCount, const Array<unsigned>& binCounts,
                                    const Array<T>& mins, const Array<T>& maxes, HistogramSign sign,
                                    Form bins)
    : bandCount_(bandCount),
      binCounts_(binCounts),
      mins_(mins),
      maxes_(maxes),
      sign_(sign),
      bins_(bins) {
  FillBins();
}

template <typename T>
bool RasterHistogram<T>::FillBins() {
  detail::FillMissing(binSizes_, bandCount_);
  detail::FillMissing(binCounts_, bandCount_);
  detail::FillMissing(mins_, bandCount_);
  detail::FillMissing(maxes_, bandCount_);
  if (binSizes_.GetCount() != bandCount_ || binCounts_.GetCount() != bandCount_ ||
      mins_.GetCount() != bandCount_ || maxes_.GetCount() != bandCount_) {
    this->SetErrorState(ObjectErrorNotConstructed());
    return false;
  }
  unsigned most = 0;
  for (unsigned band = 0; band < bandCount_; ++band) {
    if (bins_ == Form::kExact) {
      FillBandExactly(band);
    } else {
      FillBand(band);
    }
    most = std::max(most, binCounts_[band]);
  }
  const ArrayDims dims = most == 0 ? ArrayDims() : ArrayDims(bandCount_, most);
  if (!this->IsValid() || most > kMostBins || !counts_.Resize(dims)) {
    this->SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
  std::fill(counts_.begin(), counts_.end(), 0ULL);
  return true;
}

template <typename T>
void RasterHistogram<T>::FillBand(unsigned band) {
  const T lower = mins_[band];
  const T upper = maxes_[band];
  unsigned& count = binCounts_[band];
  double& size = binSizes_[band];
  constexpr bool kInteger = std::is_integral_v<T>;
  if (kInteger && upper < lower) return;  // counts nothing, see CanCount
  if (count != 0 && size == 0.0) {
    if constexpr (kInteger) {
      using Wide = std::conditional_t<sizeof(T) < 8, std::int64_t, Int128>;
      const Wide span = static_cast<Wide>(upper) - lower;
      const Wide step = count == 1 ? span + 1 : std::max<Wide>(span / (count - 1), 1);
      const Wide last = static_cast<Wide>(lower) + step * count - 1;
      size = static_cast<double>(step);
      maxes_[band] = static_cast<T>(std::min<Wide>(last, std::numeric_limits<T>::max()));
    } else {
      const T span = upper - lower;
      size = static_cast<double>(count == 1 ? span + 1 : span / static_cast<T>(count - 1));
      maxes_[band] = static_cast<T>(count * size + static_cast<double>(lower)) - 1;
    }
  } else if (count == 0 && size > 0.0) {
    const double bins =
        std::trunc((static_cast<double>(upper) - static_cast<double>(lower)) / size) + 1;
    if (bins >= 1 && bins <= kMostBins) {
      count = static_cast<unsigned>(bins);
    } else if (bins >= 1) {
      count = kMostBins + 1;  // and there is no memory for that
    }
  }
}

template <typename T>
void RasterHistogram<T>::FillBandExactly(unsigned band) {
  const T lower = mins_[band];
  const T upper = maxes_[band];
  unsigned& count = binCounts_[band];
  double& size = binSizes_[band];
  if (upper < lower) return;  // counts nothing
  if (count != 0 && size == 0.0) {
    size = detail::ExactBinSize(lower, upper, count);
  } else if (count == 0 && size > 0.0) {
    count = detail::ExactBinCount(lower, upper, size, kMostBins);
  }
}

template <typename T>
bool RasterHistogram<T>::CanCount() const {
  if constexpr (std::is_integral_v<T>) {
    for (unsigned band = 0; band < bandCount_; ++band) {
      if (maxes_[band] < mins_[band]) return false;
    }
  }
  return this->IsValid();
}

template <typename T>
bool RasterHistogram<T>::Join(const RasterHistogram& other) {
  if (bandCount_ != other.bandCount_ || sign_ != other.sign_ || bins_ != other.bins_ ||
      !std::equal(binCounts_.begin(), binCounts_.end(), other.binCounts_.begin(),
                  other.binCounts_.end())) {
    return false;
  }
  for (unsigned i = 0; i < counts_.GetCount(); ++i) counts_[i] += other.counts_[i];
  return true;
}

template <typename T>
RasterBandHistogram<T> RasterHistogram<T>::BandHistogram(unsigned band,
                                                         unsigned numberInRaster) const {
  RasterBandHistogram<T> histogram;
  histogram.band = numberInRaster;
  histogram.source = StatsSource::kDynamic;
  histogram.sign = sign_;
  histogram.bins = bins_;
  histogram.binCount = binCounts_[band];
  histogram.binSize = binSizes_[band];
  histogram.min = mins_[band];
  histogram.max = maxes_[band];
  if (histogram.binCount != 0 && histogram.counts.Resize(ArrayDims(histogram.binCount))) {
    std::copy_n(Counts(band), histogram.binCount, histogram.counts.begin());
  }
  return histogram;
}

}  // namespace lumo
