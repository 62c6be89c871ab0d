#include "raster/interleave.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <utility>

#include "raster/interleave_body.h"
#include "raster/interleave_lines.h"

namespace lumo {
namespace {

// A change of interleave is a transposition of pixels by bands, once for the block (BSQ) or once
// for each line (BIL). It is done in squares of N by N elements that fit the vector registers, N
// being what 16 bytes hold, and in runs of pixels whose part of both blocks fits the first cache.
// The commonest few bands and, where the machine can, the many bands have quicker kernels.

/// Columns [first, first + kWidth) of N pixels into rows of bands. Reads N columns, also where only
/// kWidth are wanted.
template <typename E, std::size_t kWidth>
void SplitSquare(const Matrix<const E>& pixels, const Matrix<E>& bands, std::size_t pixel,
                 std::size_t first) {
  Square<E> square;
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kLanes<E>; ++i) square[i].Load(pixels.At(pixel + i, first));
  Transpose<E>(square);
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kWidth; ++i) square[i].Store(bands.At(first + i, pixel));
}

/// Rows [first, first + kWidth) of bands into columns of N pixels. Writes N columns, also where
/// only kWidth are wanted: what is written too much is the start of the next pixel, written after.
template <typename E, std::size_t kWidth>
void JoinSquare(const Matrix<const E>& bands, const Matrix<E>& pixels, std::size_t pixel,
                std::size_t first) {
  Square<E> square;
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kLanes<E>; ++i) {
    if (i < kWidth) {
      square[i].Load(bands.At(first + i, pixel));
    } else {
      square[i] = Register<E>();
    }
  }
  Transpose<E>(square);
#pragma GCC unroll 16
  for (std::size_t i = 0; i < kLanes<E>; ++i) square[i].Store(pixels.At(pixel + i, first));
}

/// Calls one of the square functions for a width from 1 to N that is known only now.
template <typename E, typename F>
void ForWidth(std::size_t width, const F& call) {
  [&]<std::size_t... W>(std::index_sequence<W...>) {
    (void)((width == W + 1 && (call(std::integral_constant<std::size_t, W + 1>()), true)) || ...);
  }
  (std::make_index_sequence<kLanes<E>>());
}

/// How many pixels to take in one run: as many as leave room in the first cache for a row of each.
template <typename E>
std::size_t RunLength(std::size_t bands) {
  constexpr std::size_t kCacheBytes = 16 * 1024;
  constexpr std::size_t kLineBytes = 64;
  const std::size_t fits = kCacheBytes / (bands * sizeof(E));
  const std::size_t step = std::max(kLanes<E>, kLineBytes / sizeof(E));
  return std::max(fits / step, std::size_t{1}) * step;
}

/// Pixel by pixel, for what the squares leave over.
template <typename E>
void SplitPlain(const Matrix<const E>& pixels, const Matrix<E>& bands, std::size_t from,
                std::size_t to, std::size_t bandCount) {
  for (std::size_t band = 0; band < bandCount; ++band) {
    for (std::size_t pixel = from; pixel < to; ++pixel) {
      *bands.At(band, pixel) = *pixels.At(pixel, band);
    }
  }
}

template <typename E>
void JoinPlain(const Matrix<const E>& bands, const Matrix<E>& pixels, std::size_t from,
               std::size_t to, std::size_t bandCount) {
  for (std::size_t pixel = from; pixel < to; ++pixel) {
    for (std::size_t band = 0; band < bandCount; ++band) {
      *pixels.At(pixel, band) = *bands.At(band, pixel);
    }
  }
}

/// Where the squares of fewer than N bands end: they reach behind their last pixel, and must not
/// reach behind the block.
template <typename E>
std::size_t NarrowPixels(std::size_t pixels, std::size_t bands) {
  constexpr std::size_t kN = kLanes<E>;
  const std::size_t over = (kN - 1) / bands;  // pixels that a square reaches behind
  return pixels < kN + over ? 0 : (pixels - over) / kN * kN;
}

/// Calls `square(pixel, first)` so that squares of N pixels by N bands cover everything. The last
/// ones of a row and of a column are moved back to end with it, and do some elements once more.
template <typename E, typename F>
void ForSquares(std::size_t pixelCount, std::size_t bandCount, const F& square) {
  constexpr std::size_t kN = kLanes<E>;
  const std::size_t run = RunLength<E>(bandCount);
  for (std::size_t start = 0; start < pixelCount; start += run) {
    const std::size_t end = std::min(start + run, pixelCount);
    for (std::size_t band = 0; band < bandCount; band += kN) {
      const std::size_t first = std::min(band, bandCount - kN);
      for (std::size_t pixel = start; pixel < end; pixel += kN) {
        square(std::min(pixel, pixelCount - kN), first);
      }
    }
  }
}

