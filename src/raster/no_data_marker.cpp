#include "raster/no_data_marker.h"

#include <algorithm>

#include "foundation/array.h"

namespace lumo {
namespace {

template <typename T>
bool IsSame(T a, T b) {
  if constexpr (std::is_floating_point_v<T>) {
    return (a == b) | ((a != a) & (b != b));
  } else {
    return a == b;
  }
}

template <typename T>
bool IsSame(Complex<T> a, Complex<T> b) {
  return IsSame(a.real, b.real) && (IsSame(a.imag, b.imag) || b.real != b.real);
}

// The arrays don't overlap, which the compiler can't know of bytes.

template <typename T>
void MarkRun(T value, std::uint64_t count, const T* __restrict pixels,
             unsigned char* __restrict state) {
  for (std::uint64_t i = 0; i < count; ++i) {
    state[i] = static_cast<unsigned char>(state[i] | (IsSame(pixels[i], value) ? 1 : 0));
  }
}

/// The same with a value and a bit of its own for each element.
template <typename T>
void MarkEach(const T* __restrict values, const unsigned char* __restrict bits, std::uint64_t count,
              const T* __restrict pixels, unsigned char* __restrict state) {
  for (std::uint64_t i = 0; i < count; ++i) {
    state[i] =
        static_cast<unsigned char>(state[i] | ((IsSame(pixels[i], values[i]) ? 1 : 0) & bits[i]));
  }
}

static_assert(PixelValueState::NoData == 1);

}  // namespace

template <typename T>
NoDataMarker<T>::NoDataMarker(std::vector<std::optional<T>> values, Interleave interleave,
                              unsigned width, unsigned height)
    : values_(std::move(values)),
      runLength_(interleave == Interleave::BIL ? width : std::uint64_t{width} * height) {
  const auto has = [](const std::optional<T>& value) { return value.has_value(); };
  isNeeded_ = std::any_of(values_.begin(), values_.end(), has);
  const std::size_t bands = values_.size();
  if (!isNeeded_ || interleave != Interleave::BIP || bands == 1) return;
  constexpr std::size_t kPattern = 256;  // elements, so that short loops don't count
  patternLength_ = (kPattern / bands + 1) * bands;
  for (std::size_t i = 0; i < patternLength_ + bands; ++i) {
    const std::optional<T>& value = values_[i % bands];
    patternValues_.push_back(value.value_or(T{}));
    patternBits_.push_back(value ? PixelValueState::NoData : 0);
  }
}

template <typename T>
void NoDataMarker<T>::Mark(std::uint64_t first, std::uint64_t count, const T* pixels,
                           unsigned char* state) const {
  if (!isNeeded_) return;
  if (patternLength_ != 0) {
    MarkPattern(first, count, pixels, state);
    return;
  }
  while (count != 0) {
    const std::optional<T>& value = values_[first / runLength_ % values_.size()];
    const std::uint64_t here = std::min(count, runLength_ - first % runLength_);
    if (value) MarkRun(*value, here, pixels, state);
    first += here;
    count -= here;
    pixels += here;
    state += here;
  }
}

template <typename T>
void NoDataMarker<T>::MarkPattern(std::uint64_t first, std::uint64_t count, const T* pixels,
                                  unsigned char* state) const {
  const std::uint64_t phase = first % values_.size();
  const T* const values = patternValues_.data() + phase;
  const unsigned char* const bits = patternBits_.data() + phase;
  for (std::uint64_t done = 0; done < count; done += patternLength_) {
    const std::uint64_t here = std::min(count - done, patternLength_);
    MarkEach(values, bits, here, pixels + done, state + done);
  }
}

VEXG_INSTANCES(TWELVE, VEXG_EXPORT NoDataMarker);

}  // namespace lumo
