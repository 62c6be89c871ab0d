#include "platform/vector_clones.h"
#include "stats/histogram_counter_body.h"

namespace lumo {
namespace {

template <typename T>
[[gnu::always_inline]] inline void FindBinsOf(const HistogramBins<T>& from,
                                              const T* __restrict values, std::size_t count,
                                              std::uint32_t* __restrict out) {
  const HistogramBins<T> bins = from;  // so that no store can change it
  if (bins.form == Form::kExact) {
    for (std::size_t i = 0; i < count; ++i) out[i] = bins.FindExactly(values[i]);
  } else {
    for (std::size_t i = 0; i < count; ++i) out[i] = bins.FindAsTold(values[i]);
  }
}

}  // namespace

VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::uint8_t>& bins, const std::uint8_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::int8_t>& bins, const std::int8_t* values, std::size_t count,
              std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::uint16_t>& bins, const std::uint16_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::int16_t>& bins, const std::int16_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::uint32_t>& bins, const std::uint32_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::int32_t>& bins, const std::int32_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<float>& bins, const float* values, std::size_t count,
              std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<double>& bins, const double* values, std::size_t count,
              std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::uint64_t>& bins, const std::uint64_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}
VEXG_CHOOSING_VECTOR_CLONES
void FindBins(const HistogramBins<std::int64_t>& bins, const std::int64_t* values,
              std::size_t count, std::uint32_t* out) {
  FindBinsOf(bins, values, count, out);
}

VEXG_INSTANCES(TEN, HistogramCounter);

}  // namespace lumo
