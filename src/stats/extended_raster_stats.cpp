#include "foundation/type_code.h"
#include "stats/extended_raster_stats_impl.h"

namespace lumo {

template <typename T>
const unsigned ExtendedRasterStats<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("ExtendedRasterStats<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template class ExtendedRasterStats<std::uint8_t>;
template class ExtendedRasterStats<std::int8_t>;
template class ExtendedRasterStats<std::uint16_t>;
template class ExtendedRasterStats<std::int16_t>;
template class ExtendedRasterStats<std::uint32_t>;
template class ExtendedRasterStats<std::int32_t>;
template class ExtendedRasterStats<float>;
template class ExtendedRasterStats<double>;
template class ExtendedRasterStats<std::uint64_t>;
template class ExtendedRasterStats<std::int64_t>;

}  // namespace lumo
