#pragma once

#include "foundation/buffer.h"

namespace lumo {

/// Statistics of each attribute over all regions: five for each band and attribute. Indexes are not
/// checked. Threads: one at a time, for reading too.
template <typename T>
class RegionAttributeStats : public Object {
 public:
  static const unsigned TypeCode;
  enum Statistic : unsigned { kMean, kStdDev, kMin, kMax, kCount, kStatistics };

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }

  /// A statistic to read, and to write. @param index  a Statistic.
  virtual const T& Value(unsigned band, unsigned attribute, unsigned index) const = 0;
  virtual T& Value(unsigned band, unsigned attribute, unsigned index) = 0;

  virtual unsigned Bands() const { return bands_; }
  virtual unsigned Attributes() const { return attributes_; }

  virtual const T& Mean(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kMean);
  }
  virtual T& Mean(unsigned band, unsigned attribute) { return Value(band, attribute, kMean); }
  virtual const T& StdDev(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kStdDev);
  }
  virtual T& StdDev(unsigned band, unsigned attribute) { return Value(band, attribute, kStdDev); }
  virtual const T& Min(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kMin);
  }
  virtual T& Min(unsigned band, unsigned attribute) { return Value(band, attribute, kMin); }
  virtual const T& Max(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kMax);
  }
  virtual T& Max(unsigned band, unsigned attribute) { return Value(band, attribute, kMax); }
  virtual const T& Count(unsigned band, unsigned attribute) const {
    return Value(band, attribute, kCount);
  }
  virtual T& Count(unsigned band, unsigned attribute) { return Value(band, attribute, kCount); }

 protected:
  RegionAttributeStats() = default;
  void SetCounts(unsigned bands, unsigned attributes) {
    bands_ = bands;
    attributes_ = attributes;
  }

 private:
  unsigned bands_ = 0;
  unsigned attributes_ = 0;
};

/// Statistics in a file of the form "FXAS50", see docs/file-formats.md. Valid once the header was
/// checked or made, as long as no error is stored. Of a file that has another header nothing is
/// read, and nothing in it changes.
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
  bool IsValid() const override { return isValid_ && buffer_.IsValid(); }

  const T& Value(unsigned band, unsigned attribute, unsigned index) const override {
    return buffer_.At(PlaceOf(band, attribute, index));
  }
  T& Value(unsigned band, unsigned attribute, unsigned index) override {
    return buffer_.Ref(PlaceOf(band, attribute, index));
  }

  /// Completes the file and closes it. A file that was written has no valid header before.
  /// @return false when it isn't whole on the disk; the error is stored, and TakeFault says why.
  bool Close();

 private:
  std::uint64_t PlaceOf(unsigned band, unsigned attribute, unsigned index) const {
    return (band * attributeExtent_ + attribute) * Base::kStatistics + index;
  }
  void TakeCounts(unsigned bands, unsigned attributes);

  mutable Buffer<T> buffer_;
  std::uint64_t attributeExtent_ = 1;
  bool isValid_ = false;
};

extern template class VEXG_EXPORT RegionAttributeStats<float>;
extern template class VEXG_EXPORT RegionAttributeStatsFile<float>;

}  // namespace lumo
