#include "pyramid_reader_impl.h"

namespace lumo::pyramid {

template class Reader<std::uint8_t>;
template class Reader<std::int8_t>;
template class Reader<std::uint16_t>;
template class Reader<std::int16_t>;
template class Reader<std::uint32_t>;
template class Reader<std::int32_t>;
template class Reader<float>;
template class Reader<double>;
template class Reader<std::uint64_t>;
template class Reader<std::int64_t>;
template class Reader<Complex<float>>;
template class Reader<Complex<double>>;

}  // namespace lumo::pyramid
