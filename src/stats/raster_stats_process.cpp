#include "stats/raster_stats_process_impl.h"

namespace lumo {

template class RasterStatsAccumulateTask<std::uint8_t, RasterStats<std::uint8_t>>;
template class RasterStatsAccumulateTask<std::int8_t, RasterStats<std::int8_t>>;
template class RasterStatsAccumulateTask<std::uint16_t, RasterStats<std::uint16_t>>;
template class RasterStatsAccumulateTask<std::int16_t, RasterStats<std::int16_t>>;
template class RasterStatsAccumulateTask<std::uint32_t, RasterStats<std::uint32_t>>;
template class RasterStatsAccumulateTask<std::int32_t, RasterStats<std::int32_t>>;
template class RasterStatsAccumulateTask<float, RasterStats<float>>;
template class RasterStatsAccumulateTask<double, RasterStats<double>>;
template class RasterStatsAccumulateTask<std::uint64_t, RasterStats<std::uint64_t>>;
template class RasterStatsAccumulateTask<std::int64_t, RasterStats<std::int64_t>>;

template class RasterStatsAccumulateTask<std::uint8_t, ExtendedRasterStats<std::uint8_t>>;
template class RasterStatsAccumulateTask<std::int8_t, ExtendedRasterStats<std::int8_t>>;
template class RasterStatsAccumulateTask<std::uint16_t, ExtendedRasterStats<std::uint16_t>>;
template class RasterStatsAccumulateTask<std::int16_t, ExtendedRasterStats<std::int16_t>>;
template class RasterStatsAccumulateTask<std::uint32_t, ExtendedRasterStats<std::uint32_t>>;
template class RasterStatsAccumulateTask<std::int32_t, ExtendedRasterStats<std::int32_t>>;
template class RasterStatsAccumulateTask<float, ExtendedRasterStats<float>>;
template class RasterStatsAccumulateTask<double, ExtendedRasterStats<double>>;
template class RasterStatsAccumulateTask<std::uint64_t, ExtendedRasterStats<std::uint64_t>>;
template class RasterStatsAccumulateTask<std::int64_t, ExtendedRasterStats<std::int64_t>>;

template class RasterStatsProcess<std::uint8_t, RasterStats<std::uint8_t>>;
template class RasterStatsProcess<std::int8_t, RasterStats<std::int8_t>>;
template class RasterStatsProcess<std::uint16_t, RasterStats<std::uint16_t>>;
template class RasterStatsProcess<std::int16_t, RasterStats<std::int16_t>>;
template class RasterStatsProcess<std::uint32_t, RasterStats<std::uint32_t>>;
template class RasterStatsProcess<std::int32_t, RasterStats<std::int32_t>>;
template class RasterStatsProcess<float, RasterStats<float>>;
template class RasterStatsProcess<double, RasterStats<double>>;
template class RasterStatsProcess<std::uint64_t, RasterStats<std::uint64_t>>;
template class RasterStatsProcess<std::int64_t, RasterStats<std::int64_t>>;

template class RasterStatsProcess<std::uint8_t, ExtendedRasterStats<std::uint8_t>>;
template class RasterStatsProcess<std::int8_t, ExtendedRasterStats<std::int8_t>>;
template class RasterStatsProcess<std::uint16_t, ExtendedRasterStats<std::uint16_t>>;
template class RasterStatsProcess<std::int16_t, ExtendedRasterStats<std::int16_t>>;
template class RasterStatsProcess<std::uint32_t, ExtendedRasterStats<std::uint32_t>>;
template class RasterStatsProcess<std::int32_t, ExtendedRasterStats<std::int32_t>>;
template class RasterStatsProcess<float, ExtendedRasterStats<float>>;
template class RasterStatsProcess<double, ExtendedRasterStats<double>>;
template class RasterStatsProcess<std::uint64_t, ExtendedRasterStats<std::uint64_t>>;
template class RasterStatsProcess<std::int64_t, ExtendedRasterStats<std::int64_t>>;

}  // namespace lumo
