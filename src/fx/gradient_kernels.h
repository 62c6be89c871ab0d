#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/export.h"
#include "raster/pixel_types.h"

namespace lumo {

/// Computes a row of gradients: for each pixel the largest |gx| + |gy| of its bands, where gx and
/// gy are the differences across the pixel that the operator of Sobel takes (Duda and Hart, Pattern
/// Classification and Scene Analysis, 1973, p. 271), in integers for integer types.
///
/// 0 is the smallest normal double. A difference that is not a number takes the place of the bands
/// before it, and gives way to the next band.
///
/// @param up,middle,down  the first pixel of the row, and those above and below; pixel-interleaved,
///                        with a pixel in front and one behind the row.
/// @param gradients       [out] one for each pixel.
template <typename T>
VEXG_EXPORT void ComputeSobelRow(const T* up, const T* middle, const T* down, std::size_t bands,
                                 std::size_t pixels, double* gradients);

/// Computes a row of mean band values: the sum of value * weight over the bands.
/// @param weights  one for each band.
template <typename T>
VEXG_EXPORT void ComputeIntensityRow(const T* row, const double* weights, std::size_t bands,
                                     std::size_t pixels, double* intensities);

}  // namespace lumo
