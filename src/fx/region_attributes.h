#pragma once

#include <map>
#include <memory>

#include "fx/store_file.h"

namespace lumo {

/// Keeps values for each region, band and attribute. A region is a segment of a label raster, and
/// its label is its index here. The last attribute of a band marks that the region is there.
///
///     SpectralRegionAttributesMap regions(bands);
///     regions.Value(label, 0, SpectralRegionAttributes::kMean) += pixel;
///     ++regions.Value(label, 0, SpectralRegionAttributes::kPixelCount);  // and with it the mark
///
/// Bands and attributes are not checked.
///
/// Threads: one at a time, for reading too.
template <typename T>
class RegionAttributes : public AttributeTable {
 public:
  static const unsigned TypeCode;

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }

  /// Regions in the store: those of a map, or the records of a file.
  virtual unsigned RegionCount() = 0;

  /// True when the last attribute of the band is at least 1.
  virtual bool RegionExists(unsigned region, unsigned band) const {
    return Value(region, band, static_cast<unsigned>(AttributeExtent()) - 1) >= T{1};
  }

  /// The value to read.
  virtual const T& Value(unsigned region, unsigned band, unsigned attribute) const = 0;
  /// The value to write; in a file the reference is good until another value is touched.
  virtual T& Value(unsigned region, unsigned band, unsigned attribute) = 0;

  /// Forgets all regions of a map. Has no effect on a file.
  virtual void Clear() = 0;

 protected:
  using AttributeTable::AttributeTable;
};

/// Regions in memory: those that were touched so far, by reading too. Always valid; a region for
/// which there is no memory stays away, RegionAttributeErrorBadAllocation is stored, and its values
/// lead to a place of no region.
template <typename T>
class RegionAttributesMap : public RegionAttributes<T> {
  using Base = RegionAttributes<T>;

 public:
  static const unsigned TypeCode;

  RegionAttributesMap(unsigned bands, unsigned attributes) : Base(bands, attributes) {}

  bool IsA(unsigned typeCode) const override { return typeCode == TypeCode || Base::IsA(typeCode); }
  bool IsValid() const override { return true; }

  unsigned RegionCount() final { return static_cast<unsigned>(records_.size()); }
  const T& Value(unsigned region, unsigned band, unsigned attribute) const final {
    return At(region, band, attribute);
  }
  T& Value(unsigned region, unsigned band, unsigned attribute) final {
    return At(region, band, attribute);
  }
  void Clear() final;

  /// The regions in ascending order.
  Array<unsigned> GetRegions() const;

 private:
  T& At(unsigned region, unsigned band, unsigned attribute) const {
    // Neighbouring pixels mostly are of one region.
    if (last_ == nullptr || region != lastRegion_) Find(region);
    if (last_ == nullptr) return nowhere_ = T();
    return last_[this->PairOf(band, attribute)];
  }
  void Find(unsigned region) const;

  mutable std::map<unsigned, std::unique_ptr<T[]>> records_;
  mutable unsigned lastRegion_ = 0;
  mutable T* last_ = nullptr;  // null: none
  mutable T nowhere_{};
};

/// Regions in a file of the form "FXA50", see docs/file-formats.md: a record lies at a place that
/// the number of its region gives, so all regions up to the largest are there, with 0 where nothing
/// was written.
///
/// Valid once the header was checked or made, as long as no error is stored. Of a file that has
/// another header nothing is read, and nothing in it changes.
template <typename T>
class RegionAttributesFile : public RegionAttributes<T> {
  using Base = RegionAttributes<T>;

 public:
  static const unsigned TypeCode;
  static constexpr unsigned kPageSize = 16384;  ///< elements

  /// Opens a file.
  RegionAttributesFile(const URI& uri, bool writable);
  /// Creates a file. Of more than 65,535 bands or attributes none is made.
  RegionAttributesFile(const URI& uri, unsigned bands, unsigned attributes);

  bool IsA(unsigned typeCode) const override { return typeCode == TypeCode || Base::IsA(typeCode); }
  bool IsValid() const override { return file_.IsValid(); }

  unsigned RegionCount() final;
  const T& Value(unsigned region, unsigned band, unsigned attribute) const final {
    return file_.Elements().At(PlaceOf(region, band, attribute));
  }
  T& Value(unsigned region, unsigned band, unsigned attribute) final {
    return file_.Elements().Ref(PlaceOf(region, band, attribute));
  }
  void Clear() final {}

  /// Completes the file and closes it; see StoreFile.
  bool Close() { return file_.Close(*this); }

 protected:
  /// Makes a file that was opened not valid unless it has these counts.
  void Require(unsigned bands, unsigned attributes);

 private:
  std::uint64_t PlaceOf(unsigned region, unsigned band, unsigned attribute) const {
    return region * this->Pairs() + this->PairOf(band, attribute);
  }

  mutable StoreFile<T> file_;
};

extern template class VEXG_EXPORT RegionAttributes<float>;
extern template class VEXG_EXPORT RegionAttributesMap<float>;
extern template class VEXG_EXPORT RegionAttributesFile<float>;

}  // namespace lumo
