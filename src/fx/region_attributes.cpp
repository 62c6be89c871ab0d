#include "fx/region_attributes.h"

#include <algorithm>
#include <new>

#include "foundation/type_code.h"
#include "fx/store_header.h"

namespace lumo {
namespace {

constexpr std::string_view kMark = "FXA50";

}  // namespace

template <typename T>
const unsigned RegionAttributes<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributes<Single>");
template <typename T>
const unsigned RegionAttributesMap<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributesMap<Single>");
template <typename T>
const unsigned RegionAttributesFile<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributesFile<Single>");

template <typename T>
void RegionAttributesMap<T>::Find(unsigned region) const {
  lastRegion_ = region;
  last_ = nullptr;
  try {
    auto at = records_.lower_bound(region);
    if (at == records_.end() || at->first != region) {
      const std::size_t count =
          std::size_t{Base::Extent(Base::Bands())} * Base::Extent(Base::Attributes());
      at = records_.emplace_hint(at, region, std::make_unique<T[]>(count));
    }
    last_ = at->second.get();
  } catch (const std::bad_alloc&) {
    const_cast<RegionAttributesMap*>(this)->SetErrorState(RegionAttributeErrorBadAllocation());
  }
}

template <typename T>
void RegionAttributesMap<T>::Clear() {
  records_.clear();
  last_ = nullptr;
}

template <typename T>
Array<unsigned> RegionAttributesMap<T>::GetRegions() const {
  Array<unsigned> regions{ArrayDims(static_cast<unsigned>(records_.size()))};
  std::transform(records_.begin(), records_.end(), regions.begin(),
                 [](const auto& record) { return record.first; });
  return regions;
}

template <typename T>
RegionAttributesFile<T>::RegionAttributesFile(const URI& uri, bool writable)
    : Base(0, 0),
      buffer_(uri, kPageSize, writable ? BasicBuffer::kReadWrite : BasicBuffer::kReadOnly) {
  const auto counts = detail::ReadStoreHeader(buffer_, kMark);
  if (!counts) {
    buffer_.Close();
    return;
  }
  TakeCounts(counts->bands, counts->attributes);
}

template <typename T>
RegionAttributesFile<T>::RegionAttributesFile(const URI& uri, unsigned bands, unsigned attributes)
    : Base(0, 0),
      buffer_(detail::FitsStoreHeader(uri, {bands, attributes})
                  ? Buffer<T>(uri, ArrayDims(1, Base::Extent(bands), Base::Extent(attributes)),
                              kPageSize)
                  : Buffer<T>()) {
  if (buffer_.Header().empty()) return;
  detail::WriteStoreHeader(buffer_.Header(), kMark, {bands, attributes});
  TakeCounts(bands, attributes);
}

template <typename T>
void RegionAttributesFile<T>::TakeCounts(unsigned bands, unsigned attributes) {
  Base::SetCounts(bands, attributes);
  bandExtent_ = Base::Extent(bands);
  attributeExtent_ = Base::Extent(attributes);
  isValid_ = true;
}

template <typename T>
void RegionAttributesFile<T>::Require(unsigned bands, unsigned attributes) {
  if (bands == Base::Bands() && attributes == Base::Attributes()) return;
  isValid_ = false;
  buffer_.Close();
}

template <typename T>
unsigned RegionAttributesFile<T>::RegionCount() {
  if (Base::Bands() == 0 || Base::Attributes() == 0) return 0;
  return static_cast<unsigned>(
      std::min<std::uint64_t>(buffer_.Count() / (bandExtent_ * attributeExtent_), UINT32_MAX));
}

template <typename T>
bool RegionAttributesFile<T>::Close() {
  const bool isWhole = buffer_.Close() && isValid_;
  this->SetErrorState(buffer_);
  return isWhole;
}

template class RegionAttributes<float>;
template class RegionAttributesMap<float>;
template class RegionAttributesFile<float>;

}  // namespace lumo
