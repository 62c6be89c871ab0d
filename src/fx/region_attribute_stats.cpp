#include "fx/region_attribute_stats.h"

#include "foundation/type_code.h"

namespace lumo {
namespace {

constexpr std::string_view kStatsMark = "FXAS50";

}  // namespace

template <typename T>
const unsigned RegionAttributeStats<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeStats<Single>");
template <typename T>
const unsigned RegionAttributeStatsFile<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeStatsFile<Single>");

template <typename T>
RegionAttributeStatsFile<T>::RegionAttributeStatsFile(const URI& uri)
    : Base(0, 0), file_(uri, kStatsMark, BasicBuffer::kPageSize, BasicBuffer::kReadWrite) {
  this->SetCounts(file_.Counts().bands, file_.Counts().attributes);
}

template <typename T>
RegionAttributeStatsFile<T>::RegionAttributeStatsFile(const URI& uri, unsigned bands,
                                                      unsigned attributes)
    : Base(bands, attributes),
      file_(uri, kStatsMark, {bands, attributes}, ArrayDims(bands, attributes, Base::kStatistics),
            BasicBuffer::kPageSize) {}

template class RegionAttributeStats<float>;
template class RegionAttributeStatsFile<float>;

}  // namespace lumo
