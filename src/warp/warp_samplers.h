#pragma once

#include <algorithm>
#include <cstring>

#include "raster/block_strides.h"
#include "tasks/parallel_ranges.h"
#include "warp/reprojection.h"
#include "warp/warp_kernels.h"
#include "warp/warp_positions.h"

// The samplers of a reprojection: parallel loops over the lines of a rectangle. Bodies of
// templates; only reprojection.cpp includes this.

namespace lumo {

/// The pixels of the source that a rectangle needs.
template <typename T>
struct WarpSource {
  const T* pixels = nullptr;             ///< of the window's first pixel
  const unsigned char* state = nullptr;  ///< null when all pixels are valid
  SubRectProj window;                    ///< the pixels that were read, in pixels of the source
  BlockStrides strides;                  ///< of the pixels and the states
};

/// The block that takes a rectangle's pixels.
template <typename T>
struct WarpTarget {
  T* pixels = nullptr;             ///< of the rectangle's first pixel
  unsigned char* state = nullptr;  ///< all 0 before
  BlockStrides strides;            ///< of the pixels and the states
  unsigned bands = 0;              ///< of the block
  const T* background = nullptr;   ///< by band
};

/// Says how samplers make pixels.
struct WarpRule {
  WarpSampling sampling = WarpSampling::kCorner;
  WarpKernel kernel = WarpKernel::kTold;
  WarpFootprint footprint{};  ///< of all pixels of the rectangle
  /// The parameter of cubic convolution from centres.
  double CubicParameter() const { return kernel == WarpKernel::kCubic ? -0.5 : -1.0; }
};

/// Walks the lines of a rectangle in chunks of positions: the loop of all samplers, each of which
/// gives the pixels of a chunk. Pixels whose position lies outside the limits get the background
/// value and the state NoData.
template <typename T>
class WarpParallel : public ArrayParallelFor {
 public:
  /// All but the limits outlive the loop.
  /// @param lines  of the rectangle.
  WarpParallel(const WarpPositions& positions, unsigned lines, const WarpLimits& limits,
               const WarpSource<T>& source, const WarpTarget<T>& target, const WarpRule& rule)
      : ArrayParallelFor(lines),
        rule_(rule),
        positions_(positions),
        limits_(limits),
        source_(source),
        target_(target) {}

  void Body(unsigned begin, unsigned end) override {
    WarpPositions::Reader reader(positions_, end);
    WarpChunk chunk;
    double x[WarpChunk::kPixels] = {}, y[WarpChunk::kPixels] = {};
    for (unsigned line = begin; line < end; ++line) {
      for (unsigned at = 0; at < positions_.Width(); at += WarpChunk::kPixels) {
        chunk.count = std::min(WarpChunk::kPixels, positions_.Width() - at);
        reader.Read(line, at, chunk.count, x, y);
        TakeApart(x, y, limits_, chunk);
        const std::size_t out = line * target_.strides.line + at * target_.strides.pixel;
        Sample(chunk, out);
        if (!chunk.allInside) FillOutside(chunk, out);
      }
    }
  }

 protected:
  /// Gives the pixels of a chunk; those outside may get any value.
  /// @param out  element of the chunk's first pixel in the target.
  virtual void Sample(const WarpChunk& chunk, std::size_t out) = 0;

  /// The pixels that are read.
  const WarpSource<T>& Source() const { return source_; }
  /// The block that is filled.
  const WarpTarget<T>& Target() const { return target_; }

  /// Counts from the window's corner; outside it the nearest in it. The window comes as a copy,
  /// which no store can change, so that loops over these become vector code.
  static std::uint32_t Column(const SubRectProj window, std::int32_t x) {
    return static_cast<std::uint32_t>(std::clamp(x, window.left, window.right) - window.left);
  }
  static std::uint32_t Row(const SubRectProj window, std::int32_t y) {
    return static_cast<std::uint32_t>(std::clamp(y, window.top, window.bottom) - window.top);
  }

  const WarpRule rule_;

 private:
  void FillOutside(const WarpChunk& chunk, std::size_t out) {
    for (unsigned band = 0; band < target_.bands; ++band) {
      std::size_t at = out + band * target_.strides.band;
      for (unsigned i = 0; i < chunk.count; ++i, at += target_.strides.pixel) {
        if (chunk.inside[i] != 0) continue;
        target_.pixels[at] = target_.background[band];
        target_.state[at] = PixelValueState::NoData;
      }
    }
  }

  const WarpPositions& positions_;
  const WarpLimits limits_;
  const WarpSource<T>& source_;
  const WarpTarget<T>& target_;
};

/// Takes the pixel that each position falls into, with its state.
template <typename T>
class NearestNeighborParallel final : public WarpParallel<T> {
 public:
  using WarpParallel<T>::WarpParallel;

