#include "views/band_stack_raster_impl.h"

namespace lumo {

template class BandStackRaster<std::uint8_t>;
template class BandStackRaster<std::int8_t>;
template class BandStackRaster<std::uint16_t>;
template class BandStackRaster<std::int16_t>;
template class BandStackRaster<std::uint32_t>;
template class BandStackRaster<std::int32_t>;
template class BandStackRaster<float>;
template class BandStackRaster<double>;

}  // namespace lumo
