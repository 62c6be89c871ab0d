#include "foundation/type_code.h"
#include "stats/raster_stats_impl.h"

namespace lumo {

template <typename T>
const unsigned RasterStats<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("RasterStats<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template class RasterStats<std::uint8_t>;
template class RasterStats<std::int8_t>;
template class RasterStats<std::uint16_t>;
template class RasterStats<std::int16_t>;
template class RasterStats<std::uint32_t>;
template class RasterStats<std::int32_t>;
template class RasterStats<float>;
template class RasterStats<double>;
template class RasterStats<std::uint64_t>;
template class RasterStats<std::int64_t>;

}  // namespace lumo
