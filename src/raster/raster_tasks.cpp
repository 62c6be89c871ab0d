#include "raster/raster_tasks_impl.h"

namespace lumo {

template class TilePool<std::uint8_t>;
template class TilePool<std::int8_t>;
template class TilePool<std::uint16_t>;
template class TilePool<std::int16_t>;
template class TilePool<std::uint32_t>;
template class TilePool<std::int32_t>;
template class TilePool<float>;
template class TilePool<double>;
template class TilePool<std::uint64_t>;
template class TilePool<std::int64_t>;
template class TilePool<Complex<float>>;
template class TilePool<Complex<double>>;

template class RasterReadTask<std::uint8_t>;
template class RasterReadTask<std::int8_t>;
template class RasterReadTask<std::uint16_t>;
template class RasterReadTask<std::int16_t>;
template class RasterReadTask<std::uint32_t>;
template class RasterReadTask<std::int32_t>;
template class RasterReadTask<float>;
template class RasterReadTask<double>;
template class RasterReadTask<std::uint64_t>;
template class RasterReadTask<std::int64_t>;
template class RasterReadTask<Complex<float>>;
template class RasterReadTask<Complex<double>>;

template class RasterWriteTask<std::uint8_t>;
template class RasterWriteTask<std::int8_t>;
template class RasterWriteTask<std::uint16_t>;
template class RasterWriteTask<std::int16_t>;
template class RasterWriteTask<std::uint32_t>;
template class RasterWriteTask<std::int32_t>;
template class RasterWriteTask<float>;
template class RasterWriteTask<double>;
template class RasterWriteTask<std::uint64_t>;
template class RasterWriteTask<std::int64_t>;
template class RasterWriteTask<Complex<float>>;
template class RasterWriteTask<Complex<double>>;

}  // namespace lumo
