#include "raster/raster_tasks_impl.h"

namespace lumo {

template class VEXG_EXPORT TilePool<std::uint8_t>;
template class VEXG_EXPORT TilePool<std::int8_t>;
template class VEXG_EXPORT TilePool<std::uint16_t>;
template class VEXG_EXPORT TilePool<std::int16_t>;
template class VEXG_EXPORT TilePool<std::uint32_t>;
template class VEXG_EXPORT TilePool<std::int32_t>;
template class VEXG_EXPORT TilePool<float>;
template class VEXG_EXPORT TilePool<double>;
template class VEXG_EXPORT TilePool<std::uint64_t>;
template class VEXG_EXPORT TilePool<std::int64_t>;
template class VEXG_EXPORT TilePool<Complex<float>>;
template class VEXG_EXPORT TilePool<Complex<double>>;

template class VEXG_EXPORT RasterReadTask<std::uint8_t>;
template class VEXG_EXPORT RasterReadTask<std::int8_t>;
template class VEXG_EXPORT RasterReadTask<std::uint16_t>;
template class VEXG_EXPORT RasterReadTask<std::int16_t>;
template class VEXG_EXPORT RasterReadTask<std::uint32_t>;
template class VEXG_EXPORT RasterReadTask<std::int32_t>;
template class VEXG_EXPORT RasterReadTask<float>;
template class VEXG_EXPORT RasterReadTask<double>;
template class VEXG_EXPORT RasterReadTask<std::uint64_t>;
template class VEXG_EXPORT RasterReadTask<std::int64_t>;
template class VEXG_EXPORT RasterReadTask<Complex<float>>;
template class VEXG_EXPORT RasterReadTask<Complex<double>>;

template class VEXG_EXPORT RasterWriteTask<std::uint8_t>;
template class VEXG_EXPORT RasterWriteTask<std::int8_t>;
template class VEXG_EXPORT RasterWriteTask<std::uint16_t>;
template class VEXG_EXPORT RasterWriteTask<std::int16_t>;
template class VEXG_EXPORT RasterWriteTask<std::uint32_t>;
template class VEXG_EXPORT RasterWriteTask<std::int32_t>;
template class VEXG_EXPORT RasterWriteTask<float>;
template class VEXG_EXPORT RasterWriteTask<double>;
template class VEXG_EXPORT RasterWriteTask<std::uint64_t>;
template class VEXG_EXPORT RasterWriteTask<std::int64_t>;
template class VEXG_EXPORT RasterWriteTask<Complex<float>>;
template class VEXG_EXPORT RasterWriteTask<Complex<double>>;

}  // namespace lumo
