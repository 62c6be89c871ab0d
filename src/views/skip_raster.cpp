#include "views/skip_raster_impl.h"

namespace lumo {

template class SkipRaster<std::uint8_t>;
template class SkipRaster<std::int8_t>;
template class SkipRaster<std::uint16_t>;
template class SkipRaster<std::int16_t>;
template class SkipRaster<std::uint32_t>;
template class SkipRaster<std::int32_t>;
template class SkipRaster<float>;
template class SkipRaster<double>;

}  // namespace lumo
