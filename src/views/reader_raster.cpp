#include "views/reader_raster_impl.h"

namespace lumo {

template class ReaderRaster<std::uint8_t>;
template class ReaderRaster<std::int8_t>;
template class ReaderRaster<std::uint16_t>;
template class ReaderRaster<std::int16_t>;
template class ReaderRaster<std::uint32_t>;
template class ReaderRaster<std::int32_t>;
template class ReaderRaster<float>;
template class ReaderRaster<double>;
template class ReaderRaster<std::uint64_t>;
template class ReaderRaster<std::int64_t>;
template class ReaderRaster<Complex<float>>;
template class ReaderRaster<Complex<double>>;

}  // namespace lumo
