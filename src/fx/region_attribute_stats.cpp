#include "fx/region_attribute_stats.h"

#include "foundation/type_code.h"
#include "fx/store_header.h"

namespace lumo {
namespace {

constexpr std::string_view kMark = "FXAS50";

}  // namespace

template <typename T>
const unsigned RegionAttributeStats<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeStats<Single>");
template <typename T>
const unsigned RegionAttributeStatsFile<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeStatsFile<Single>");

template <typename T>
RegionAttributeStatsFile<T>::RegionAttributeStatsFile(const URI& uri)
    : buffer_(uri, BasicBuffer::kPageSize, BasicBuffer::kReadWrite) {
  const auto counts = detail::ReadStoreHeader(buffer_, kMark);
  if (counts) {
    TakeCounts(counts->bands, counts->attributes);
  } else {
    buffer_.Close();
  }
}

template <typename T>
RegionAttributeStatsFile<T>::RegionAttributeStatsFile(const URI& uri, unsigned bands,
                                                      unsigned attributes)
    : buffer_(detail::FitsStoreHeader(uri, {bands, attributes})
                  ? Buffer<T>(uri, ArrayDims(bands, attributes, Base::kStatistics),
                              BasicBuffer::kPageSize)
                  : Buffer<T>()) {
  if (buffer_.Header().empty()) return;
  detail::WriteStoreHeader(buffer_.Header(), kMark, {bands, attributes});
  TakeCounts(bands, attributes);
}

template <typename T>
void RegionAttributeStatsFile<T>::TakeCounts(unsigned bands, unsigned attributes) {
  Base::SetCounts(bands, attributes);
  attributeExtent_ = attributes != 0 ? attributes : 1;
  isValid_ = true;
}

template <typename T>
bool RegionAttributeStatsFile<T>::Close() {
  const bool isWhole = buffer_.Close() && isValid_;
  this->SetErrorState(buffer_);
  return isWhole;
}

template class RegionAttributeStats<float>;
template class RegionAttributeStatsFile<float>;

}  // namespace lumo
