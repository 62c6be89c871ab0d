#include "pyramid/level_window_impl.h"

namespace lumo {

template class LevelWindow<std::uint8_t>;
template class LevelWindow<std::int8_t>;
template class LevelWindow<std::uint16_t>;
template class LevelWindow<std::int16_t>;
template class LevelWindow<std::uint32_t>;
template class LevelWindow<std::int32_t>;
template class LevelWindow<float>;
template class LevelWindow<double>;
template class LevelWindow<std::uint64_t>;
template class LevelWindow<std::int64_t>;
template class LevelWindow<Complex<float>>;
template class LevelWindow<Complex<double>>;

}  // namespace lumo
