#pragma once

#include <cstddef>
#include <cstdint>
#include <type_traits>

namespace lumo::platform {

/// Puts lanes of two registers together: lane i of `out` is lane kFrom[i] of `a`, or where that is
/// no lane of `a` the one of `b` that follows in number. Compiles to the processor's own
/// instructions.
///
/// @tparam V  a vector type of the compiler; kFrom has as many numbers as it has lanes.
template <int... kFrom, typename V>
[[gnu::always_inline]] inline void ShuffleLanes(const V& a, const V& b, V& out) {
#if __has_builtin(__builtin_shufflevector)
  out = __builtin_shufflevector(a, b, kFrom...);
#else  // g++ 11
  constexpr std::size_t kLaneBytes = sizeof(V) / sizeof...(kFrom);
  using Number = std::conditional_t<
      kLaneBytes == 1, std::int8_t,
      std::conditional_t<kLaneBytes == 2, std::int16_t,
                         std::conditional_t<kLaneBytes == 4, std::int32_t, std::int64_t> > >;
  using Numbers [[gnu::vector_size(sizeof(V))]] = Number;
  const Numbers from{kFrom...};
  out = __builtin_shuffle(a, b, from);
#endif
}

}  // namespace lumo::platform