/// Takes the kernel made for just this number of bands.
/// @return false, with nothing done, where there is none.
template <template <typename, std::size_t> typename Kernel, typename E, typename From, typename To>
bool RunNarrow(const From& from, const To& to, std::size_t pixelCount, std::size_t bandCount) {
  constexpr std::size_t kN = kLanes<E>;
  if (pixelCount < kN) return false;
  return [&]<std::size_t... W>(std::index_sequence<W...>) {
    return ((bandCount == W && Kernel<E, W>::Run(from, to, pixelCount)) || ...);
  }
  (std::index_sequence<2, 3, 4, 6, 8>());
}

/// `pixels` by `bands` into `bands` by `pixels`. @param stride  from a band to the next.
template <typename E>
void Split(const E* from, E* to, std::size_t pixelCount, std::size_t bandCount,
           std::size_t stride) {
  constexpr std::size_t kN = kLanes<E>;
  const Matrix<const E> pixels{from, bandCount};
  const Matrix<E> bands{to, stride};
  if (RunNarrow<NarrowSplit, E>(pixels, bands, pixelCount, bandCount)) return;
  if (pixelCount >= 2 * kN && bandCount >= kN && HasAvx2()) {
    TransposeWide(pixels, bands, pixelCount, bandCount);
    return;
  }
  if (bandCount >= kN && pixelCount >= kN) {
    ForSquares<E>(pixelCount, bandCount, [&](std::size_t pixel, std::size_t first) {
      SplitSquare<E, kN>(pixels, bands, pixel, first);
    });
    return;
  }
  const std::size_t whole = bandCount < kN ? NarrowPixels<E>(pixelCount, bandCount) : 0;
  ForWidth<E>(bandCount, [&](auto width) {
    for (std::size_t pixel = 0; pixel < whole; pixel += kN) {
      SplitSquare<E, width>(pixels, bands, pixel, 0);
    }
  });
  SplitPlain(pixels, bands, whole, pixelCount, bandCount);
}

/// `bands` by `pixels` into `pixels` by `bands`.
template <typename E>
void Join(const E* from, E* to, std::size_t pixelCount, std::size_t bandCount) {
  constexpr std::size_t kN = kLanes<E>;
  const Matrix<const E> bands{from, pixelCount};
  const Matrix<E> pixels{to, bandCount};
  if (RunNarrow<NarrowJoin, E>(bands, pixels, pixelCount, bandCount)) return;
  if (bandCount >= 2 * kN && pixelCount >= kN && HasAvx2()) {
    TransposeWide(bands, pixels, bandCount, pixelCount);
    return;
  }
  if (bandCount >= kN && pixelCount >= kN) {
    ForSquares<E>(pixelCount, bandCount, [&](std::size_t pixel, std::size_t first) {
      JoinSquare<E, kN>(bands, pixels, pixel, first);
    });
    return;
  }
  const std::size_t whole = bandCount < kN ? NarrowPixels<E>(pixelCount, bandCount) : 0;
  ForWidth<E>(bandCount, [&](auto width) {
    for (std::size_t pixel = 0; pixel < whole; pixel += kN) {
      JoinSquare<E, width>(bands, pixels, pixel, 0);
    }
  });
  JoinPlain(bands, pixels, whole, pixelCount, bandCount);
}

/// Elements too large for a square of registers.
struct Element16 {
  std::uint64_t halves[2];
};
template <>
inline constexpr std::size_t kLanes<Element16> = 1;

template <>
void Split(const Element16* from, Element16* to, std::size_t pixelCount, std::size_t bandCount,
           std::size_t stride) {
  const Matrix<const Element16> pixels{from, bandCount};
  const Matrix<Element16> bands{to, stride};
  const std::size_t run = RunLength<Element16>(bandCount);
  for (std::size_t start = 0; start < pixelCount; start += run) {
    SplitPlain(pixels, bands, start, std::min(start + run, pixelCount), bandCount);
  }
}

template <>
void Join(const Element16* from, Element16* to, std::size_t pixelCount, std::size_t bandCount) {
  JoinPlain<Element16>({from, pixelCount}, {to, bandCount}, 0, pixelCount, bandCount);
}

/// BIL to BSQ and back: whole rows change places.
/// @param stride  rows from one of the slow axis of `to` to the next.
void MoveRows(const std::byte* from, std::byte* to, std::size_t slow, std::size_t fast,
              std::size_t rowBytes, std::size_t stride) {
  for (std::size_t i = 0; i < slow; ++i) {
    for (std::size_t j = 0; j < fast; ++j) {
      std::memcpy(to + (j * stride + i) * rowBytes, from + (i * fast + j) * rowBytes, rowBytes);
    }
  }
}

template <typename E>
void Convert(const E* from, Interleave fromOrder, E* to, Interleave toOrder, std::size_t samples,
             std::size_t lines, std::size_t bands) {
  const bool split = fromOrder == Interleave::BIP;
  const bool wholeBlock = (split ? toOrder : fromOrder) == Interleave::BSQ;
  const std::size_t pixels = wholeBlock ? samples * lines : samples;
  const std::size_t blocks = wholeBlock ? 1 : lines;
  for (std::size_t block = 0; block < blocks; ++block) {
    const std::size_t offset = block * pixels * bands;
    if (split) {
      Split<E>(from + offset, to + offset, pixels, bands, pixels);
    } else {
      Join<E>(from + offset, to + offset, pixels, bands);
    }
  }
}

