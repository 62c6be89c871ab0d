#include "fx/gradient_kernels.h"

#include <algorithm>
#include <limits>
#include <type_traits>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

constexpr double kLeastGradient = std::numeric_limits<double>::min();

/// Chooses a type that holds every gradient of a pixel type, which is at most 8 times its range.
template <typename T>
using GradientOf = std::conditional_t<
    std::is_floating_point_v<T>, double,
    std::conditional_t<sizeof(T) == 1, std::int16_t,
                       std::conditional_t<sizeof(T) == 2, std::int32_t, std::int64_t>>>;

/// The gradient of value `i` of the middle row.
template <typename T>
inline GradientOf<T> GradientAt(const T* up, const T* middle, const T* down, std::size_t bands,
                                std::size_t i) {
  using V = GradientOf<T>;
  const V topLeft = up[i - bands], top = up[i], topRight = up[i + bands];
  const V left = middle[i - bands], right = middle[i + bands];
  const V bottomLeft = down[i - bands], bottom = down[i], bottomRight = down[i + bands];
  const V x = static_cast<V>(2 * (left - right) + topLeft + bottomLeft - topRight - bottomRight);
  const V y = static_cast<V>(2 * (top - bottom) + topLeft + topRight - bottomLeft - bottomRight);
  return static_cast<V>((x < 0 ? -x : x) + (y < 0 ? -y : y));
}

template <typename T>
inline void SobelRow(const T* up, const T* middle, const T* down, std::size_t bands,
                     std::size_t pixels, double* gradients) {
  constexpr std::size_t kValues = 4096;
  GradientOf<T> values[kValues];
  const std::size_t most = kValues / bands;  // pixels at once
  for (std::size_t begin = 0; begin < pixels; begin += most) {
    const std::size_t count = std::min(most, pixels - begin), at = begin * bands;
    for (std::size_t i = 0; i < count * bands; ++i) {
      values[i] = GradientAt(up + at, middle + at, down + at, bands, i);
    }
    for (std::size_t i = 0; i < count; ++i) {
      if constexpr (std::is_integral_v<T>) {
        GradientOf<T> largest = values[i * bands];
        for (std::size_t band = 1; band < bands; ++band) {
          largest = std::max(largest, values[i * bands + band]);
        }
        gradients[begin + i] = largest == 0 ? kLeastGradient : static_cast<double>(largest);
      } else {
        double largest = kLeastGradient;
        for (std::size_t band = 0; band < bands; ++band) {
          const double value = values[i * bands + band];
          if (!(value < largest)) largest = value;
        }
        gradients[begin + i] = largest;
      }
    }
  }
}

/// The same for pixels of so many bands that not one fits the block.
template <typename T>
void SobelRowOfManyBands(const T* up, const T* middle, const T* down, std::size_t bands,
                         std::size_t pixels, double* gradients) {
  for (std::size_t pixel = 0; pixel < pixels; ++pixel) {
    double largest = kLeastGradient;
    for (std::size_t band = 0; band < bands; ++band) {
      const auto value =
          static_cast<double>(GradientAt(up, middle, down, bands, pixel * bands + band));
      if (!(value < largest)) largest = value;
    }
    gradients[pixel] = largest;
  }
}

// A function of its own for each type, as templates have no clones.
#define SOBEL(T)                                                                  \
  VEXG_CHOOSING_VECTOR_CLONES                                                     \
  void SobelRowOf(const T* up, const T* middle, const T* down, std::size_t bands, \
                  std::size_t pixels, double* gradients) {                        \
    SobelRow(up, middle, down, bands, pixels, gradients);                         \
  }
VEXG_FOR_ALL(EIGHT, SOBEL);

}  // namespace

template <typename T>
void ComputeSobelRow(const T* up, const T* middle, const T* down, std::size_t bands,
                     std::size_t pixels, double* gradients) {
  constexpr std::size_t kMostBands = 4096;
  if (bands <= kMostBands) {
    SobelRowOf(up, middle, down, bands, pixels, gradients);
  } else {
    SobelRowOfManyBands(up, middle, down, bands, pixels, gradients);
  }
}

template <typename T>
void ComputeIntensityRow(const T* row, const double* weights, std::size_t bands, std::size_t pixels,
                         double* intensities) {
  for (std::size_t pixel = 0; pixel < pixels; ++pixel, row += bands) {
    double sum = 0;
    for (std::size_t band = 0; band < bands; ++band) {
      sum += static_cast<double>(row[band]) * weights[band];
    }
    intensities[pixel] = sum;
  }
}

#define KERNELS(T)                                                                                \
  template void ComputeSobelRow(const T*, const T*, const T*, std::size_t, std::size_t, double*); \
  template void ComputeIntensityRow(const T*, const double*, std::size_t, std::size_t, double*);
VEXG_FOR_ALL(EIGHT, KERNELS);

}  // namespace lumo
