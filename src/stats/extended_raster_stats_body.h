#pragma once

#include <cstring>
#include <memory>
#include <vector>

#include "stats/extended_raster_stats.h"

namespace lumo {

/// The sums between the bands of one part of a tile. Values are taken less a shift for each band,
/// which is near its mean, or 0 where sums are exact: sums of integers of up to 16 bits are exact
/// as doubles within a plane, and those of 8 bits as integers.
///
/// While all bands are valid in the same pixels, one count and one sum for each band serve all
/// pairs. Where they are not, the sums are over the pixels that two bands have in common: sums of
/// products with the weights.
template <typename T>
class ExtendedRasterStats<T>::PairSums {
 public:
  static constexpr bool kExact = std::is_same_v<PairAccumulator, ExactPairAccumulator>;
  using Sum = std::conditional_t<kExact, std::int64_t, double>;
  using Value = std::conditional_t<sizeof(T) == 1, std::int16_t, double>;  // of a plane
  using Product = std::conditional_t<sizeof(T) == 1, std::int32_t, double>;

  explicit PairSums(unsigned bands)
      : bands_(bands), shifts_(bands), seen_(bands), sums_(bands), products_(Square()) {}

  /// Starts a group of `count` pixels.
  void Begin(std::size_t count) {
    count_ = count;
    if (count * bands_ > room_) {
      room_ = count * bands_;
      planes_ = std::make_unique_for_overwrite<Value[]>(room_);
    }
    partial_ = false;
    groupCounts_.assign(bands_, count);
    groupSums_.assign(bands_, 0);
  }

  void SetBand(unsigned band, const SummedPlane<T>& plane) {
    Value* const values = planes_.get() + band * count_;
    groupCounts_[band] = plane.valid.count;
    if (plane.valid.count == 0) {
      std::fill_n(values, count_, Value(0));
      std::fill_n(WeightsOf(band), count_, Value(0));
      return;
    }
    const auto valid = static_cast<double>(plane.valid.count);
    if constexpr (kExact) {
      const auto fillers = static_cast<std::int64_t>(count_ - plane.valid.count);
      groupSums_[band] = plane.sums.sum - plane.valid.filler * fillers;
    } else {
      // Sums of 32-bit integers have no shift of their own.
      double mean;
      if constexpr (kExactStats<T>) {
        const auto fillers = static_cast<std::int64_t>(count_ - plane.valid.count);
        mean = static_cast<double>(plane.sums.sum - plane.valid.filler * fillers) / valid;
      } else {
        mean = plane.sums.shift + plane.sums.sum / valid;
      }
      if (!seen_[band]) shifts_[band] = mean;
      groupSums_[band] = (mean - shifts_[band]) * valid;
    }
    seen_[band] = true;
    if constexpr (sizeof(T) == 1) {
      Widen(plane.valid.values, count_, values);
    } else {
      Widen(plane.valid.values, count_, shifts_[band], values);
    }
    if (plane.valid.mask != nullptr) {
      WeighPlane(plane.valid.mask, count_, values, WeightsOf(band));
    }
  }

  void End() {
    for (unsigned i = 0; i + 1 < bands_; ++i) {
      DotAndAdd(Plane(i), Plane(i + 1), bands_ - 1 - i, &products_[At(i, i + 1)]);
    }
    if (SameWeights()) {
      wholeCount_ += groupCounts_[0];
      for (unsigned band = 0; band < bands_; ++band) sums_[band] += groupSums_[band];
      return;
    }
    commonCounts_.resize(Square());
    commonSums_.resize(Square());
    for (unsigned i = 0; i < bands_; ++i) {
      if (i + 1 < bands_) {
        DotAndAdd(Weights(i), Weights(i + 1), bands_ - 1 - i, &commonCounts_[At(i, i + 1)]);
      }
      DotAndAdd(Plane(i), Weights(0), bands_, &commonSums_[At(i, 0)]);
    }
  }

  void AddTo(Array<PairAccumulator>& pairs) const {
    for (unsigned i = 0; i < bands_; ++i) {
      for (unsigned j = i + 1; j < bands_; ++j) pairs[At(i, j)].Merge(Pair(i, j));
    }
  }

 private:
  std::size_t Square() const { return std::size_t{bands_} * bands_; }
  std::size_t At(unsigned i, unsigned j) const { return std::size_t{i} * bands_ + j; }
  const Value* Plane(unsigned band) const { return planes_.get() + band * count_; }
  const Value* Weights(unsigned band) const { return weights_.data() + band * count_; }

  /// The weights of a band, to be written; those of the bands without any are 1.
  Value* WeightsOf(unsigned band) {
    if (!partial_) weights_.assign(count_ * bands_, Value(1));
    partial_ = true;
    return weights_.data() + band * count_;
  }

  bool SameWeights() const {
    if (!partial_) return true;
    for (unsigned band = 1; band < bands_; ++band) {
      if (groupCounts_[band] != groupCounts_[0] ||
          std::memcmp(Weights(band), Weights(0), count_ * sizeof(Value)) != 0) {
        return false;
      }
    }
    return true;
  }

  void DotAndAdd(const Value* x, const Value* y, std::size_t planes, Sum* sums) {
    dots_.resize(bands_);
    Dot(x, y, planes, count_, count_, dots_.data());
    for (std::size_t i = 0; i < planes; ++i) sums[i] += static_cast<Sum>(dots_[i]);
  }

