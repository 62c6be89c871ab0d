#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <utility>

#include "platform/lane_shuffle.h"

#if defined(__x86_64__)
#include <immintrin.h>
#endif

// The kernels of interleave.cpp in vector registers. They move bytes and compute nothing, so that
// those that only some machines have give the same results as the others.

namespace lumo {
namespace {

template <typename E>
inline constexpr std::size_t kLanes = 16 / sizeof(E);

/// A vector register of E.
template <typename E, std::size_t kBytes = 16>
struct Register {
  using Lanes [[gnu::vector_size(kBytes)]] = E;
  Lanes lanes;

  void Load(const E* from) { std::memcpy(&lanes, from, sizeof(lanes)); }
  void Store(E* to) const { std::memcpy(to, &lanes, sizeof(lanes)); }
};

/// kLanes rows of kLanes elements.
template <typename E>
using Square = std::array<Register<E>, kLanes<E>>;

constexpr std::size_t Log2(std::size_t power) {
  return std::bit_width(power) - 1;
}

/// The lower (kHalf 0) or upper (kHalf 1) halves of both, lane by lane in turn. Of wider registers
/// each 16 bytes for themselves.
template <std::size_t kHalf, typename E, std::size_t kBytes>
[[gnu::always_inline]] inline void Zip(const Register<E, kBytes>& a, const Register<E, kBytes>& b,
                                       Register<E, kBytes>& out) {
  constexpr std::size_t kN = kLanes<E>;
  constexpr std::size_t kAll = kBytes / sizeof(E);
  [&]<std::size_t... I>(std::index_sequence<I...>) __attribute__((always_inline)) {
    platform::ShuffleLanes<static_cast<int>(I / kN * kN + kHalf * kN / 2 + I % kN / 2 +
                                            I % 2 * kAll)...>(a.lanes, b.lanes, out.lanes);
  }
  (std::make_index_sequence<kAll>());
}

/// The even (kOdd 0) or odd (kOdd 1) lanes of both, one after the other.
template <std::size_t kOdd, typename E>
[[gnu::always_inline]] inline void Unzip(const Register<E>& a, const Register<E>& b,
                                         Register<E>& out) {
  [&]<std::size_t... I>(std::index_sequence<I...>) __attribute__((always_inline)) {
    platform::ShuffleLanes<static_cast<int>(2 * I + kOdd)...>(a.lanes, b.lanes, out.lanes);
  }
  (std::make_index_sequence<kLanes<E>>());
}

/// The perfect shuffle of all lanes of an even number of registers, `kRounds` times: those of the
/// first half and those of the second in turn. Lane x goes to 2x modulo (number of lanes - 1), so
/// that Log2(N) rounds take pixels of kCount bands into rows of bands.
template <std::size_t kRounds, typename R, std::size_t kCount>
[[gnu::always_inline]] inline void ZipRounds(std::array<R, kCount>& rows) {
#pragma GCC unroll 4
  for (std::size_t round = 0; round < kRounds; ++round) {
    std::array<R, kCount> zipped;
#pragma GCC unroll 8
    for (std::size_t i = 0; i < kCount / 2; ++i) {
      Zip<0>(rows[i], rows[i + kCount / 2], zipped[2 * i]);
      Zip<1>(rows[i], rows[i + kCount / 2], zipped[2 * i + 1]);
    }
    rows = zipped;
  }
}

/// The way back from ZipRounds. Cheap for elements of 4 bytes and more.
template <std::size_t kRounds, typename R, std::size_t kCount>
[[gnu::always_inline]] inline void UnzipRounds(std::array<R, kCount>& rows) {
#pragma GCC unroll 4
  for (std::size_t round = 0; round < kRounds; ++round) {
    std::array<R, kCount> unzipped;
#pragma GCC unroll 8
    for (std::size_t i = 0; i < kCount / 2; ++i) {
      Unzip<0>(rows[2 * i], rows[2 * i + 1], unzipped[i]);
      Unzip<1>(rows[2 * i], rows[2 * i + 1], unzipped[i + kCount / 2]);
    }
    rows = unzipped;
  }
}

/// Transposes a square in registers.
template <typename E>
[[gnu::always_inline]] inline void Transpose(Square<E>& rows) {
  ZipRounds<Log2(kLanes<E>)>(rows);
}

/// A matrix of elements: `rows` by `columns`, a row `stride` elements behind the one before.
template <typename E>
struct Matrix {
  E* data;
  std::size_t stride;
  E* At(std::size_t row, std::size_t column) const { return data + row * stride + column; }
};

/// Calls `kernel(pixel)` for runs of N pixels that cover all. The last one is moved back to end
/// with them, and does some pixels once more.
template <typename E, typename F>
[[gnu::always_inline]] inline void ForPixels(std::size_t pixelCount, const F& kernel) {
  constexpr std::size_t kN = kLanes<E>;
  for (std::size_t pixel = 0; pixel < pixelCount; pixel += kN) {
    kernel(std::min(pixel, pixelCount - kN));
  }
}

template <typename E, std::size_t kCount>
[[gnu::always_inline]] inline void LoadAll(std::array<Register<E>, kCount>& rows, const E* from,
                                           std::size_t stride) {
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kCount; ++i) rows[i].Load(from + i * stride);
}

template <typename E, std::size_t kCount>
[[gnu::always_inline]] inline void StoreAll(const std::array<Register<E>, kCount>& rows, E* to,
                                            std::size_t stride) {
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kCount; ++i) rows[i].Store(to + i * stride);
}

