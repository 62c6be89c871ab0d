#include "mosaic/pvs_raster_impl.h"

namespace lumo {

template class PVSRaster<std::uint8_t>;
template class PVSRaster<std::int8_t>;
template class PVSRaster<std::uint16_t>;
template class PVSRaster<std::int16_t>;
template class PVSRaster<std::uint32_t>;
template class PVSRaster<std::int32_t>;
template class PVSRaster<float>;
template class PVSRaster<double>;

}  // namespace lumo
