#pragma once

#include "fx/store_file.h"

namespace lumo {

/// Keeps statistics of each attribute over all regions: five for each band and attribute. Indexes
/// are not checked. Threads: one at a time, for reading too.
///
///     RegionAttributeStatsFile<float> stats(uri, bands, attributes);  // creates the file
///     stats.Mean(band, attribute) = mean;
///     if (!stats.Close()) return false;
template <typename T>
class RegionAttributeStats : public AttributeTable {
 public:
  static const unsigned TypeCode;
  /// The statistics, in the order of the file.
  enum Statistic : unsigned { kMean, kStdDev, kMin, kMax, kCount, kStatistics };

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }

  /// A statistic to read, and to write; a reference into a file is good until the next call.
  /// @param index  a Statistic.
  virtual const T& Value(unsigned band, unsigned attribute, unsigned index) const = 0;
  virtual T& Value(unsigned band, unsigned attribute, unsigned index) = 0;

  /// Mean of the attribute over the regions that are there.
  virtual const T& Mean(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kMean);
  }
  virtual T& Mean(unsigned band, unsigned attribute) { return Value(band, attribute, kMean); }
  /// Its standard deviation.
  virtual const T& StdDev(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kStdDev);
  }
  virtual T& StdDev(unsigned band, unsigned attribute) { return Value(band, attribute, kStdDev); }
  /// Its smallest value.
  virtual const T& Min(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kMin);
  }
  virtual T& Min(unsigned band, unsigned attribute) { return Value(band, attribute, kMin); }
  /// Its largest value.
  virtual const T& Max(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kMax);
  }
  virtual T& Max(unsigned band, unsigned attribute) { return Value(band, attribute, kMax); }
  /// The number of regions behind them.
  virtual const T& Count(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kCount);
  }
  virtual T& Count(unsigned band, unsigned attribute) { return Value(band, attribute, kCount); }

 protected:
  using AttributeTable::AttributeTable;
};

/// Statistics in a file of the form "FXAS50", see docs/file-formats.md and StoreFile.
template <typename T>
class RegionAttributeStatsFile final : public RegionAttributeStats<T> {
  using Base = RegionAttributeStats<T>;

 public:
  static const unsigned TypeCode;

  /// Opens a file, for reading and writing.
  explicit RegionAttributeStatsFile(const URI& uri);
  /// Creates a file. Of more than 65,535 bands or attributes none is made.
  RegionAttributeStatsFile(const URI& uri, unsigned bands, unsigned attributes);

  bool IsA(unsigned typeCode) const override { return typeCode == TypeCode || Base::IsA(typeCode); }
  bool IsValid() const override { return file_.IsValid(); }

  const T& Value(unsigned band, unsigned attribute, unsigned index) const override {
    return file_.Elements().At(PlaceOf(band, attribute, index));
  }
  T& Value(unsigned band, unsigned attribute, unsigned index) override {
    return file_.Elements().Ref(PlaceOf(band, attribute, index));
  }

  /// Completes the file and closes it; see StoreFile.
  bool Close() { return file_.Close(*this); }

 private:
  std::uint64_t PlaceOf(unsigned band, unsigned attribute, unsigned index) const {
    return this->PairOf(band, attribute) * Base::kStatistics + index;
  }

  mutable StoreFile<T> file_;
};

extern template class VEXG_EXPORT RegionAttributeStats<float>;
extern template class VEXG_EXPORT RegionAttributeStatsFile<float>;

}  // namespace lumo
