#pragma once

#include "commands/share_file.h"
#include "raster/band_values.h"
#include "raster/tile.h"
#include "stats/plane_stats.h"

namespace lumo {

/// The statistics of the bands of a raster while they are computed, and then the results. Exists
/// for TenTypes.
///
/// A value counts when its state has none of the bits of PixelValueState::NotValid and it is
/// finite. Results are those of LargeStatsAccumulator, to the last few bits. Those of integers of
/// up to 32 bits come from exact sums: they do not depend on how the pixels were divided.
///
/// Failure: an object that could not be sized is not valid, and everything gives false.
///
///     RasterStats<float> stats(tile.Bands());
///     stats.Accumulate(tile, 0, tile.Height(), 0, tile.Width());
///     if (!stats.Finish()) return false;
///     const double mean = stats.Means()[0];
///
/// Threads: one at a time. Each thread of a loop has its own, and Merge brings them together.
template <typename T>
class RasterStats : public Object {
 public:
  static const unsigned TypeCode;

  explicit RasterStats(unsigned bandCount = 0) { Reset(bandCount); }

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }
  bool IsValid() const override { return accumulators_.IsValid() && Object::IsValid(); }

  /// Forgets everything, and makes room for so many bands.
  void Reset(unsigned bandCount);
  /// Bands of the raster.
  unsigned BandCount() const { return bandCount_; }

  /// Takes in the part of a tile from rowFrom to before rowTo and from columnFrom to before
  /// columnTo. @return false for a tile with another number of bands.
  bool Accumulate(const Tile<T>& tile, unsigned rowFrom, unsigned rowTo, unsigned columnFrom,
                  unsigned columnTo);
  /// Takes in what another object with as many bands has seen. The order of merges decides the last
  /// bits of floating-point results. @return false, with no change, for another number of bands.
  bool Merge(const RasterStats& other);
  /// Gives the sums so far to the file of a share, from which Restore takes them into an object of
  /// as many bands.
  void Save(ShareWriter& out) const;
  /// Takes in the sums of another object as its Save gave them. @return false at the end of the
  /// file.
  bool Restore(ShareReader& in);
  /// Computes the results, and forgets what they came from. @return false, with no results, for an
  /// object without bands, or one that is finished.
  bool Finish();

  // The results of Finish, one for each band; empty before. A band without a value has 0 in all.
  const Array<unsigned long long>& PixelCounts() const { return pixelCounts_; }
  const Array<T>& Mins() const { return mins_; }
  const Array<T>& Maxs() const { return maxs_; }
  const Array<double>& Means() const { return means_; }
  /// Deviations of a sample, divided by n - 1; 0 for one value.
  const Array<double>& Stds() const { return stds_; }
  const Array<double>& Sums() const { return sums_; }
  const Array<double>& Sums2() const { return sums2_; }  ///< sums of the squares
  const Array<double>& RMSs() const { return rmss_; }    ///< roots of the means of the squares

  /// The results of one band as a value, with the mask StatsMask::Basic.
  RasterBandStats<T> BandStats(unsigned band) const;

 protected:
  bool Fits(const Tile<T>& tile) const {
    return IsValid() && bandCount_ != 0 && tile.Bands() == bandCount_;
  }
  bool Fits(const RasterStats& other) const {
    return IsValid() && other.IsValid() && bandCount_ != 0 && bandCount_ == other.bandCount_ &&
           accumulators_.GetCount() == bandCount_ && other.accumulators_.GetCount() == bandCount_;
  }
  void AddBand(unsigned band, const SummedPlane<T>& plane, std::size_t count) {
    AddPlane(plane, count, accumulators_[band]);
  }

 private:
  Array<BandAccumulator<T>> accumulators_;
  Array<unsigned long long> pixelCounts_;
  Array<double> sums_;
  Array<double> sums2_;
  Array<T> mins_;
  Array<T> maxs_;
  Array<double> means_;
  Array<double> stds_;
  Array<double> rmss_;
  unsigned bandCount_ = 0;
};

template <typename T>
using RasterStatsPtr = Pointer<RasterStats<T>>;

VEXG_EXTERN(TEN, RasterStats);

}  // namespace lumo
