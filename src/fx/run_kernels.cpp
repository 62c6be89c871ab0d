#include "fx/run_kernels.h"

#include <algorithm>
#include <cstring>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

#define VEXG_INLINE [[gnu::always_inline]] inline

constexpr std::size_t kLanes = 4;
// A square has 32 bits at most; those of 8 bits are summed in 32 bits over so many pixels.
constexpr std::uint32_t kPiece = 1U << 15;

using Signed4 = std::int32_t __attribute__((vector_size(kLanes * sizeof(std::int32_t))));
using Unsigned4 = std::uint32_t __attribute__((vector_size(kLanes * sizeof(std::uint32_t))));
using Wide4 = std::uint64_t __attribute__((vector_size(kLanes * sizeof(std::uint64_t))));
template <typename T>
struct Narrow {
  using Type __attribute__((vector_size(kLanes * sizeof(T)))) = T;
};

/// Adds pixels to the sums of `lanes` bands. Four values are read from each pixel on.
template <typename T>
VEXG_INLINE void AddPiece(const T* value, std::uint32_t count, std::size_t bands, std::size_t lanes,
                          RegionSums<T>* to) {
  using Squares = std::conditional_t<sizeof(T) == 1, Unsigned4, Wide4>;
  Signed4 sum{}, min, max;
  Squares squares{};
  for (std::size_t i = 0; i < kLanes; ++i) {
    min[i] = std::numeric_limits<T>::max();
    max[i] = std::numeric_limits<T>::lowest();
  }
  for (std::uint32_t i = 0; i < count; ++i, value += bands) {
    typename Narrow<T>::Type narrow;
    std::memcpy(&narrow, value, sizeof narrow);
    const Signed4 wide = __builtin_convertvector(narrow, Signed4);
    const Unsigned4 square =
        reinterpret_cast<const Unsigned4&>(wide) * reinterpret_cast<const Unsigned4&>(wide);
    sum += wide;
    squares += __builtin_convertvector(square, Squares);
    min = wide < min ? wide : min;
    max = wide > max ? wide : max;
  }
  for (std::size_t i = 0; i < lanes; ++i) {
    to[i].sum += sum[i];
    to[i].squares += squares[i];
    to[i].min = std::min(to[i].min, static_cast<T>(min[i]));
    to[i].max = std::max(to[i].max, static_cast<T>(max[i]));
  }
}

template <typename T>
VEXG_INLINE void AddAll(std::span<const LabelRun> runs, const T* line, const T* end,
                        std::size_t bands, RegionSums<T>* sums) {
  for (const LabelRun& run : runs) {
    RegionSums<T>* const to = sums + run.region * bands;
    const T* const first = line + run.first * bands;
    for (std::size_t band = 0; band < bands; band += kLanes) {
      const std::size_t lanes = std::min(kLanes, bands - band);
      const T* value = first + band;
      // Behind the last pixels four values may not lie in the memory; of one band, one is enough.
      const auto room = static_cast<std::size_t>(end - value);
      const std::size_t safe = room < kLanes || bands == 1 ? 0 : (room - kLanes) / bands + 1;
      auto left = static_cast<std::uint32_t>(std::min<std::size_t>(run.count, safe));
      const std::uint32_t rest = run.count - left;
      while (left != 0) {
        const std::uint32_t count = std::min(left, kPiece);
        AddPiece(value, count, bands, lanes, to + band);
        value += std::size_t{count} * bands;
        left -= count;
      }
      for (std::uint32_t pixel = 0; pixel < rest; ++pixel, value += bands) {
        for (std::size_t i = 0; i < lanes; ++i) to[band + i].Add(value[i]);
      }
      for (std::size_t i = 0; i < lanes; ++i) to[band + i].AddCount(run.count);
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
