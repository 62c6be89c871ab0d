#include "data/raster_reader_impl.h"

namespace lumo {

Array<unsigned> BandsOfBlock(const Array<unsigned>& bands, Interleave interleave) {
  Array<unsigned> kept(bands);
  if (interleave == Interleave::None && kept.GetCount() > 1) kept.Resize(ArrayDims(1));
  return kept;
}

template class RasterReader<std::uint8_t>;
template class RasterReader<std::int8_t>;
template class RasterReader<std::uint16_t>;
template class RasterReader<std::int16_t>;
template class RasterReader<std::uint32_t>;
template class RasterReader<std::int32_t>;
template class RasterReader<float>;
template class RasterReader<double>;
template class RasterReader<std::uint64_t>;
template class RasterReader<std::int64_t>;
template class RasterReader<Complex<float>>;
template class RasterReader<Complex<double>>;

}  // namespace lumo
