#pragma once

#include <cmath>

#include "stats/raster_stats.h"

namespace lumo {

template <typename T>
void RasterStats<T>::Reset(unsigned bandCount) {
  this->ClearErrorState();
  for (Array<double>* const results : {&sums_, &sums2_, &means_, &stds_, &rmss_}) {
    results->Resize(ArrayDims());
  }
  pixelCounts_.Resize(ArrayDims());
  mins_.Resize(ArrayDims());
  maxs_.Resize(ArrayDims());
  accumulators_ = Array<BandAccumulator<T>>();
  bandCount_ = accumulators_.Resize(ArrayDims(bandCount)) ? bandCount : 0;
}

template <typename T>
bool RasterStats<T>::Accumulate(const Tile<T>& tile, unsigned rowFrom, unsigned rowTo,
                                unsigned columnFrom, unsigned columnTo) {
  if (!Fits(tile)) return false;
  ValidPlanes<T> planes;
  PlaneWalk<T>(tile).ForEach({rowFrom, rowTo, columnFrom, columnTo},
                             [&](const PlaneGroup<T>& group) {
                               for (unsigned band = 0; band < bandCount_; ++band) {
                                 AddBand(band, SumBand(group, band, planes), group.count);
                               }
                             });
  return true;
}

template <typename T>
bool RasterStats<T>::Merge(const RasterStats& other) {
  if (!Fits(other)) return false;
  for (unsigned band = 0; band < bandCount_; ++band) {
    accumulators_[band].Merge(other.accumulators_[band]);
  }
  return true;
}

template <typename T>
void RasterStats<T>::Save(ShareWriter& out) const {
  for (BandAccumulator<T> band : accumulators_) {
    band.ForEachNumber([&](const auto& number) { out.Put(number); });
  }
}

template <typename T>
bool RasterStats<T>::Restore(ShareReader& in) {
  bool isThere = true;
  for (BandAccumulator<T>& band : accumulators_) {
    band.ForEachNumber([&](auto& number) { isThere = isThere && in.Get(number); });
  }
  return isThere;
}

template <typename T>
bool RasterStats<T>::Finish() {
  if (!IsValid() || bandCount_ == 0 || accumulators_.GetCount() < bandCount_) return false;
  const ArrayDims dims(bandCount_);
  bool sized = pixelCounts_.Resize(dims) && mins_.Resize(dims) && maxs_.Resize(dims);
  for (Array<double>* const results : {&sums_, &sums2_, &means_, &stds_, &rmss_}) {
    sized = sized && results->Resize(dims);
  }
  if (!sized) {
    bandCount_ = 0;
    return false;
  }
  for (unsigned band = 0; band < bandCount_; ++band) {
    const LargeStatsAccumulator<T> a = accumulators_[band].ToLarge();
    const bool any = a.count != 0;
    pixelCounts_[band] = a.count;
    mins_[band] = any ? a.min : T();
    maxs_[band] = any ? a.max : T();
    sums_[band] = a.sum;
    sums2_[band] = a.sum2;
    means_[band] = a.mean;
    stds_[band] = a.count > 1 ? std::sqrt(a.s / static_cast<double>(a.count - 1)) : 0;
    rmss_[band] = std::sqrt(a.meanSq);
  }
  accumulators_.Resize(ArrayDims());
  return true;
}

template <typename T>
RasterBandStats<T> RasterStats<T>::BandStats(unsigned band) const {
  RasterBandStats<T> stats;
  stats.band = band;
  stats.pixelCount = pixelCounts_[band];
  stats.mask = StatsMask::Basic;
  stats.min = mins_[band];
  stats.max = maxs_[band];
  stats.mean = means_[band];
  stats.std = stds_[band];
  stats.sum = sums_[band];
  stats.sum2 = sums2_[band];
  stats.rms = rmss_[band];
  return stats;
}

}  // namespace lumo
