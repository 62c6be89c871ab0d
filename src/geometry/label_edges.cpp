#include "geometry/label_edges.h"

#include <algorithm>
#include <cstring>

#include "platform/vector_clones.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

constexpr std::size_t kWordBits = 64;

/// Turns 64 bytes of 0 or 1 into the bits of a word.
inline std::uint64_t PackBytes(const unsigned char* bytes) {
  std::uint64_t word = 0;
  for (unsigned part = 0; part < 8; ++part) {
    std::uint64_t eight = 0;
    std::memcpy(&eight, bytes + part * 8, 8);
    // Each product moves the lowest bit of byte i to bit 56 + i; no two meet on the way.
    word |= ((eight * 0x0102040810204080ULL) >> 56) << (part * 8);
  }
  return word;
}

template <typename T>
[[gnu::always_inline]] inline void Mark(const T* a, const T* b, std::size_t count,
                                        std::uint64_t* bits) {
  unsigned char differs[kWordBits];
  std::size_t at = 0;
  for (; at + kWordBits <= count; at += kWordBits) {
    for (std::size_t i = 0; i < kWordBits; ++i) differs[i] = a[at + i] != b[at + i] ? 1 : 0;
    bits[at / kWordBits] = PackBytes(differs);
  }
  if (at == count) return;
  std::memset(differs, 0, sizeof(differs));
  for (std::size_t i = 0; at + i < count; ++i) differs[i] = a[at + i] != b[at + i] ? 1 : 0;
  bits[at / kWordBits] = PackBytes(differs);
}

// The loader chooses between clones of plain functions only.
VEXG_VECTOR_CLONES void Mark8(const std::uint8_t* a, const std::uint8_t* b, std::size_t count,
                              std::uint64_t* bits) {
  Mark(a, b, count, bits);
}
VEXG_VECTOR_CLONES void Mark16(const std::uint16_t* a, const std::uint16_t* b, std::size_t count,
                               std::uint64_t* bits) {
  Mark(a, b, count, bits);
}
VEXG_VECTOR_CLONES void Mark32(const std::uint32_t* a, const std::uint32_t* b, std::size_t count,
                               std::uint64_t* bits) {
  Mark(a, b, count, bits);
}
VEXG_VECTOR_CLONES void MarkFloat(const float* a, const float* b, std::size_t count,
                                  std::uint64_t* bits) {
  Mark(a, b, count, bits);
}
VEXG_VECTOR_CLONES void MarkDouble(const double* a, const double* b, std::size_t count,
                                   std::uint64_t* bits) {
  Mark(a, b, count, bits);
}

}  // namespace

void ColumnBits::SetFirst(std::size_t columns) {
  for (std::size_t word = 0; word < words_.size(); ++word) {
    const std::size_t left = columns > word * kWordBits ? columns - word * kWordBits : 0;
    words_[word] = left >= kWordBits ? ~std::uint64_t{0} : (std::uint64_t{1} << left) - 1;
  }
}

template <typename T>
void MarkDifferences(const T* a, const T* b, std::size_t count, std::uint64_t* bits) {
  if constexpr (std::is_same_v<T, float>) {
    MarkFloat(a, b, count, bits);
  } else if constexpr (std::is_same_v<T, double>) {
    MarkDouble(a, b, count, bits);
  } else if constexpr (sizeof(T) == 1) {
    Mark8(reinterpret_cast<const std::uint8_t*>(a), reinterpret_cast<const std::uint8_t*>(b), count,
          bits);
  } else if constexpr (sizeof(T) == 2) {
    Mark16(reinterpret_cast<const std::uint16_t*>(a), reinterpret_cast<const std::uint16_t*>(b),
           count, bits);
  } else {
    Mark32(reinterpret_cast<const std::uint32_t*>(a), reinterpret_cast<const std::uint32_t*>(b),
           count, bits);
  }
}

template <typename T>
void MarkEdgesInLine(const T* line, std::size_t width, ColumnBits& bits) {
  std::uint64_t* const words = bits.Words();
  std::fill_n(words, bits.WordCount(), 0);
  // Word i of the comparison from pixel 64 i on stands for the edges 64 i + 1 to 64 i + 64.
  if (width > 1) {
    MarkDifferences(line, line + 1, width - 1, words);
    std::uint64_t carry = 0;
    for (std::size_t i = 0; i < bits.WordCount(); ++i) {
      const std::uint64_t word = words[i];
      words[i] = word << 1 | carry;
      carry = word >> (kWordBits - 1);
    }
  }
  bits.Set(0);
  bits.Set(width);
}

#define VEXG_LABEL_EDGES(T)                                                          \
  template void MarkDifferences<T>(const T*, const T*, std::size_t, std::uint64_t*); \
  template void MarkEdgesInLine<T>(const T*, std::size_t, ColumnBits&);
VEXG_FOR_ALL(EIGHT, VEXG_LABEL_EDGES);
#undef VEXG_LABEL_EDGES

}  // namespace lumo
