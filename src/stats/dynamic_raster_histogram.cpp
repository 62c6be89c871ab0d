#include "stats/dynamic_raster_histogram_impl.h"

namespace lumo {

template class DynamicRasterHistogram<std::uint8_t>;
template class DynamicRasterHistogram<std::int8_t>;
template class DynamicRasterHistogram<std::uint16_t>;
template class DynamicRasterHistogram<std::int16_t>;
template class DynamicRasterHistogram<std::uint32_t>;
template class DynamicRasterHistogram<std::int32_t>;
template class DynamicRasterHistogram<float>;
template class DynamicRasterHistogram<double>;
template class DynamicRasterHistogram<std::uint64_t>;
template class DynamicRasterHistogram<std::int64_t>;

}  // namespace lumo
