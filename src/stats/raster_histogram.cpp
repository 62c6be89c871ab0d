#include "foundation/type_code.h"
#include "stats/raster_histogram_impl.h"

namespace lumo {

template <typename T>
const unsigned RasterHistogram<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("RasterHistogram<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template class RasterHistogram<std::uint8_t>;
template class RasterHistogram<std::int8_t>;
template class RasterHistogram<std::uint16_t>;
template class RasterHistogram<std::int16_t>;
template class RasterHistogram<std::uint32_t>;
template class RasterHistogram<std::int32_t>;
template class RasterHistogram<float>;
template class RasterHistogram<double>;
template class RasterHistogram<std::uint64_t>;
template class RasterHistogram<std::int64_t>;

}  // namespace lumo
