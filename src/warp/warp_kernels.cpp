#include "warp/warp_kernels.h"

#include <algorithm>
#include <cstring>

#include "platform/lane_shuffle.h"
#include "platform/vector_clones.h"

namespace lumo {
namespace {

template <typename T, bool kNearest>
[[gnu::always_inline]] inline void Linear(WarpLanes<T, 4>& lanes, const double* as,
                                          const double* bs, unsigned count) {
  for (unsigned i = 0; i < count; ++i) {
    const auto p00 = static_cast<double>(lanes.taps[0][i]);
    const auto p10 = static_cast<double>(lanes.taps[1][i]);
    const auto p01 = static_cast<double>(lanes.taps[2][i]);
    const auto p11 = static_cast<double>(lanes.taps[3][i]);
    const double a = as[i], b = bs[i];
    const double value = p00 + (p10 - p00) * a + (p01 - p00) * b + (p11 + p00 - p01 - p10) * a * b;
    lanes.out[i] = StorePixel<T, kNearest>(value);
  }
}

/// The kernel on four values in a row, at the fraction t between the middle two.
[[gnu::always_inline]] inline double Convolve(double p0, double p1, double p2, double p3,
                                              double t) {
  constexpr double k = -1.0;
  return p1 + t * (-(p2 - p0) * k + t * (((p3 - p1) + (p2 - p0) * 2) * k - (p1 - p2) * 3 +
                                         t * ((p0 + p1 - p2 - p3) * k + (p1 - p2) * 2)));
}

template <typename T>
[[gnu::always_inline]] inline void Cubic(WarpLanes<T, 16>& lanes, const double* as,
                                         const double* bs, unsigned count) {
  for (unsigned i = 0; i < count; ++i) {
    const auto tap = [&](unsigned n) { return static_cast<double>(lanes.taps[n][i]); };
    const double a = as[i], b = bs[i];
    const double c0 = Convolve(tap(0), tap(4), tap(8), tap(12), b);
    const double c1 = Convolve(tap(1), tap(5), tap(9), tap(13), b);
    const double c2 = Convolve(tap(2), tap(6), tap(10), tap(14), b);
    const double c3 = Convolve(tap(3), tap(7), tap(11), tap(15), b);
    lanes.out[i] = StorePixel<T, false>(Convolve(c0, c1, c2, c3, a));
  }
}

template <typename T>
[[gnu::always_inline]] inline void Weigh(WarpLanes<T, 16>& lanes, const CubicWeights& x,
                                         const CubicWeights& y, unsigned count) {
  for (unsigned i = 0; i < count; ++i) {
    const auto line = [&](unsigned n) {
      return static_cast<double>(lanes.taps[n][i]) * x.of[0][i] +
             static_cast<double>(lanes.taps[n + 1][i]) * x.of[1][i] +
             static_cast<double>(lanes.taps[n + 2][i]) * x.of[2][i] +
             static_cast<double>(lanes.taps[n + 3][i]) * x.of[3][i];
    };
    lanes.out[i] = StorePixel<T, true>(line(0) * y.of[0][i] + line(4) * y.of[1][i] +
                                       line(8) * y.of[2][i] + line(12) * y.of[3][i]);
  }
}

using FourDoubles [[gnu::vector_size(32)]] = double;

/// Reads four values in a row. The compiler converts small whole numbers one by one, but widens
/// them by moving bytes: to the lower end of four integers, or to the upper one, where a shift
/// takes the sign along.
template <typename T>
[[gnu::always_inline]] inline void ReadFour(const T* at, FourDoubles& read) {
  if constexpr (std::is_integral_v<T> && sizeof(T) < 4) {
    using Bytes [[gnu::vector_size(16)]] = unsigned char;
    using Four [[gnu::vector_size(16)]] = std::int32_t;
    using Word = std::conditional_t<sizeof(T) == 1, std::int32_t, std::int64_t>;
    using Words [[gnu::vector_size(16)]] = Word;
    Word word;
    std::memcpy(&word, at, sizeof word);
    const Words words{word};
    const Bytes bytes = reinterpret_cast<Bytes>(words);
    constexpr bool kIsSigned = std::is_signed_v<T>;
    Bytes wide;  // place 15 holds a 0
    if constexpr (sizeof(T) == 1 && !kIsSigned) {
      platform::ShuffleLanes<0, 15, 15, 15, 1, 15, 15, 15, 2, 15, 15, 15, 3, 15, 15, 15>(
          bytes, bytes, wide);
    } else if constexpr (sizeof(T) == 1) {
      platform::ShuffleLanes<15, 15, 15, 0, 15, 15, 15, 1, 15, 15, 15, 2, 15, 15, 15, 3>(
          bytes, bytes, wide);
    } else if constexpr (!kIsSigned) {
      platform::ShuffleLanes<0, 1, 15, 15, 2, 3, 15, 15, 4, 5, 15, 15, 6, 7, 15, 15>(bytes, bytes,
                                                                                     wide);
    } else {
      platform::ShuffleLanes<15, 15, 0, 1, 15, 15, 2, 3, 15, 15, 4, 5, 15, 15, 6, 7>(bytes, bytes,
                                                                                     wide);
    }
    Four values = reinterpret_cast<Four>(wide);
    if constexpr (kIsSigned) values >>= 8 * static_cast<int>(4 - sizeof(T));
    read = __builtin_convertvector(values, FourDoubles);
  } else {
    using Four [[gnu::vector_size(4 * sizeof(T))]] = T;
    Four values;
    std::memcpy(&values, at, sizeof values);
    read = __builtin_convertvector(values, FourDoubles);
  }
}

/// Adds four values in a row, each times a weight.
template <typename T>
[[gnu::always_inline]] inline void AddFour(double weight, const T* at, FourDoubles& sums) {
  FourDoubles values;
  ReadFour(at, values);
  sums += weight * values;
}

/// Sums of four bands, or eight.
template <unsigned kFours>
struct FourSums {
  FourDoubles of[kFours] = {};

