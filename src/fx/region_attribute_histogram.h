#pragma once

#include "fx/store_file.h"

namespace lumo {

/// Keeps a histogram of each attribute over all regions. Indexes are not checked. Threads: one at a
/// time, for reading too.
///
///     RegionAttributeHistogramMap<float> histograms(bands, attributes, 256);
///     histograms.LowerLimit(band, attribute) = 0;
///     histograms.UpperLimit(band, attribute) = 510;  // bins of 2
///     ++histograms.Count(band, attribute, bin);
template <typename T>
class RegionAttributeHistogram : public AttributeTable {
 public:
  static const unsigned TypeCode;

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }

  /// Bins of each histogram.
  virtual unsigned Bins() const { return bins_; }

  /// The lowest value of the first bin, to read and to write.
  virtual const T& LowerLimit(unsigned band, unsigned attribute) const {
    return limits_[LimitOf(band, attribute)];
  }
  virtual T& LowerLimit(unsigned band, unsigned attribute) {
    return limits_[LimitOf(band, attribute)];
  }
  /// The lowest value of the last bin, to read and to write.
  virtual const T& UpperLimit(unsigned band, unsigned attribute) const {
    return limits_[LimitOf(band, attribute) + 1];
  }
  virtual T& UpperLimit(unsigned band, unsigned attribute) {
    return limits_[LimitOf(band, attribute) + 1];
  }
  /// The width of a bin: (upper - lower) / (bins - 1); of a single bin upper - lower + 1.
  virtual T BinSize(unsigned band, unsigned attribute) const;

  /// The number of values in a bin, to read and to write.
  virtual const unsigned& Count(unsigned band, unsigned attribute, unsigned bin) const = 0;
  virtual unsigned& Count(unsigned band, unsigned attribute, unsigned bin) = 0;

 protected:
  static constexpr unsigned kLimits = 2;  // lower, upper

  RegionAttributeHistogram(unsigned bands, unsigned attributes, unsigned bins)
      : AttributeTable(bands, attributes), bins_(bins) {}

  /// Gives the limits room of their own, of zeros.
  void OwnLimits();
  /// Has the limits at `data`.
  void PutLimits(T* data) { limits_ = Array<T>(data, ShapeOf(kLimits)); }
  bool HasLimits() const { return limits_.IsValid() && limits_.GetCount() != 0; }

  ArrayDims ShapeOf(unsigned values) const { return ArrayDims(Bands(), Attributes(), values); }

 private:
  std::size_t LimitOf(unsigned band, unsigned attribute) const {
    return PairOf(band, attribute) * kLimits;
  }

  unsigned bins_;
  Array<T> limits_;
};

/// Histograms in memory. Valid when there was memory for them.
template <typename T>
class RegionAttributeHistogramMap final : public RegionAttributeHistogram<T> {
  using Base = RegionAttributeHistogram<T>;

 public:
  static const unsigned TypeCode;

  /// All counts and limits begin at 0.
  RegionAttributeHistogramMap(unsigned bands, unsigned attributes, unsigned bins);

  bool IsA(unsigned typeCode) const override { return typeCode == TypeCode || Base::IsA(typeCode); }
  bool IsValid() const override {
    return Base::HasLimits() && counts_.IsValid() && Object::IsValid();
  }

  const unsigned& Count(unsigned band, unsigned attribute, unsigned bin) const override {
    return counts_[PlaceOf(band, attribute, bin)];
  }
  unsigned& Count(unsigned band, unsigned attribute, unsigned bin) override {
    return counts_[PlaceOf(band, attribute, bin)];
  }

 private:
  std::size_t PlaceOf(unsigned band, unsigned attribute, unsigned bin) const {
    return this->PairOf(band, attribute) * Base::Bins() + bin;
  }

  Array<unsigned> counts_;
};

/// Histograms in a file of the form "FXAH50", see docs/file-formats.md, that is made here. Limits
/// are written with the header. Valid as long as no error is stored; one that could not be made has
/// no limits to look at.
template <typename T>
class RegionAttributeHistogramFile final : public RegionAttributeHistogram<T> {
  using Base = RegionAttributeHistogram<T>;

 public:
  static const unsigned TypeCode;
  /// Bins of each histogram of a file.
  static constexpr unsigned kBins = 256;
  static constexpr unsigned kMostPairs = 8190;  ///< of band and attribute: the header holds no more

  /// Creates a file. None is made of more than kMostPairs pairs.
  RegionAttributeHistogramFile(const URI& uri, unsigned bands, unsigned attributes);

  bool IsA(unsigned typeCode) const override { return typeCode == TypeCode || Base::IsA(typeCode); }
  bool IsValid() const override { return file_.IsValid(); }

  const unsigned& Count(unsigned band, unsigned attribute, unsigned bin) const override {
    return file_.Elements().At(PlaceOf(band, attribute, bin));
  }
  unsigned& Count(unsigned band, unsigned attribute, unsigned bin) override {
    return file_.Elements().Ref(PlaceOf(band, attribute, bin));
  }

  /// Completes the file and closes it; see StoreFile. Limits can still be looked at.
  bool Close() { return file_.Close(*this); }

 private:
  std::uint64_t PlaceOf(unsigned band, unsigned attribute, unsigned bin) const {
    return this->PairOf(band, attribute) * kBins + bin;
  }

  mutable StoreFile<unsigned> file_;
};

extern template class VEXG_EXPORT RegionAttributeHistogram<float>;
extern template class VEXG_EXPORT RegionAttributeHistogramMap<float>;
extern template class VEXG_EXPORT RegionAttributeHistogramFile<float>;

}  // namespace lumo
