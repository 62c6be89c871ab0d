#include "views/raster_mask.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <limits>
#include <new>
#include <vector>

#include "foundation/errors.h"
#include "foundation/fault.h"
#include "foundation/type_code.h"
#include "raster/block_strides.h"
#include "raster/raster_iterator.h"
#include "raster/tile_functions.h"
#include "raster/valid_pixels.h"
#include "views/spectral_subset_raster.h"

namespace lumo {
namespace {

constexpr std::size_t kSpare = 16;  // bytes behind a plane, that 64 bits may be read at its end

constexpr std::uint64_t kTop = std::uint64_t{1} << 63;

/// The first 64 of the bytes as bits, the first one at the top; those behind `count` are 0.
std::uint64_t PackBits(const unsigned char* bytes, std::size_t count) {
  std::uint64_t bits = 0;
  std::size_t i = 0;
  for (; i + 8 <= std::min<std::size_t>(count, 64); i += 8) {
    std::uint64_t eight = 0;
    std::memcpy(&eight, bytes + i, 8);
    if constexpr (std::endian::native == std::endian::little) {
      // Each byte moves its bit to a place of its own in the highest byte.
      eight = (eight * 0x8040201008040201) >> 56;
    } else {
      eight = (eight * 0x0102040810204080) >> 56;
    }
    bits |= eight << (56 - i);
  }
  for (; i < std::min<std::size_t>(count, 64); ++i) {
    if (bytes[i] != 0) bits |= kTop >> i;
  }
  return bits;
}

/// Writes bits as bytes of 0 and 1, the top one first.
void UnpackBits(std::uint64_t bits, std::size_t count, unsigned char* bytes) {
  if (bits == 0 || bits == ~std::uint64_t{0}) {
    std::memset(bytes, static_cast<int>(bits & 1), count);
    return;
  }
  std::size_t i = 0;
  if constexpr (std::endian::native == std::endian::little) {
    constexpr std::uint64_t kOnes = 0x0101010101010101, kOwnBit = 0x0102040810204080;
    for (; i + 8 <= count; i += 8) {
      // Every byte keeps its own bit of the eight, which then moves to its lowest place.
      const std::uint64_t eight = (bits << i) >> 56;
      const std::uint64_t spread = ((((eight * kOnes) & kOwnBit) + 0x7F * kOnes) >> 7) & kOnes;
      std::memcpy(bytes + i, &spread, 8);
    }
  }
  for (; i < count; ++i) bytes[i] = static_cast<unsigned char>((bits << i) >> 63);
}

template <typename T>
bool IsSame(T a, T b) {
  if constexpr (std::is_floating_point_v<T>) {
    return (a == b) | ((a != a) & (b != b));
  } else {
    return a == b;
  }
}

/// Sets the bytes of pixels that have one of the values to 1.
/// @param step  from one pixel to the next.
template <typename T>
void MarkValues(const T* pixels, std::size_t count, std::size_t step, const Array<T>& values,
                unsigned char* __restrict marks) {
  for (const T value : values) {
    for (std::size_t i = 0; i < count; ++i) {
      marks[i] |= static_cast<unsigned char>(IsSame(pixels[i * step], value));
    }
  }
}

/// The pixel of a source of `from` pixels for each of `to`.
std::vector<unsigned> NearestPlaces(unsigned from, unsigned to) {
  std::vector<unsigned> places(to, 0);
  if (to < 2 || from == 0) return places;
  constexpr float kEnd = 4294967296.0F;  // a rounded place may lie there
  for (unsigned i = 0; i < to; ++i) {
    const float share = static_cast<float>(i) / static_cast<float>(to - 1);
    const float place = static_cast<float>(from - 1) * share;
    places[i] = place < kEnd ? static_cast<unsigned>(place) : from - 1;
  }
  return places;
}

}  // namespace

const unsigned RasterMask::TypeCode = GloballyUniqueObjectTypeCode("RasterMask");

bool RasterMask::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

template <typename T>
RasterMask::RasterMask(const RasterPtr<T>& raster, const Array<RasterMaskDef<T>>& defs,
                       const IPC& ipc) {
  if (!raster || !MakePlanes(raster->Samples(), raster->Lines(), raster->Bands())) return;
  std::vector<const RasterMaskDef<T>*> used;
  for (const RasterMaskDef<T>& def : defs) {
    if (def.values.GetCount() != 0 && def.band < Planes()) used.push_back(&def);
  }
  if (used.empty()) return;
  Array<unsigned> bands{ArrayDims(static_cast<unsigned>(used.size()))};
  std::transform(used.begin(), used.end(), bands.begin(),
                 [](const auto* def) { return def->band; });
  const RasterPtr<T> shown(new SpectralSubsetRaster<T>(raster, bands));
  const auto mark = [&](const Tile<T>& tile) {
    const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), tile.Bands());
    std::vector<unsigned char> marks(tile.Width());
    const auto [left, top] = tile.Origin();
    for (std::size_t i = 0; i < used.size(); ++i) {
      for (unsigned line = 0; line < tile.Height(); ++line) {
        const T* const pixels =
            tile.PixelArray().GetData() + i * strides.band + line * strides.line;
        std::fill(marks.begin(), marks.end(), static_cast<unsigned char>(0));
        MarkValues(pixels, marks.size(), strides.pixel, used[i]->values, marks.data());
        SetBits(used[i]->band, BitAt(left, top + line), marks.size(), marks.data());
      }
    }
  };
  const RasterIteratorPtr<T> tiles(new RasterIteratorSmart<T>(shown, AllBands(*shown)));
  const bool isWhole = ForEachTile("CreateRasterMask", TilesBy(tiles), mark, ipc);
  if (isWhole && !ipc.abort->IsSet()) return;
  DropPlanes();
  SetErrorState(ObjectErrorNotConstructed());
}

