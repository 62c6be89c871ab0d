#include "fx/region_attributes.h"

#include <algorithm>
#include <new>

#include "foundation/type_code.h"
#include "fx/region_errors.h"

namespace lumo {
namespace {

constexpr std::string_view kAttributesMark = "FXA50";

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
      at = records_.emplace_hint(at, region, std::make_unique<T[]>(this->Pairs()));
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
      file_(uri, kAttributesMark, kPageSize,
            writable ? BasicBuffer::kReadWrite : BasicBuffer::kReadOnly) {
  this->SetCounts(file_.Counts().bands, file_.Counts().attributes);
}

template <typename T>
RegionAttributesFile<T>::RegionAttributesFile(const URI& uri, unsigned bands, unsigned attributes)
    : Base(bands, attributes),
      file_(uri, kAttributesMark, {bands, attributes}, ArrayDims(1, bands, attributes), kPageSize) {
}

template <typename T>
void RegionAttributesFile<T>::Require(unsigned bands, unsigned attributes) {
  if (bands != Base::Bands() || attributes != Base::Attributes()) file_.Refuse();
}

template <typename T>
unsigned RegionAttributesFile<T>::RegionCount() {
  if (Base::Bands() == 0 || Base::Attributes() == 0) return 0;
  return static_cast<unsigned>(
      std::min<std::uint64_t>(file_.Elements().Count() / this->Pairs(), UINT32_MAX));
}

template class RegionAttributes<float>;
template class RegionAttributesMap<float>;
template class RegionAttributesFile<float>;

}  // namespace lumo