#if defined(__x86_64__)

/// Whether the machine has the kernels from here on.
inline bool HasAvx2() {
  static const bool has = __builtin_cpu_supports("avx2");
  return has;
}

/// For each byte of three registers, by number of output and input, where it comes from in the
/// input; the sign bit where it comes from another one.
using ThreeMasks = std::array<std::array<std::array<std::uint8_t, 16>, 3>, 3>;

/// The masks that transpose N pixels of 3 bands, elements having `bytes`, or, with `join`, back.
constexpr ThreeMasks MakeThreeMasks(std::size_t bytes, bool join) {
  ThreeMasks masks{};
  for (auto& output : masks) {
    for (auto& input : output) input.fill(0x80);
  }
  const std::size_t lanes = 16 / bytes;
  for (std::size_t i = 0; i < 48; ++i) {
    const std::size_t joined = (i / bytes % lanes * 3 + i / 16) * bytes + i % bytes;
    const std::size_t from = join ? i : joined;
    const std::size_t to = join ? joined : i;
    masks[to / 16][from / 16][to % 16] = static_cast<std::uint8_t>(from % 16);
  }
  return masks;
}

template <std::size_t kBytes, bool kJoin>
inline constexpr ThreeMasks kThreeMasks = MakeThreeMasks(kBytes, kJoin);

/// Transposes N pixels of 3 bands in registers, elements having `kBytes`, or, with `kJoin`, back.
template <std::size_t kBytes, bool kJoin, typename E>
[[gnu::target("avx2"), gnu::always_inline]] inline void ShuffleThree(
    std::array<Register<E>, 3>& rows) {
  __m128i in[3];
  std::memcpy(&in, &rows, sizeof(in));
#pragma GCC unroll 3
  for (std::size_t i = 0; i < 3; ++i) {
    __m128i masks[3];
    std::memcpy(&masks, &kThreeMasks<kBytes, kJoin>[i], sizeof(masks));
    const __m128i out = _mm_or_si128(
        _mm_or_si128(_mm_shuffle_epi8(in[0], masks[0]), _mm_shuffle_epi8(in[1], masks[1])),
        _mm_shuffle_epi8(in[2], masks[2]));
    std::memcpy(&rows[i], &out, sizeof(out));
  }
}

template <typename E>
[[gnu::target("avx2")]] void SplitThree(const Matrix<const E>& pixels, const Matrix<E>& bands,
                                        std::size_t pixelCount) {
  constexpr std::size_t kN = kLanes<E>;
  for (std::size_t start = 0; start < pixelCount; start += kN) {
    const std::size_t pixel = std::min(start, pixelCount - kN);
    std::array<Register<E>, 3> rows;
    LoadAll(rows, pixels.At(pixel, 0), kN);
    ShuffleThree<sizeof(E), false>(rows);
    StoreAll(rows, bands.At(0, pixel), bands.stride);
  }
}

template <typename E>
[[gnu::target("avx2")]] void JoinThree(const Matrix<const E>& bands, const Matrix<E>& pixels,
                                       std::size_t pixelCount) {
  constexpr std::size_t kN = kLanes<E>;
  for (std::size_t start = 0; start < pixelCount; start += kN) {
    const std::size_t pixel = std::min(start, pixelCount - kN);
    std::array<Register<E>, 3> rows;
    LoadAll(rows, bands.At(0, pixel), bands.stride);
    ShuffleThree<sizeof(E), true>(rows);
    StoreAll(rows, pixels.At(pixel, 0), kN);
  }
}

/// Six bands as three of pairs.
template <typename E>
[[gnu::target("avx2")]] void JoinSix(const Matrix<const E>& bands, const Matrix<E>& pixels,
                                     std::size_t pixelCount) {
  constexpr std::size_t kN = kLanes<E>;
  for (std::size_t start = 0; start < pixelCount; start += kN) {
    const std::size_t pixel = std::min(start, pixelCount - kN);
    std::array<Register<E>, 6> rows;
    LoadAll(rows, bands.At(0, pixel), bands.stride);
    std::array<Register<E>, 3> low;
    std::array<Register<E>, 3> high;
#pragma GCC unroll 3
    for (std::size_t i = 0; i < 3; ++i) {
      Zip<0>(rows[2 * i], rows[2 * i + 1], low[i]);
      Zip<1>(rows[2 * i], rows[2 * i + 1], high[i]);
    }
    ShuffleThree<2 * sizeof(E), true>(low);
    ShuffleThree<2 * sizeof(E), true>(high);
    StoreAll(low, pixels.At(pixel, 0), kN);
    StoreAll(high, pixels.At(pixel, 0) + 3 * kN, kN);
  }
}

