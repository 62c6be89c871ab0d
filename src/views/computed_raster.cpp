#include "views/computed_raster_impl.h"

namespace lumo {

template class ComputedRaster<std::uint8_t>;
template class ComputedRaster<std::int8_t>;
template class ComputedRaster<std::uint16_t>;
template class ComputedRaster<std::int16_t>;
template class ComputedRaster<std::uint32_t>;
template class ComputedRaster<std::int32_t>;
template class ComputedRaster<float>;
template class ComputedRaster<double>;
template class ComputedRaster<std::uint64_t>;
template class ComputedRaster<std::int64_t>;
template class ComputedRaster<Complex<float>>;
template class ComputedRaster<Complex<double>>;

}  // namespace lumo
