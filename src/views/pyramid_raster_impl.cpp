#include "views/pyramid_raster_impl_impl.h"

namespace lumo {

template class PyramidRasterImpl<std::uint8_t>;
template class PyramidRasterImpl<std::int8_t>;
template class PyramidRasterImpl<std::uint16_t>;
template class PyramidRasterImpl<std::int16_t>;
template class PyramidRasterImpl<std::uint32_t>;
template class PyramidRasterImpl<std::int32_t>;
template class PyramidRasterImpl<float>;
template class PyramidRasterImpl<double>;
template class PyramidRasterImpl<std::uint64_t>;
template class PyramidRasterImpl<std::int64_t>;
template class PyramidRasterImpl<Complex<float>>;
template class PyramidRasterImpl<Complex<double>>;

}  // namespace lumo
