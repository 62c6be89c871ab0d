#include "stats/dynamic_raster_stats_impl.h"

namespace lumo {

template class DynamicRasterStats<std::uint8_t>;
template class DynamicRasterStats<std::int8_t>;
template class DynamicRasterStats<std::uint16_t>;
template class DynamicRasterStats<std::int16_t>;
template class DynamicRasterStats<std::uint32_t>;
template class DynamicRasterStats<std::int32_t>;
template class DynamicRasterStats<float>;
template class DynamicRasterStats<double>;
template class DynamicRasterStats<std::uint64_t>;
template class DynamicRasterStats<std::int64_t>;

}  // namespace lumo
