#pragma once

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstring>
#include <mutex>
#include <thread>
#include <type_traits>
#include <vector>

#include "platform/far_copy.h"
#include "raster/interleave.h"
#include "raster/raster_view.h"

namespace lumo {

/// The value of a ramp's pixel, which shows its place as far as T can hold it.
template <typename T>
T RampValue(std::uint64_t sample, std::uint64_t line, std::uint64_t band) {
  const std::uint64_t value = sample + 1000 * line + 1'000'000 * band;
  if constexpr (std::is_arithmetic_v<T>) {
    return static_cast<T>(value);
  } else {
    using Part = decltype(T().real);
    return {static_cast<Part>(value), static_cast<Part>(band)};
  }
}

/// A source for tests: has a size, and no statistics, pyramid or anything else.
template <typename T>
class TestRaster : public RasterView<T> {
 public:
  TestRaster(unsigned samples, unsigned lines, unsigned bands)
      : samples_(samples), lines_(lines), bands_(bands) {}

  bool IsValid() const override { return Object::IsValid(); }
  unsigned Samples() const override { return samples_; }
  unsigned Lines() const override { return lines_; }
  unsigned Bands() const override { return bands_; }
  RasterDef GetRasterDef() const override {
    RasterDef def;
    def.samples = samples_;
    def.lines = lines_;
    def.bands = bands_;
    def.dataType = kDataTypeOf<T>;
    def.tileHeight = tileHeight;
    return def;
  }
  T NoDataValue(unsigned band) const override { return RampValue<T>(77, 0, band); }

  unsigned tileHeight = 0;  // of the description

 private:
  unsigned samples_;
  unsigned lines_;
  unsigned bands_;
};

/// A ramp that is computed when it is read, so that it may have any size; and that fails, dawdles
/// or raises an abort flag where it is told to.
template <typename T>
class RampRaster final : public TestRaster<T> {
 public:
  using TestRaster<T>::TestRaster;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override {
    const unsigned read = reads++;
    std::this_thread::sleep_for(delay);
    if (read == abortAtRead) abort->Set(true);
    if (read == failAtRead || rect.right >= this->Samples() || rect.bottom >= this->Lines()) {
      return false;
    }
    const auto width = static_cast<unsigned>(rect.Width());
    const auto height = static_cast<unsigned>(rect.Height());
    const ArrayDims dims = BlockDims(interleave, width, height, bands.GetCount());
    if (!pixels.Resize(dims) || !state.Resize(dims)) return false;
    std::vector<T> bip;
    bip.reserve(pixels.GetCount());
    for (unsigned line = rect.top; line <= rect.bottom; ++line)
      for (unsigned sample = rect.left; sample <= rect.right; ++sample)
        for (const unsigned band : bands) bip.push_back(RampValue<T>(sample, line, band));
    std::fill(state.begin(), state.end(), static_cast<unsigned char>(0));
    return ConvertInterleave(bip.data(), Interleave::BIP, pixels.GetData(), interleave, width,
                             height, bands.GetCount(), sizeof(T));
  }

  static constexpr unsigned kNever = 0xFFFFFFFF;
  std::atomic<unsigned> reads{0};
  unsigned failAtRead = kNever;
  unsigned abortAtRead = kNever;
  AbortFlagPtr abort;
  std::chrono::microseconds delay{0};
};

/// Pixels and states in memory, pixel-interleaved, that can be read and written in BIP.
template <typename T>
class MemoryTestRaster final : public TestRaster<T> {
 public:
  MemoryTestRaster(unsigned samples, unsigned lines, unsigned bands)
      : TestRaster<T>(samples, lines, bands),
        pixels(std::size_t{samples} * lines * bands),
        states(pixels.size()) {}

  bool CanWrite() const override { return true; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& block, Array<unsigned char>& state) override {
    const ArrayDims dims = BlockDims(Interleave::BIP, static_cast<unsigned>(rect.Width()),
                                     static_cast<unsigned>(rect.Height()), bands.GetCount());
    if (interleave != Interleave::BIP || !block.Resize(dims) || !state.Resize(dims)) return false;
    Move(rect, bands, [&](std::size_t at, std::size_t inBlock, std::size_t count) {
      std::copy_n(&pixels[at], count, &block[inBlock]);
      std::copy_n(&states[at], count, &state[inBlock]);
    });
    return true;
  }

  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& block, Array<unsigned char>& state) override {
    if (interleave != Interleave::BIP || rect.right >= this->Samples()) return false;
    const bool isFar = pixels.size() * sizeof(T) >= platform::kFarBytes;
    const auto copy = isFar ? &platform::CopyFar : &CopyNear;
    Move(rect, bands, [&](std::size_t at, std::size_t inBlock, std::size_t count) {
      copy(&pixels[at], &block[inBlock], count * sizeof(T));
      copy(&states[at], &state[inBlock], count);
    });
    return true;
  }

  std::size_t At(std::size_t sample, std::size_t line, std::size_t band) const {
    return (line * this->Samples() + sample) * this->Bands() + band;
  }