  PairAccumulator Pair(unsigned i, unsigned j) const {
    Sum n = static_cast<Sum>(wholeCount_);
    Sum sumX = sums_[i];
    Sum sumY = sums_[j];
    if (!commonCounts_.empty()) {
      n += commonCounts_[At(i, j)];
      sumX += commonSums_[At(i, j)];
      sumY += commonSums_[At(j, i)];
    }
    PairAccumulator pair;
    pair.count = static_cast<std::uint64_t>(n);
    if (pair.count == 0) return pair;
    const Sum products = products_[At(i, j)];
    if constexpr (kExact) {
      pair.sumX = sumX;
      pair.sumY = sumY;
      pair.products = products;
    } else {
      pair.mean = shifts_[i] + sumX / n;
      pair.meanY = shifts_[j] + sumY / n;
      pair.c = products - sumX * sumY / n;
      pair.sumXY = products + shifts_[j] * sumX + shifts_[i] * sumY + n * shifts_[i] * shifts_[j];
    }
    return pair;
  }

  const unsigned bands_;
  std::vector<double> shifts_;
  std::vector<bool> seen_;  // the bands that have a shift
  std::uint64_t wholeCount_ = 0;
  std::vector<Sum> sums_;
  std::vector<Sum> products_;      // above the diagonal
  std::vector<Sum> commonCounts_;  // above the diagonal
  std::vector<Sum> commonSums_;    // (i, j): of band i where j is valid too

  // The group at hand.
  std::size_t count_ = 0;
  bool partial_ = false;
  std::size_t room_ = 0;
  std::unique_ptr<Value[]> planes_;
  std::vector<Value> weights_;
  std::vector<std::size_t> groupCounts_;
  std::vector<Sum> groupSums_;
  std::vector<Product> dots_;
};

template <typename T>
void ExtendedRasterStats<T>::Reset(unsigned bandCount) {
  RasterStats<T>::Reset(bandCount);
  sumXY_.Resize(ArrayDims());
  cov_.Resize(ArrayDims());
  pairs_ = Array<PairAccumulator>();
  if (this->BandCount() != 0 && !pairs_.Resize(ArrayDims(bandCount, bandCount))) {
    RasterStats<T>::Reset(0);
  }
}

template <typename T>
bool ExtendedRasterStats<T>::Accumulate(const Tile<T>& tile, unsigned rowFrom, unsigned rowTo,
                                        unsigned columnFrom, unsigned columnTo) {
  if (!IsValid() || !this->Fits(tile)) return false;
  const unsigned bands = this->BandCount();
  PairSums pairs(bands);
  ValidPlanes<T> planes;
  PlaneWalk<T>(tile).ForEach({rowFrom, rowTo, columnFrom, columnTo},
                             [&](const PlaneGroup<T>& group) {
                               pairs.Begin(group.count);
                               for (unsigned band = 0; band < bands; ++band) {
                                 const SummedPlane<T> plane = SumBand(group, band, planes);
                                 this->AddBand(band, plane, group.count);
                                 pairs.SetBand(band, plane);
                               }
                               pairs.End();
                             });
  pairs.AddTo(pairs_);
  return true;
}

template <typename T>
bool ExtendedRasterStats<T>::Merge(const ExtendedRasterStats& other) {
  if (!IsValid() || !other.IsValid() || !RasterStats<T>::Merge(other)) return false;
  const unsigned bands = this->BandCount();
  for (unsigned i = 0; i < bands; ++i) {
    for (unsigned j = i + 1; j < bands; ++j) {
      const std::size_t at = std::size_t{i} * bands + j;
      pairs_[at].Merge(other.pairs_[at]);
    }
  }
  return true;
}

template <typename T>
void ExtendedRasterStats<T>::Save(ShareWriter& out) const {
  RasterStats<T>::Save(out);
  for (PairAccumulator pair : pairs_) {
    pair.ForEachNumber([&](const auto& number) { out.Put(number); });
  }
}

template <typename T>
bool ExtendedRasterStats<T>::Restore(ShareReader& in) {
  bool isThere = RasterStats<T>::Restore(in);
  for (PairAccumulator& pair : pairs_) {
    pair.ForEachNumber([&](auto& number) { isThere = isThere && in.Get(number); });
  }
  return isThere;
}

template <typename T>
bool ExtendedRasterStats<T>::Finish() {
  const unsigned bands = this->BandCount();
  const ArrayDims dims(bands, bands);
  if (!IsValid() || pairs_.GetCount() != dims.count || !RasterStats<T>::Finish()) return false;
  if (!sumXY_.Resize(dims) || !cov_.Resize(dims)) {
    Reset(0);
    return false;
  }
  for (std::size_t i = 0; i < bands; ++i) {
    sumXY_[i * bands + i] = this->Sums2()[i];
    cov_[i * bands + i] = this->Stds()[i] * this->Stds()[i];
    for (std::size_t j = i + 1; j < bands; ++j) {
      const PairAccumulator& pair = pairs_[i * bands + j];
      const std::uint64_t n = pair.count;
      sumXY_[i * bands + j] = sumXY_[j * bands + i] = n == 0 ? 0 : pair.SumXY();
      cov_[i * bands + j] = cov_[j * bands + i] = n < 2 ? 0 : pair.C() / static_cast<double>(n - 1);
    }
  }
  pairs_.Resize(ArrayDims());
  return true;
}

}  // namespace lumo