 private:
  void Sample(const WarpChunk& chunk, std::size_t out) override {
    const WarpSource<T>& source = this->Source();
    const WarpTarget<T>& target = this->Target();
    std::uint32_t from[WarpChunk::kPixels];
    const SubRectProj window = source.window;
    const auto pixel = static_cast<std::uint32_t>(source.strides.pixel);
    const auto line = static_cast<std::uint32_t>(source.strides.line);
    for (unsigned i = 0; i < chunk.count; ++i) {
      from[i] = this->Column(window, chunk.x[i]) * pixel + this->Row(window, chunk.y[i]) * line;
    }
    Pick(chunk.count, from, source.pixels, source.strides, target.pixels + out);
    if (source.state == nullptr) return;
    Pick(chunk.count, from, source.state, source.strides, target.state + out);
    if (this->rule_.sampling == WarpSampling::kCentred) HideNotValid(chunk, out);
  }

  /// Gives pixels that aren't valid the background value.
  void HideNotValid(const WarpChunk& chunk, std::size_t out) {
    const WarpTarget<T>& target = this->Target();
    for (unsigned band = 0; band < target.bands; ++band) {
      std::size_t at = out + band * target.strides.band;
      for (unsigned i = 0; i < chunk.count; ++i, at += target.strides.pixel) {
        const bool isValid = IsValidState(target.state[at]);
        if (!isValid) target.pixels[at] = target.background[band];
      }
    }
  }

  /// Copies all bands of pixels.
  template <typename E>
  void Pick(unsigned count, const std::uint32_t* from, const E* in, const BlockStrides& strides,
            E* out) {
    const WarpTarget<T>& target = this->Target();
    if (strides.band == 1 && target.strides.band == 1) {
      switch (target.bands) {
        case 1:
          return PickPixels<1>(count, from, in, out);
        case 3:
          return PickPixels<3>(count, from, in, out);
        case 4:
          return PickPixels<4>(count, from, in, out);
        case 6:
          return PickPixels<6>(count, from, in, out);
        default:
          break;
      }
    }
    for (unsigned band = 0; band < target.bands; ++band) {
      const E* const plane = in + band * strides.band;
      E* at = out + band * target.strides.band;
      for (unsigned i = 0; i < count; ++i, at += target.strides.pixel) *at = plane[from[i]];
    }
  }

  template <std::size_t kBands, typename E>
  static void PickPixels(unsigned count, const std::uint32_t* from, const E* in, E* out) {
    for (unsigned i = 0; i < count; ++i, out += kBands) {
      std::memcpy(out, in + from[i], kBands * sizeof(E));
    }
  }
};

/// Interpolates between kSide by kSide neighbours. With kCorner a pixel has the state of the one
/// that it falls into; with kCentred neighbours that aren't valid are left out, and the pixel is
/// valid when one of the nearest four is.
///
/// Cost: the neighbours of a chunk are gathered band by band, and weighed in one loop that becomes
///       vector code. Where the source has states, each pixel is looked at once more.
/// @tparam kSide  2 or 4.
template <typename T, unsigned kSide>
class NeighbourhoodParallel : public WarpParallel<T> {
 public:
  using WarpParallel<T>::WarpParallel;

 private:
  static constexpr unsigned kTaps = kSide * kSide;
  static constexpr std::int32_t kFirst = kSide == 4 ? -1 : 0;  // tap beside the position
  static constexpr unsigned kMiddle = kSide == 4 ? 5 : 0;      // the tap at the position
  using Offsets = std::uint32_t[kTaps][WarpChunk::kPixels];

  void Sample(const WarpChunk& chunk, std::size_t out) override {
    const WarpSource<T>& source = this->Source();
    const WarpTarget<T>& target = this->Target();
    Offsets from;
    FindTaps(chunk, from);
    WarpLanes<T, kTaps> lanes;
    const bool isCentred = this->rule_.sampling == WarpSampling::kCentred;
    CubicWeights x, y;
    if (kSide == 4 && isCentred) {
      FindCubicWeights(chunk.a, chunk.count, this->rule_.CubicParameter(), x);
      FindCubicWeights(chunk.b, chunk.count, this->rule_.CubicParameter(), y);
    }
    for (unsigned band = 0; band < target.bands; ++band) {
      const T* const in = source.pixels + band * source.strides.band;
      for (unsigned tap = 0; tap < kTaps; ++tap) {
        Gather(in, from[tap], chunk.count, lanes.taps[tap]);
      }
      if constexpr (kSide == 2) {
        InterpolateLinear(lanes, chunk.a, chunk.b, chunk.count,
                          isCentred ? WarpRounding::kNearest : WarpRounding::kTowardZero);
      } else if (isCentred) {
        WeighCubic(lanes, x, y, chunk.count);
      } else {
        InterpolateCubic(lanes, chunk.a, chunk.b, chunk.count);
      }
      const std::size_t first = out + band * target.strides.band;
      T* at = target.pixels + first;
      for (unsigned i = 0; i < chunk.count; ++i, at += target.strides.pixel) *at = lanes.out[i];
      if (source.state != nullptr) Settle(chunk, from, lanes, band, first);
    }
  }

