#include "pyramid/pixel_picker.h"

#include <cstring>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

/// An element as bytes that are copied in one piece.
template <std::size_t kBytes>
struct Element {
  unsigned char bytes[kBytes];
};

/// Pixels of so many bytes, each of which the compiler moves in an instruction or two.
template <std::size_t kBytes>
void PickFixed(const char* from, std::size_t stepBytes, std::size_t count, char* to) {
  for (std::size_t i = 0; i < count; ++i, from += stepBytes, to += kBytes) {
    std::memcpy(to, from, kBytes);
  }
}

void PickWhole(const char* from, std::size_t pixelBytes, std::size_t step, std::size_t count,
               char* to) {
  const std::size_t stepBytes = pixelBytes * step;
  if (step == 1) {
    std::memcpy(to, from, pixelBytes * count);
    return;
  }
  switch (pixelBytes) {
    case 1:
      return PickFixed<1>(from, stepBytes, count, to);
    case 2:
      return PickFixed<2>(from, stepBytes, count, to);
    case 3:
      return PickFixed<3>(from, stepBytes, count, to);
    case 4:
      return PickFixed<4>(from, stepBytes, count, to);
    case 6:
      return PickFixed<6>(from, stepBytes, count, to);
    case 8:
      return PickFixed<8>(from, stepBytes, count, to);
    case 12:
      return PickFixed<12>(from, stepBytes, count, to);
    case 16:
      return PickFixed<16>(from, stepBytes, count, to);
    case 24:
      return PickFixed<24>(from, stepBytes, count, to);
    case 32:
      return PickFixed<32>(from, stepBytes, count, to);
    default:
      for (std::size_t i = 0; i < count; ++i, from += stepBytes, to += pixelBytes) {
        std::memcpy(to, from, pixelBytes);
      }
  }
}

/// Elements of one band, into a block of pixels of `bands` bands.
template <typename E>
void PickBand(const E* from, std::size_t step, std::size_t count, std::size_t bands, E* to) {
  for (std::size_t i = 0; i < count; ++i) to[i * bands] = from[i * step];
}

/// Elements of all bands at once, which writes each part of the output in one go.
/// @param bandStride  elements between the bands of a pixel.
template <typename E, unsigned kBands>
void PickBands(const E* from, std::size_t bandStride, std::size_t step, std::size_t count, E* to) {
  for (std::size_t i = 0; i < count; ++i, to += kBands) {
    for (unsigned band = 0; band < kBands; ++band) to[band] = from[band * bandStride + i * step];
  }
}

template <typename E>
void PickPlanes(const E* from, std::size_t bandStride, std::size_t step, std::size_t count,
                unsigned bands, E* to) {
  switch (bands) {
    case 2:
      return PickBands<E, 2>(from, bandStride, step, count, to);
    case 3:
      return PickBands<E, 3>(from, bandStride, step, count, to);
    case 4:
      return PickBands<E, 4>(from, bandStride, step, count, to);
    case 5:
      return PickBands<E, 5>(from, bandStride, step, count, to);
    case 6:
      return PickBands<E, 6>(from, bandStride, step, count, to);
    case 7:
      return PickBands<E, 7>(from, bandStride, step, count, to);
    case 8:
      return PickBands<E, 8>(from, bandStride, step, count, to);
    default:
      for (unsigned band = 0; band < bands; ++band) {
        PickBand(from + band * bandStride, step, count, bands, to + band);
      }
  }
}

template <typename E>
void PickFrom(const PickedBlock& block, std::size_t line, std::size_t x, std::size_t step,
              std::size_t count, void* to) {
  const std::size_t width = block.width;
  const bool byLine = block.order == Interleave::BIL;
  const std::size_t first = byLine ? line * block.bands * width : line * width;
  const std::size_t bandStride = byLine ? width : width * block.height;
  const E* const from = static_cast<const E*>(block.elements) + first + x;
  PickPlanes(from, bandStride, step, count, block.bands, static_cast<E*>(to));
}

VEXG_VECTOR_CLONES bool AnyBit(const unsigned char* bytes, std::size_t count, unsigned char bits) {
  unsigned char all = 0;
  for (std::size_t i = 0; i < count; ++i) all = static_cast<unsigned char>(all | bytes[i]);
  return (all & bits) != 0;
}

}  // namespace

void PickPixels(const PickedBlock& block, unsigned line, unsigned x, std::size_t step,
                std::size_t count, void* to) {
  if (block.order == Interleave::BIP || block.bands == 1) {
    const std::size_t pixelBytes = std::size_t{block.bands} * block.elementBytes;
    const std::size_t at = std::size_t{line} * block.width + x;
    PickWhole(static_cast<const char*>(block.elements) + at * pixelBytes, pixelBytes, step, count,
              static_cast<char*>(to));
    return;
  }
  switch (block.elementBytes) {
    case 1:
      return PickFrom<Element<1>>(block, line, x, step, count, to);
    case 2:
      return PickFrom<Element<2>>(block, line, x, step, count, to);
    case 4:
      return PickFrom<Element<4>>(block, line, x, step, count, to);
    case 8:
      return PickFrom<Element<8>>(block, line, x, step, count, to);
    default:
      return PickFrom<Element<16>>(block, line, x, step, count, to);
  }
}

bool HasMasks(const PickedBlock& states, unsigned line) {
  constexpr unsigned char kMasks = PixelValueState::NotValid & ~PixelValueState::NoData;
  const auto* const bytes = static_cast<const unsigned char*>(states.elements);
  const std::size_t width = states.width, bands = states.bands;
  if (states.order != Interleave::BSQ) {
    return AnyBit(bytes + line * width * bands, width * bands, kMasks);
  }
  for (std::size_t band = 0; band < bands; ++band) {
    if (AnyBit(bytes + (band * states.height + line) * width, width, kMasks)) return true;
  }
  return false;
}

}  // namespace lumo
