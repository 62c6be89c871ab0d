#pragma once

#include <initializer_list>
#include <optional>
#include <string_view>

#include "foundation/buffer.h"

namespace lumo {

/// Counts the bands and attributes of a store of region values, and places pairs of them. A store
/// with 0 of either keeps as many values as one with 1.
class VEXG_EXPORT AttributeTable : public Object {
 public:
  /// Bands, as the store was made with them.
  virtual unsigned Bands() const { return bands_; }
  /// Attributes of a band, as the store was made with them.
  virtual unsigned Attributes() const { return attributes_; }

 protected:
  AttributeTable(unsigned bands, unsigned attributes) { SetCounts(bands, attributes); }

  void SetCounts(unsigned bands, unsigned attributes) {
    bands_ = bands;
    attributes_ = attributes;
    attributeExtent_ = attributes != 0 ? attributes : 1;
    pairs_ = (bands != 0 ? bands : 1) * attributeExtent_;
  }

  /// Pairs of band and attribute, at least 1.
  std::uint64_t Pairs() const { return pairs_; }
  std::uint64_t AttributeExtent() const { return attributeExtent_; }
  /// The place of a pair among them.
  std::uint64_t PairOf(unsigned band, unsigned attribute) const {
    return band * attributeExtent_ + attribute;
  }

 private:
  unsigned bands_ = 0;
  unsigned attributes_ = 0;
  std::uint64_t attributeExtent_ = 1;
  std::uint64_t pairs_ = 1;
};

namespace detail {

/// Bands and attributes, as a header has them.
struct StoreCounts {
  unsigned bands = 0;
  unsigned attributes = 0;
};

/// Reads the header of a buffer that was just opened; nothing for one that doesn't begin with
/// `mark`, or isn't whole.
VEXG_EXPORT std::optional<StoreCounts> ReadStoreHeader(const BasicBuffer& buffer,
                                                       std::string_view mark);

/// Fills a header: the mark, then the counts of 16 bits, the first of which are those given back.
VEXG_EXPORT StoreCounts WriteStoreHeader(BasicBuffer& buffer, std::string_view mark,
                                         std::initializer_list<unsigned> counts);

/// True when all of the counts can stand in a header. Else the fault names the file.
VEXG_EXPORT bool FitsStoreHeader(const URI& uri, std::initializer_list<unsigned> counts);

}  // namespace detail

/// The file of a store of region values: elements behind a header that begins with a mark, bands
/// and attributes. Valid once the header was checked or made, as long as no error is stored. Of a
/// file that has another header nothing is read, and nothing in it changes.
template <typename T>
class StoreFile {
 public:
  /// Opens a file.
  StoreFile(const URI& uri, std::string_view mark, unsigned pageSize, BasicBuffer::Mode mode)
      : buffer_(uri, pageSize, mode), counts_(detail::ReadStoreHeader(buffer_, mark)) {
    if (!counts_) buffer_.Close();
  }

  /// Creates a file.
  /// @param counts  of the header; of ones that don't fit there no file is made.
  /// @param fits    false: no file is made.
  StoreFile(const URI& uri, std::string_view mark, std::initializer_list<unsigned> counts,
            const ArrayDims& dims, unsigned pageSize, bool fits = true)
      : buffer_(!fits || !detail::FitsStoreHeader(uri, counts) ? Buffer<T>()
                : pageSize == BasicBuffer::kPageSize           ? Buffer<T>(uri, dims)
                                                               : Buffer<T>(uri, dims, pageSize)) {
    if (!buffer_.Header().empty()) counts_ = detail::WriteStoreHeader(buffer_, mark, counts);
  }

  bool IsValid() const { return counts_ && buffer_.IsValid(); }
  detail::StoreCounts Counts() const { return counts_.value_or(detail::StoreCounts()); }
  /// The elements behind the header.
  Buffer<T>& Elements() { return buffer_; }

  /// Makes the file not valid, and lets it go.
  void Refuse() {
    counts_.reset();
    buffer_.Close();
  }

  /// Completes the file and closes it; one that was written has no valid header before.
  /// @param owner  takes the error.
  /// @return false when it isn't whole on the disk; TakeFault says why.
  bool Close(ErrorState& owner) {
    const bool isWhole = buffer_.Close() && counts_;
    owner.SetErrorState(buffer_);
    return isWhole;
  }

 private:
  Buffer<T> buffer_;
  std::optional<detail::StoreCounts> counts_;
};

}  // namespace lumo