RasterMask::RasterMask(const RasterMask& source, unsigned width, unsigned height, unsigned planes) {
  if (!MakePlanes(width, height, planes) || source.Planes() == 0) return;
  const std::vector<unsigned> columns = NearestPlaces(source.width_, width);
  const std::vector<unsigned> lines = NearestPlaces(source.height_, height);
  std::vector<unsigned char> marks(width);
  for (unsigned plane = 0; plane < std::min(planes, source.Planes()); ++plane) {
    for (unsigned y = 0; y < height; ++y) {
      for (unsigned x = 0; x < width; ++x) {
        marks[x] = source.IsMarked(columns[x], lines[y], plane) ? 1 : 0;
      }
      SetBits(plane, BitAt(0, y), width, marks.data());
    }
  }
}

RasterMask::~RasterMask() {
  DropPlanes();
}

/// Sizes the planes, all bits 0.
bool RasterMask::MakePlanes(unsigned width, unsigned height, unsigned planes) {
  width_ = width;
  height_ = height;
  const std::uint64_t bytes = (std::uint64_t{width} * height + 7) >> 3;
  bool isMade =
      bytes <= std::numeric_limits<unsigned>::max() && planeBits_.Resize(ArrayDims(planes));
  if (isMade) {
    bytesPerPlane_ = static_cast<unsigned>(bytes);
    std::fill(planeBits_.begin(), planeBits_.end(), nullptr);
    for (unsigned char*& bits : planeBits_) {
      bits = new (std::nothrow) unsigned char[std::size_t{bytesPerPlane_} + kSpare]();
      isMade = isMade && bits != nullptr;
      if (!isMade) break;
    }
  }
  if (isMade) return true;
  DropPlanes();
  SetErrorState(ObjectErrorOutOfMemory());
  SetFault("there is no memory for a mask of that size");
  return false;
}

void RasterMask::DropPlanes() {
  for (unsigned char* const bits : planeBits_) delete[] bits;
  planeBits_.Resize(ArrayDims());
  bytesPerPlane_ = 0;
}

void RasterMask::SetInversed(bool inversed) {
  if (inversed_.exchange(inversed) != inversed) changes_.fetch_add(1);
}

bool RasterMask::IsMarked(unsigned x, unsigned y) const {
  for (unsigned plane = 0; plane < Planes(); ++plane) {
    if (IsMarked(x, y, plane)) return true;
  }
  return false;
}

bool RasterMask::IsMarked(unsigned x, unsigned y, unsigned plane) const {
  if (x >= width_ || y >= height_ || plane >= Planes()) return false;
  const std::size_t bit = BitAt(x, y);
  const bool isSet = (planeBits_[plane][bit >> 3] & (0x80 >> (bit & 7))) != 0;
  return isSet != IsInversed();
}

void RasterMask::SetBits(unsigned plane, std::size_t first, std::size_t count,
                         const unsigned char* bytes) {
  unsigned char* const bits = planeBits_[plane];
  const std::size_t shift = first & 7;
  // Lines of two tiles may meet within a byte.
  const auto add = [&](std::size_t at, unsigned value) {
    if (value == 0) return;
    std::atomic_ref(bits[at]).fetch_or(static_cast<unsigned char>(value),
                                       std::memory_order_relaxed);
  };
  for (std::size_t i = 0; i < count; i += 56) {  // with the shift no more than 64
    std::uint64_t word = PackBits(bytes + i, std::min<std::size_t>(count - i, 56)) >> shift;
    for (std::size_t at = (first + i) >> 3; word != 0; word <<= 8, ++at) {
      add(at, static_cast<unsigned>(word >> 56));
    }
  }
}

std::uint64_t RasterMask::BitsAt(unsigned plane, std::size_t first) const {
  const unsigned char* const at = planeBits_[plane] + (first >> 3);
  std::uint64_t word = 0;
  std::memcpy(&word, at, 8);
  if constexpr (std::endian::native == std::endian::little) word = __builtin_bswap64(word);
  const unsigned shift = first & 7;
  return shift == 0 ? word : word << shift | at[8] >> (8 - shift);
}

void RasterMask::GetMarks(unsigned x, unsigned y, std::size_t count, unsigned char* marks) const {
  const std::size_t within =
      x < width_ && y < height_ ? std::min<std::size_t>(count, width_ - x) : 0;
  std::fill(marks + within, marks + count, static_cast<unsigned char>(0));
  const std::uint64_t sense = IsInversed() ? ~std::uint64_t{0} : 0;
  for (std::size_t i = 0; i < within; i += 64) {
    std::uint64_t marked = 0;
    for (unsigned plane = 0; plane < Planes(); ++plane) {
      marked |= BitsAt(plane, BitAt(x, y) + i) ^ sense;
    }
    UnpackBits(marked, std::min<std::size_t>(within - i, 64), marks + i);
  }
}

#define VEXG_MASK_OF(T)                                                                            \
  template VEXG_EXPORT RasterMask::RasterMask(const RasterPtr<T>&, const Array<RasterMaskDef<T>>&, \
                                              const IPC&);
VEXG_FOR_ALL(EIGHT, VEXG_MASK_OF);
#undef VEXG_MASK_OF

}  // namespace lumo
