#include "pyramid/pyramid_tasks_impl.h"

namespace lumo {

ZPosition PositionAlongZ(std::uint64_t index, unsigned bits) {
  ZPosition at;
  for (unsigned bit = 0; bit < bits; ++bit) {
    at.x |= (index >> (2 * bit) & 1) << bit;
    at.y |= (index >> (2 * bit + 1) & 1) << bit;
  }
  return at;
}

template class RasterPyramidScanlineDecimateTask<std::uint8_t>;
template class RasterPyramidScanlineDecimateTask<std::int8_t>;
template class RasterPyramidScanlineDecimateTask<std::uint16_t>;
template class RasterPyramidScanlineDecimateTask<std::int16_t>;
template class RasterPyramidScanlineDecimateTask<std::uint32_t>;
template class RasterPyramidScanlineDecimateTask<std::int32_t>;
template class RasterPyramidScanlineDecimateTask<float>;
template class RasterPyramidScanlineDecimateTask<double>;
template class RasterPyramidScanlineDecimateTask<std::uint64_t>;
template class RasterPyramidScanlineDecimateTask<std::int64_t>;
template class RasterPyramidScanlineDecimateTask<Complex<float>>;
template class RasterPyramidScanlineDecimateTask<Complex<double>>;

template class RasterPyramidRowDecimateTask<std::uint8_t>;
template class RasterPyramidRowDecimateTask<std::int8_t>;
template class RasterPyramidRowDecimateTask<std::uint16_t>;
template class RasterPyramidRowDecimateTask<std::int16_t>;
template class RasterPyramidRowDecimateTask<std::uint32_t>;
template class RasterPyramidRowDecimateTask<std::int32_t>;
template class RasterPyramidRowDecimateTask<float>;
template class RasterPyramidRowDecimateTask<double>;
template class RasterPyramidRowDecimateTask<std::uint64_t>;
template class RasterPyramidRowDecimateTask<std::int64_t>;
template class RasterPyramidRowDecimateTask<Complex<float>>;
template class RasterPyramidRowDecimateTask<Complex<double>>;

template class RasterMortenReadTask<std::uint8_t>;
template class RasterMortenReadTask<std::int8_t>;
template class RasterMortenReadTask<std::uint16_t>;
template class RasterMortenReadTask<std::int16_t>;
template class RasterMortenReadTask<std::uint32_t>;
template class RasterMortenReadTask<std::int32_t>;
template class RasterMortenReadTask<float>;
template class RasterMortenReadTask<double>;
template class RasterMortenReadTask<std::uint64_t>;
template class RasterMortenReadTask<std::int64_t>;
template class RasterMortenReadTask<Complex<float>>;
template class RasterMortenReadTask<Complex<double>>;

template class RasterPyramidMortenDecimateTask<std::uint8_t>;
template class RasterPyramidMortenDecimateTask<std::int8_t>;
template class RasterPyramidMortenDecimateTask<std::uint16_t>;
template class RasterPyramidMortenDecimateTask<std::int16_t>;
template class RasterPyramidMortenDecimateTask<std::uint32_t>;
template class RasterPyramidMortenDecimateTask<std::int32_t>;
template class RasterPyramidMortenDecimateTask<float>;
template class RasterPyramidMortenDecimateTask<double>;
template class RasterPyramidMortenDecimateTask<std::uint64_t>;
template class RasterPyramidMortenDecimateTask<std::int64_t>;
template class RasterPyramidMortenDecimateTask<Complex<float>>;
template class RasterPyramidMortenDecimateTask<Complex<double>>;

}  // namespace lumo