  std::vector<T> pixels;
  std::vector<unsigned char> states;

 private:
  static void CopyNear(void* to, const void* from, std::size_t bytes) {
    std::memcpy(to, from, bytes);
  }

  /// Calls `move(place here, place in the block, elements)` for runs that lie together.
  template <typename F>
  void Move(const SubRect& rect, const Array<unsigned>& bands, const F& move) {
    bool inOrder = bands.GetCount() == this->Bands();
    for (unsigned i = 0; i < bands.GetCount(); ++i) inOrder = inOrder && bands[i] == i;
    std::size_t inBlock = 0;
    for (std::size_t line = rect.top; line <= rect.bottom; ++line) {
      if (inOrder) {
        const std::size_t count = rect.Width() * bands.GetCount();
        move(At(rect.left, line, 0), inBlock, count);
        inBlock += count;
        continue;
      }
      for (std::size_t sample = rect.left; sample <= rect.right; ++sample)
        for (const unsigned band : bands) move(At(sample, line, band), inBlock++, 1);
    }
  }
};

/// Pixels and states in memory, stored in an order of its own, which can be read in any.
template <typename T>
class OrderedTestRaster final : public TestRaster<T> {
 public:
  OrderedTestRaster(unsigned samples, unsigned lines, unsigned bands, Interleave storage)
      : TestRaster<T>(samples, lines, bands),
        order(storage),
        pixels(std::size_t{samples} * lines * bands),
        states(pixels.size()) {}

  RasterDef GetRasterDef() const override {
    RasterDef def = TestRaster<T>::GetRasterDef();
    def.interleave = order;
    def.tileWidth = tileWidth;
    return def;
  }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& block, Array<unsigned char>& state) override {
    const auto width = static_cast<unsigned>(rect.Width());
    const auto height = static_cast<unsigned>(rect.Height());
    const ArrayDims dims = BlockDims(interleave, width, height, bands.GetCount());
    if (!block.Resize(dims) || !state.Resize(dims)) return false;
    reads++;
    if (interleave == order) {
      Copy(rect, bands, pixels, block.GetData());
      Copy(rect, bands, states, state.GetData());
      return true;
    }
    std::vector<T> stored(dims.count);
    std::vector<unsigned char> storedStates(dims.count);
    Copy(rect, bands, pixels, stored.data());
    Copy(rect, bands, states, storedStates.data());
    return ConvertInterleave(stored.data(), order, block.GetData(), interleave, width, height,
                             bands.GetCount(), sizeof(T)) &&
           ConvertInterleave(storedStates.data(), order, state.GetData(), interleave, width, height,
                             bands.GetCount(), 1);
  }

  std::size_t At(std::size_t sample, std::size_t line, std::size_t band) const {
    const std::size_t samples = this->Samples();
    const std::size_t bands = this->Bands();
    if (order == Interleave::BSQ) return (band * this->Lines() + line) * samples + sample;
    if (order == Interleave::BIL) return (line * bands + band) * samples + sample;
    return (line * samples + sample) * bands + band;
  }

  const Interleave order;
  std::vector<T> pixels;
  std::vector<unsigned char> states;
  unsigned tileWidth = 0;  // of the description
  std::atomic<unsigned> reads{0};

 private:
  /// Copies a block in the order of the storage.
  template <typename E>
  void Copy(const SubRect& rect, const Array<unsigned>& bands, const std::vector<E>& from, E* to) {
    const auto line = [&](std::size_t y, unsigned band) {
      to = std::copy_n(&from[At(rect.left, y, band)], rect.Width(), to);
    };
    if (order == Interleave::BSQ) {
      for (const unsigned band : bands)
        for (std::size_t y = rect.top; y <= rect.bottom; ++y) line(y, band);
      return;
    }
    bool inOrder = bands.GetCount() == this->Bands();
    for (unsigned i = 0; i < bands.GetCount(); ++i) inOrder = inOrder && bands[i] == i;
    for (std::size_t y = rect.top; y <= rect.bottom; ++y) {
      if (order == Interleave::BIL) {
        for (const unsigned band : bands) line(y, band);
      } else if (inOrder) {
        to = std::copy_n(&from[At(rect.left, y, 0)], rect.Width() * bands.GetCount(), to);
      } else {
        for (std::size_t x = rect.left; x <= rect.right; ++x)
          for (const unsigned band : bands) *to++ = from[At(x, y, band)];
      }
    }
  }
};

template <typename T>
Pointer<RampRaster<T>> MakeRamp(unsigned samples, unsigned lines, unsigned bands) {
  return Pointer<RampRaster<T>>(new RampRaster<T>(samples, lines, bands));
}

template <typename T>
Array<T> MakeArray(const std::vector<T>& values) {
  Array<T> array{ArrayDims(static_cast<unsigned>(values.size()))};
  std::copy(values.begin(), values.end(), array.begin());
  return array;
}

}  // namespace lumo
