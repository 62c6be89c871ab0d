#include "fx/run_kernels.h"

#include <algorithm>
#include <cstring>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

#define VEXG_INLINE [[gnu::always_inline]] inline

// A square has 32 bits at most; those of 8 bits are summed in 32 bits over so many pixels.
constexpr std::uint32_t kPiece = 1U << 15;

template <typename T, std::size_t kLanes>
struct Lanes {
  using Type __attribute__((vector_size(kLanes * sizeof(T)))) = T;
};

/// Widens so many values: by one shuffle, where the compiler's conversion takes them one by one.
template <std::size_t kLanes, typename T>
VEXG_INLINE void Widen(const T* values, typename Lanes<std::int32_t, kLanes>::Type& wide) {
#if defined(__clang__)
  typename Lanes<T, kLanes>::Type narrow;
  std::memcpy(&narrow, values, sizeof narrow);
  wide = __builtin_convertvector(narrow, typename Lanes<std::int32_t, kLanes>::Type);
#else
  using Pieces = typename Lanes<T, kLanes * sizeof(std::int32_t) / sizeof(T)>::Type;
  using Halves = typename Lanes<std::uint64_t, kLanes / 2>::Type;
  constexpr int kStep = sizeof(std::int32_t) / sizeof(T);
  constexpr std::size_t kHalf = 4;  // values that become 16 bytes
  Halves halves;
  for (std::size_t half = 0; half < kLanes / kHalf; ++half) {
    std::uint64_t bits = 0;
    std::memcpy(&bits, values + half * kHalf, kHalf * sizeof(T));
    halves[2 * half] = halves[2 * half + 1] = bits;
  }
  typename Lanes<std::make_signed_t<T>, kLanes * kStep>::Type places;
  for (std::size_t i = 0; i < kLanes * kStep; ++i) {
    const std::size_t lane = i / kStep, half = lane / kHalf;
    places[i] = static_cast<std::make_signed_t<T> >(half * kHalf * kStep + lane % kHalf);
  }
  Pieces pieces;
  std::memcpy(&pieces, &halves, sizeof pieces);
  pieces = __builtin_shuffle(pieces, places);
  std::memcpy(&wide, &pieces, sizeof wide);
  constexpr std::int32_t kBits = std::numeric_limits<std::make_unsigned_t<T> >::max();
  constexpr std::int32_t kSign = std::is_signed_v<T> ? kBits / 2 + 1 : 0;
  wide = ((wide & kBits) ^ kSign) - kSign;
#endif
}

/// Adds pixels to the sums of `used` bands. kLanes values are read from each pixel on.
template <std::size_t kLanes, typename T>
VEXG_INLINE void AddPiece(const T* value, std::uint32_t count, std::size_t bands, std::size_t used,
                          RegionSums<T>* to) {
  using Wide = typename Lanes<std::int32_t, kLanes>::Type;
  using Square = typename Lanes<std::uint32_t, kLanes>::Type;
  using SquareSum = std::conditional_t<sizeof(T) == 1, std::uint32_t, std::uint64_t>;
  using Squares = typename Lanes<SquareSum, kLanes>::Type;
  Wide sum{};
  Wide min = sum + std::int32_t{std::numeric_limits<T>::max()};
  Wide max = sum + std::int32_t{std::numeric_limits<T>::lowest()};
  Squares squares{};
  for (std::uint32_t i = 0; i < count; ++i, value += bands) {
    Wide wide;
    Widen<kLanes>(value, wide);
    const Square root = reinterpret_cast<const Square&>(wide);
    sum += wide;
    squares += __builtin_convertvector(root * root, Squares);
    min = wide < min ? wide : min;
    max = wide > max ? wide : max;
  }
  for (std::size_t i = 0; i < used; ++i) {
    to[i].sum += sum[i];
    to[i].squares += squares[i];
    to[i].min = std::min(to[i].min, static_cast<T>(min[i]));
    to[i].max = std::max(to[i].max, static_cast<T>(max[i]));
  }
}

/// Adds a run to the sums of `used` bands, the first of which is at `value`.
template <std::size_t kLanes, typename T>
VEXG_INLINE void AddRun(const T* value, std::uint32_t count, const T* end, std::size_t bands,
                        std::size_t used, RegionSums<T>* to) {
  // Behind the last pixels so many values may not lie in the memory; of one band, one is enough.
  const auto room = static_cast<std::size_t>(end - value);
  const std::size_t safe = room < kLanes || bands == 1 ? 0 : (room - kLanes) / bands + 1;
  auto left = static_cast<std::uint32_t>(std::min<std::size_t>(count, safe));
  const std::uint32_t rest = count - left;
  while (left != 0) {
    const std::uint32_t piece = std::min(left, kPiece);
    AddPiece<kLanes>(value, piece, bands, used, to);
    value += std::size_t{piece} * bands;
    left -= piece;
  }
  for (std::uint32_t pixel = 0; pixel < rest; ++pixel, value += bands) {
    for (std::size_t i = 0; i < used; ++i) to[i].Add(value[i]);
  }
  for (std::size_t i = 0; i < used; ++i) to[i].AddCount(count);
}

template <typename T>
VEXG_INLINE void AddAll(std::span<const LabelRun> runs, const T* line, const T* end,
                        std::size_t bands, RegionSums<T>* sums) {
  constexpr std::size_t kFew = 4, kMany = 8;
  for (const LabelRun& run : runs) {
    RegionSums<T>* const to = sums + run.region * bands;
    const T* const first = line + run.first * bands;
    for (std::size_t band = 0; band < bands;) {
      const std::size_t left = bands - band, used = std::min(left, kMany);
      if (left > kFew) {
        AddRun<kMany>(first + band, run.count, end, bands, used, to + band);
      } else {
        AddRun<kFew>(first + band, run.count, end, bands, used, to + band);
      }
      band += used;
    }
  }
}

}  // namespace

VEXG_VECTOR_CLONES void AddRuns(std::span<const LabelRun> runs, const std::uint8_t* line,
                                const std::uint8_t* end, std::size_t bands,
                                RegionSums<std::uint8_t>* sums) {
  AddAll(runs, line, end, bands, sums);
}
VEXG_VECTOR_CLONES void AddRuns(std::span<const LabelRun> runs, const std::int8_t* line,
                                const std::int8_t* end, std::size_t bands,
                                RegionSums<std::int8_t>* sums) {
  AddAll(runs, line, end, bands, sums);
}
VEXG_VECTOR_CLONES void AddRuns(std::span<const LabelRun> runs, const std::uint16_t* line,
                                const std::uint16_t* end, std::size_t bands,
                                RegionSums<std::uint16_t>* sums) {
  AddAll(runs, line, end, bands, sums);
}
VEXG_VECTOR_CLONES void AddRuns(std::span<const LabelRun> runs, const std::int16_t* line,
                                const std::int16_t* end, std::size_t bands,
                                RegionSums<std::int16_t>* sums) {
  AddAll(runs, line, end, bands, sums);
}

}  // namespace lumo
