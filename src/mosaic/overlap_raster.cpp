#include "mosaic/overlap_raster_impl.h"

namespace lumo {

template class OverlapRaster<std::uint8_t, std::uint8_t>;
template class OverlapRaster<std::int8_t, std::int8_t>;
template class OverlapRaster<std::uint16_t, std::uint16_t>;
template class OverlapRaster<std::int16_t, std::int16_t>;
template class OverlapRaster<std::uint32_t, std::uint32_t>;
template class OverlapRaster<std::int32_t, std::int32_t>;
template class OverlapRaster<float, float>;
template class OverlapRaster<double, double>;

}  // namespace lumo
