#include "pyramid/dynamic_raster_pyramid_impl.h"

namespace lumo {

template class DynamicRasterPyramid<std::uint8_t>;
template class DynamicRasterPyramid<std::int8_t>;
template class DynamicRasterPyramid<std::uint16_t>;
template class DynamicRasterPyramid<std::int16_t>;
template class DynamicRasterPyramid<std::uint32_t>;
template class DynamicRasterPyramid<std::int32_t>;
template class DynamicRasterPyramid<float>;
template class DynamicRasterPyramid<double>;
template class DynamicRasterPyramid<std::uint64_t>;
template class DynamicRasterPyramid<std::int64_t>;
template class DynamicRasterPyramid<Complex<float>>;
template class DynamicRasterPyramid<Complex<double>>;

}  // namespace lumo