template <typename E>
void Convert(const void* from, Interleave fromOrder, void* to, Interleave toOrder,
             std::size_t samples, std::size_t lines, std::size_t bands) {
  Convert(static_cast<const E*>(from), fromOrder, static_cast<E*>(to), toOrder, samples, lines,
          bands);
}

/// Calls `body` for the element of a size.
template <typename Body>
void ForElement(std::size_t elementBytes, const Body& body) {
  switch (elementBytes) {
    case 1:
      return body.template operator()<std::uint8_t>();
    case 2:
      return body.template operator()<std::uint16_t>();
    case 4:
      return body.template operator()<std::uint32_t>();
    case 8:
      return body.template operator()<std::uint64_t>();
    default:
      return body.template operator()<Element16>();
  }
}

bool IsInterleave(Interleave interleave) {
  return interleave >= Interleave::None && interleave <= Interleave::BSQ;
}

}  // namespace

Array<unsigned> BandsOfBlock(const Array<unsigned>& bands, Interleave interleave) {
  Array<unsigned> kept(bands);
  if (interleave == Interleave::None && kept.GetCount() > 1) kept.Resize(ArrayDims(1));
  return kept;
}

ArrayDims BlockDims(Interleave interleave, unsigned samples, unsigned lines, unsigned bands) {
  switch (interleave) {
    case Interleave::None:
      return ArrayDims(lines, samples);
    case Interleave::BIP:
      return ArrayDims(lines, samples, bands);
    case Interleave::BIL:
      return ArrayDims(lines, bands, samples);
    case Interleave::BSQ:
      return ArrayDims(bands, lines, samples);
  }
  return {};
}

bool ConvertInterleave(const void* from, Interleave fromOrder, void* to, Interleave toOrder,
                       std::size_t samples, std::size_t lines, std::size_t bands,
                       std::size_t elementBytes) {
  if (!IsInterleave(fromOrder) || !IsInterleave(toOrder)) return false;
  const bool none = fromOrder == Interleave::None || toOrder == Interleave::None;
  if (none && bands > 1) return false;
  constexpr std::array<std::size_t, 5> kSizes{1, 2, 4, 8, 16};
  if (std::ranges::find(kSizes, elementBytes) == kSizes.end()) return false;
  if (samples == 0 || lines == 0 || bands == 0) return true;

  if (fromOrder == toOrder || bands == 1) {
    std::memcpy(to, from, samples * lines * bands * elementBytes);
  } else if (fromOrder == Interleave::BIL && toOrder == Interleave::BSQ) {
    MoveRows(static_cast<const std::byte*>(from), static_cast<std::byte*>(to), lines, bands,
             samples * elementBytes, lines);
  } else if (fromOrder == Interleave::BSQ && toOrder == Interleave::BIL) {
    MoveRows(static_cast<const std::byte*>(from), static_cast<std::byte*>(to), bands, lines,
             samples * elementBytes, bands);
  } else {
    ForElement(elementBytes, [&]<typename E>() {
      Convert<E>(from, fromOrder, to, toOrder, samples, lines, bands);
    });
  }
  return true;
}

void SplitPixels(const void* from, void* to, std::size_t pixels, std::size_t bands,
                 std::size_t bandStride, std::size_t elementBytes) {
  ForElement(elementBytes, [&]<typename E>() {
    Split<E>(static_cast<const E*>(from), static_cast<E*>(to), pixels, bands, bandStride);
  });
}

void ConvertLines(const void* from, Interleave fromOrder, const LinesOfBlock& part, void* to,
                  Interleave toOrder, std::size_t samples, std::size_t bands,
                  std::size_t elementBytes) {
  if (part.count == 0 || samples == 0) return;
  const std::size_t rowBytes = samples * elementBytes;
  auto* const out = static_cast<std::byte*>(to);
  if (toOrder != Interleave::BSQ || bands == 1) {
    ConvertInterleave(from, fromOrder, out + part.first * bands * rowBytes, toOrder, samples,
                      part.count, bands, elementBytes);
    return;
  }
  const auto* const in = static_cast<const std::byte*>(from);
  std::byte* const plane = out + part.first * rowBytes;
  if (fromOrder == Interleave::BIP) {
    SplitPixels(from, plane, samples * part.count, bands, samples * part.ofLines, elementBytes);
  } else if (fromOrder == Interleave::BIL) {
    MoveRows(in, plane, part.count, bands, rowBytes, part.ofLines);
  } else {
    for (std::size_t band = 0; band < bands; ++band) {
      std::memcpy(plane + band * part.ofLines * rowBytes, in + band * part.count * rowBytes,
                  part.count * rowBytes);
    }
  }
}

}  // namespace lumo
