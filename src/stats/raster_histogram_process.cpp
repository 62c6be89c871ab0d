#include "stats/raster_histogram_process_impl.h"

namespace lumo {

template class RasterHistogramAccumulateTask<std::uint8_t>;
template class RasterHistogramAccumulateTask<std::int8_t>;
template class RasterHistogramAccumulateTask<std::uint16_t>;
template class RasterHistogramAccumulateTask<std::int16_t>;
template class RasterHistogramAccumulateTask<std::uint32_t>;
template class RasterHistogramAccumulateTask<std::int32_t>;
template class RasterHistogramAccumulateTask<float>;
template class RasterHistogramAccumulateTask<double>;
template class RasterHistogramAccumulateTask<std::uint64_t>;
template class RasterHistogramAccumulateTask<std::int64_t>;

template class RasterHistogramProcess<std::uint8_t>;
template class RasterHistogramProcess<std::int8_t>;
template class RasterHistogramProcess<std::uint16_t>;
template class RasterHistogramProcess<std::int16_t>;
template class RasterHistogramProcess<std::uint32_t>;
template class RasterHistogramProcess<std::int32_t>;
template class RasterHistogramProcess<float>;
template class RasterHistogramProcess<double>;
template class RasterHistogramProcess<std::uint64_t>;
template class RasterHistogramProcess<std::int64_t>;

template class HistogramCallback<std::uint8_t>;
template class HistogramCallback<std::int8_t>;
template class HistogramCallback<std::uint16_t>;
template class HistogramCallback<std::int16_t>;
template class HistogramCallback<std::uint32_t>;
template class HistogramCallback<std::int32_t>;
template class HistogramCallback<float>;
template class HistogramCallback<double>;
template class HistogramCallback<std::uint64_t>;
template class HistogramCallback<std::int64_t>;

template class RasterHistogramCallbackProcess<std::uint8_t>;
template class RasterHistogramCallbackProcess<std::int8_t>;
template class RasterHistogramCallbackProcess<std::uint16_t>;
template class RasterHistogramCallbackProcess<std::int16_t>;
template class RasterHistogramCallbackProcess<std::uint32_t>;
template class RasterHistogramCallbackProcess<std::int32_t>;
template class RasterHistogramCallbackProcess<float>;
template class RasterHistogramCallbackProcess<double>;
template class RasterHistogramCallbackProcess<std::uint64_t>;
template class RasterHistogramCallbackProcess<std::int64_t>;

}  // namespace lumo