/// Transposes 2N rows of N columns: two squares, one in the lower and one in the upper halves of
/// registers of 32 bytes.
template <typename E>
[[gnu::target("avx2"), gnu::always_inline]] inline void TransposeTwoSquares(
    const Matrix<const E>& from, const Matrix<E>& to, std::size_t row, std::size_t column) {
  constexpr std::size_t kN = kLanes<E>;
  std::array<Register<E, 32>, kN> rows;
  const E* lower = from.At(row, column);
  const E* upper = from.At(row + kN, column);
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kN; ++i, lower += from.stride, upper += from.stride) {
    const __m256i both = _mm256_loadu2_m128i(reinterpret_cast<const __m128i*>(upper),
                                             reinterpret_cast<const __m128i*>(lower));
    std::memcpy(&rows[i], &both, sizeof(both));
  }
  ZipRounds<Log2(kN)>(rows);
  E* out = to.At(column, row);
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kN; ++i, out += to.stride) rows[i].Store(out);
}

/// Transposes a matrix of 2N rows by N columns or more, in tiles with sides of a cache line. What
/// goes last in a row or a column is moved back to end with it, and does some elements once more.
template <typename E>
[[gnu::target("avx2")]] void TransposeWide(const Matrix<const E>& from, const Matrix<E>& to,
                                           std::size_t rows, std::size_t columns) {
  constexpr std::size_t kN = kLanes<E>;
  constexpr std::size_t kTile = 64 / sizeof(E);
  for (std::size_t top = 0; top < rows; top += kTile) {
    const std::size_t bottom = std::min(top + kTile, rows);
    for (std::size_t left = 0; left < columns; left += kTile) {
      const std::size_t right = std::min(left + kTile, columns);
      for (std::size_t row = top; row < bottom; row += 2 * kN) {
        for (std::size_t column = left; column < right; column += kN) {
          TransposeTwoSquares(from, to, std::min(row, rows - 2 * kN),
                              std::min(column, columns - kN));
        }
      }
    }
  }
}

#else

inline bool HasAvx2() {
  return false;
}
template <typename E>
void TransposeWide(const Matrix<const E>&, const Matrix<E>&, std::size_t, std::size_t) {}
template <typename E>
void SplitThree(const Matrix<const E>&, const Matrix<E>&, std::size_t) {}
template <typename E>
void JoinThree(const Matrix<const E>&, const Matrix<E>&, std::size_t) {}
template <typename E>
void JoinSix(const Matrix<const E>&, const Matrix<E>&, std::size_t) {}

#endif

/// Pixels of kWidth bands into rows of bands, N pixels or more.
template <typename E, std::size_t kWidth>
struct NarrowSplit {
  /// @return false, with nothing done, where there is no kernel for it.
  static bool Run(const Matrix<const E>& pixels, const Matrix<E>& bands, std::size_t pixelCount) {
    constexpr std::size_t kN = kLanes<E>;
    if constexpr (kWidth % 2 == 0) {
      ForPixels<E>(pixelCount, [&](std::size_t pixel) {
        std::array<Register<E>, kWidth> rows;
        LoadAll(rows, pixels.At(pixel, 0), kN);
        ZipRounds<Log2(kN)>(rows);
        StoreAll(rows, bands.At(0, pixel), bands.stride);
      });
      return true;
    } else if constexpr (kWidth == 3 && sizeof(E) <= 2) {
      if (HasAvx2()) SplitThree(pixels, bands, pixelCount);
      return HasAvx2();
    }
    return false;
  }
};

/// Rows of kWidth bands into pixels, N or more.
template <typename E, std::size_t kWidth>
struct NarrowJoin {
  /// @return false, with nothing done, where there is no kernel for it.
  static bool Run(const Matrix<const E>& bands, const Matrix<E>& pixels, std::size_t pixelCount) {
    constexpr std::size_t kN = kLanes<E>;
    constexpr bool kZips = std::has_single_bit(kWidth);
    if constexpr (kZips || (kWidth % 2 == 0 && sizeof(E) >= 4)) {
      ForPixels<E>(pixelCount, [&](std::size_t pixel) {
        std::array<Register<E>, kWidth> rows;
        LoadAll(rows, bands.At(0, pixel), bands.stride);
        if constexpr (kZips) {
          ZipRounds<Log2(kWidth)>(rows);
        } else {
          UnzipRounds<Log2(kN)>(rows);
        }
        StoreAll(rows, pixels.At(pixel, 0), kN);
      });
      return true;
    } else if constexpr (kWidth == 3 && sizeof(E) <= 2) {
      if (HasAvx2()) JoinThree(bands, pixels, pixelCount);
      return HasAvx2();
    } else if constexpr (kWidth == 6 && sizeof(E) == 1) {
      if (HasAvx2()) JoinSix(bands, pixels, pixelCount);
      return HasAvx2();
    }
    return false;
  }
};

}  // namespace
}  // namespace lumo