  template <typename T>
  [[gnu::always_inline]] void Add(double weight, const T* at) {
    for (unsigned k = 0; k < kFours; ++k) AddFour(weight, at + 4 * k, of[k]);
  }
  [[gnu::always_inline]] void Add(double weight, const FourSums& sums) {
    for (unsigned k = 0; k < kFours; ++k) of[k] += weight * sums.of[k];
  }
  double operator[](unsigned i) const { return of[i / 4][i % 4]; }
};

/// The sum of one band.
struct OneSum {
  double of = 0;

  template <typename T>
  [[gnu::always_inline]] void Add(double weight, const T* at) {
    of += weight * static_cast<double>(*at);
  }
  [[gnu::always_inline]] void Add(double weight, const OneSum& sum) { of += weight * sum.of; }
  double operator[](unsigned) const { return of; }
};

/// Some bands of the pixels at `count` positions.
template <typename Sums, typename T>
[[gnu::always_inline]] inline void Near(const NearPixels<T>& pixels, unsigned band, unsigned bands,
                                        const NearWeights& x, const NearWeights& y,
                                        const std::uint8_t* wanted, unsigned count) {
  for (unsigned i = 0; i < count; ++i) {
    if (wanted[i] == 0) continue;
    const T* const in = pixels.in + static_cast<std::size_t>(x.first[i]) * pixels.inPixel +
                        static_cast<std::size_t>(y.first[i]) * pixels.inLine + band;
    Sums sums;
    for (unsigned column = 0; column < x.taps; ++column) {
      const double columnWeight = x.of[column][i];
      if (columnWeight == 0) continue;
      Sums sum;
      const T* at = in + column * pixels.inPixel;
      for (unsigned line = 0; line < y.taps; ++line, at += pixels.inLine) {
        const double lineWeight = y.of[line][i];
        if (lineWeight != 0) sum.Add(lineWeight, at);
      }
      sums.Add(columnWeight, sum);
    }
    T* const out = pixels.out + i * pixels.outPixel + band * pixels.outBand;
    for (unsigned b = 0; b < bands; ++b) out[b * pixels.outBand] = StorePixel<T, true>(sums[b]);
  }
}

template <typename T>
[[gnu::always_inline]] inline void NearBands(const NearPixels<T>& pixels, const NearWeights& x,
                                             const NearWeights& y, const std::uint8_t* wanted,
                                             unsigned count) {
  for (unsigned band = 0; band < pixels.bands;) {
    const unsigned bands = std::min(pixels.bands - band, 8U);
    if (bands > 4) {
      Near<FourSums<2>>(pixels, band, bands, x, y, wanted, count);
    } else if (bands > 1) {
      Near<FourSums<1>>(pixels, band, bands, x, y, wanted, count);
    } else {
      Near<OneSum>(pixels, band, bands, x, y, wanted, count);
    }
    band += bands;
  }
}

}  // namespace

VEXG_VECTOR_CLONES
void FindCubicWeights(const double* ways, unsigned count, double parameter, CubicWeights& weights) {
  const double k = parameter;
  for (unsigned i = 0; i < count; ++i) {
    const double t = ways[i], t2 = t * t, t3 = t2 * t;
    weights.of[0][i] = k * (t3 - 2 * t2 + t);
    weights.of[1][i] = (k + 2) * t3 - (k + 3) * t2 + 1;
    weights.of[2][i] = (2 * k + 3) * t2 - (k + 2) * t3 - k * t;
    weights.of[3][i] = k * (t2 - t3);
  }
}

#define VEXG_WARP_KERNELS(T)                                                                       \
  VEXG_VECTOR_CLONES                                                                               \
  void InterpolateLinear(WarpLanes<T, 4>& lanes, const double* a, const double* b, unsigned count, \
                         WarpRounding rounding) {                                                  \
    if (rounding == WarpRounding::kNearest) {                                                      \
      Linear<T, true>(lanes, a, b, count);                                                         \
    } else {                                                                                       \
      Linear<T, false>(lanes, a, b, count);                                                        \
    }                                                                                              \
  }                                                                                                \
  VEXG_VECTOR_CLONES                                                                               \
  void InterpolateCubic(WarpLanes<T, 16>& lanes, const double* a, const double* b,                 \
                        unsigned count) {                                                          \
    Cubic(lanes, a, b, count);                                                                     \
  }                                                                                                \
  VEXG_VECTOR_CLONES                                                                               \
  void WeighCubic(WarpLanes<T, 16>& lanes, const CubicWeights& x, const CubicWeights& y,           \
                  unsigned count) {                                                                \
    Weigh(lanes, x, y, count);                                                                     \
  }                                                                                                \
  VEXG_VECTOR_CLONES                                                                               \
  void AddWeighed(const T* values, std::size_t count, double weight, double* sums) {               \
    for (std::size_t i = 0; i < count; ++i) sums[i] += weight * static_cast<double>(values[i]);    \
  }                                                                                                \
  VEXG_VECTOR_CLONES                                                                               \
  void WeighNear(const NearPixels<T>& pixels, const NearWeights& x, const NearWeights& y,          \
                 const std::uint8_t* wanted, unsigned count) {                                     \
    NearBands(pixels, x, y, wanted, count);                                                        \
  }
VEXG_WARP_KERNELS(std::uint8_t)
VEXG_WARP_KERNELS(std::int8_t)
VEXG_WARP_KERNELS(std::uint16_t)
VEXG_WARP_KERNELS(std::int16_t)
VEXG_WARP_KERNELS(std::uint32_t)
VEXG_WARP_KERNELS(std::int32_t)
VEXG_WARP_KERNELS(float)
VEXG_WARP_KERNELS(double)

}  // namespace lumo
