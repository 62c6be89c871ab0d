#include "pyramid/pyramid_process_impl.h"

namespace lumo {

PyramidPath ChoosePyramidPath(const RasterDef& def) {
  if (TilingOf(def.bands, 1).bands != def.bands) return PyramidPath::kMorten;
  return def.tileHeight >= 2 ? PyramidPath::kRow : PyramidPath::kScanline;
}

template class RasterPyramidProcess<std::uint8_t>;
template class RasterPyramidProcess<std::int8_t>;
template class RasterPyramidProcess<std::uint16_t>;
template class RasterPyramidProcess<std::int16_t>;
template class RasterPyramidProcess<std::uint32_t>;
template class RasterPyramidProcess<std::int32_t>;
template class RasterPyramidProcess<float>;
template class RasterPyramidProcess<double>;
template class RasterPyramidProcess<std::uint64_t>;
template class RasterPyramidProcess<std::int64_t>;
template class RasterPyramidProcess<Complex<float>>;
template class RasterPyramidProcess<Complex<double>>;

template class RasterPyramidDecimateRasterProcess<std::uint8_t>;
template class RasterPyramidDecimateRasterProcess<std::int8_t>;
template class RasterPyramidDecimateRasterProcess<std::uint16_t>;
template class RasterPyramidDecimateRasterProcess<std::int16_t>;
template class RasterPyramidDecimateRasterProcess<std::uint32_t>;
template class RasterPyramidDecimateRasterProcess<std::int32_t>;
template class RasterPyramidDecimateRasterProcess<float>;
template class RasterPyramidDecimateRasterProcess<double>;
template class RasterPyramidDecimateRasterProcess<std::uint64_t>;
template class RasterPyramidDecimateRasterProcess<std::int64_t>;
template class RasterPyramidDecimateRasterProcess<Complex<float>>;
template class RasterPyramidDecimateRasterProcess<Complex<double>>;

template class RasterPyramidDecimateRasterStatsProcess<std::uint8_t, RasterStats<std::uint8_t>>;
template class RasterPyramidDecimateRasterStatsProcess<std::int8_t, RasterStats<std::int8_t>>;
template class RasterPyramidDecimateRasterStatsProcess<std::uint16_t, RasterStats<std::uint16_t>>;
template class RasterPyramidDecimateRasterStatsProcess<std::int16_t, RasterStats<std::int16_t>>;
template class RasterPyramidDecimateRasterStatsProcess<std::uint32_t, RasterStats<std::uint32_t>>;
template class RasterPyramidDecimateRasterStatsProcess<std::int32_t, RasterStats<std::int32_t>>;
template class RasterPyramidDecimateRasterStatsProcess<float, RasterStats<float>>;
template class RasterPyramidDecimateRasterStatsProcess<double, RasterStats<double>>;
template class RasterPyramidDecimateRasterStatsProcess<std::uint64_t, RasterStats<std::uint64_t>>;
template class RasterPyramidDecimateRasterStatsProcess<std::int64_t, RasterStats<std::int64_t>>;

}  // namespace lumo