  /// Copies elements, four in a step, as the loop is bound by its own overhead.
  static void Gather(const T* in, const std::uint32_t* from, unsigned count, T* out) {
    unsigned i = 0;
    for (; i + 4 <= count; i += 4) {
      const T first = in[from[i]], second = in[from[i + 1]];
      const T third = in[from[i + 2]], fourth = in[from[i + 3]];
      out[i] = first;
      out[i + 1] = second;
      out[i + 2] = third;
      out[i + 3] = fourth;
    }
    for (; i < count; ++i) out[i] = in[from[i]];
  }

  /// Elements of the neighbours of each position; outside the window the nearest in it.
  void FindTaps(const WarpChunk& chunk, Offsets& from) {
    const auto pixel = static_cast<std::uint32_t>(this->Source().strides.pixel);
    const auto line = static_cast<std::uint32_t>(this->Source().strides.line);
    const SubRectProj window = this->Source().window;
    std::uint32_t columns[kSide][WarpChunk::kPixels], rows[kSide][WarpChunk::kPixels];
    for (unsigned k = 0; k < kSide; ++k) {
      const std::int32_t shift = kFirst + static_cast<std::int32_t>(k);
      for (unsigned i = 0; i < chunk.count; ++i) {
        columns[k][i] = this->Column(window, chunk.x[i] + shift) * pixel;
        rows[k][i] = this->Row(window, chunk.y[i] + shift) * line;
      }
    }
    for (unsigned tap = 0; tap < kTaps; ++tap) {
      const std::uint32_t* const row = rows[tap / kSide];
      const std::uint32_t* const column = columns[tap % kSide];
      for (unsigned i = 0; i < chunk.count; ++i) from[tap][i] = row[i] + column[i];
    }
  }

  /// Gives the states of a band's pixels, and takes neighbours that are not valid out of the
  /// values.
  void Settle(const WarpChunk& chunk, const Offsets& from, const WarpLanes<T, kTaps>& lanes,
              unsigned band, std::size_t first) {
    const WarpSource<T>& source = this->Source();
    const WarpTarget<T>& target = this->Target();
    const unsigned char* const state = source.state + band * source.strides.band;
    for (unsigned i = 0; i < chunk.count; ++i) {
      const std::size_t at = first + i * target.strides.pixel;
      if (this->rule_.sampling == WarpSampling::kCorner) {
        target.state[at] = state[from[kMiddle][i]];
        continue;
      }
      unsigned char any = 0;
      for (unsigned tap = 0; tap < kTaps; ++tap) any |= state[from[tap][i]];
      if (IsValidState(any)) continue;
      target.state[at] = WeighValid(chunk, from, lanes, state, i, target.pixels[at]);
      if (target.state[at] != 0) target.pixels[at] = target.background[band];
    }
  }

  /// Interpolates linearly between those of the four pixels around a position that are valid.
  /// @return the state of the result: 0, or that of the pixels when none is valid.
  static unsigned char WeighValid(const WarpChunk& chunk, const Offsets& from,
                                  const WarpLanes<T, kTaps>& lanes, const unsigned char* state,
                                  unsigned i, T& value) {
    constexpr unsigned kNext = kSide == 4 ? 4 : 2;
    const unsigned taps[4] = {kMiddle, kMiddle + 1, kMiddle + kNext, kMiddle + kNext + 1};
    const double a = chunk.a[i], b = chunk.b[i];
    const double weights[4] = {(1 - a) * (1 - b), a * (1 - b), (1 - a) * b, a * b};
    double sum = 0, weight = 0;
    unsigned char all = PixelValueState::NotValid;
    for (unsigned k = 0; k < 4; ++k) {
      const unsigned char of = state[from[taps[k]][i]] & PixelValueState::NotValid;
      all = of == 0 ? 0 : all & of;
      if (of != 0) continue;
      sum += weights[k] * static_cast<double>(lanes.taps[taps[k]][i]);
      weight += weights[k];
    }
    constexpr double kNoWeight = 1e-5;
    if (weight < kNoWeight) {
      return all != 0 ? all : static_cast<unsigned char>(PixelValueState::NoData);
    }
    const double mean = sum / weight;
    value = static_cast<T>(std::is_floating_point_v<T> ? mean : std::floor(mean + 0.5));
    return PixelValueState::Valid;
  }
};

/// Interpolates bilinearly between the 2 by 2 pixels around a position.
template <typename T>
class LinearInterpolateParallel final : public NeighbourhoodParallel<T, 2> {
 public:
  using NeighbourhoodParallel<T, 2>::NeighbourhoodParallel;
};

/// Interpolates by cubic convolution of the 4 by 4 pixels around a position; warp_kernels.h has the
/// formula.
template <typename T>
class CubicInterpolateParallel final : public NeighbourhoodParallel<T, 4> {
 public:
  using NeighbourhoodParallel<T, 4>::NeighbourhoodParallel;
};

}  // namespace lumo
