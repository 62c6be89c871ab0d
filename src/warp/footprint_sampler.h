#pragma once

#include <array>
#include <utility>
#include <vector>

#include "warp/warp_samplers.h"

// The sampler of kernels that widen. Bodies of templates; only reprojection.cpp includes this.

namespace lumo {

/// True for a rule by which pixels are made from a footprint.
inline bool IsOfFootprints(const WarpRule& rule) {
  return rule.kernel != WarpKernel::kTold && rule.kernel != WarpKernel::kNearest;
}

/// Makes each pixel from all pixels of the source under its footprint; see WarpKernel.
///
/// Cost: the lines under a footprint are added up first, each times its weight, in one loop that
///       becomes vector code; pixels in a row at one height share that work. So a pixel of the
///       source is looked at about as often as kernels overlap there, whatever the reduction.
template <typename T>
class FootprintParallel final : public WarpParallel<T> {
 public:
  using WarpParallel<T>::WarpParallel;

 private:
  /// Reads the columns of some pixels of the grid at one height.
  struct Span {
    unsigned begin, end;    // pixels of the chunk
    std::int32_t left = 0;  // of the columns
    std::size_t columns = 0;
  };

  void Sample(const WarpChunk& chunk, std::size_t out) override {
    std::copy_n(chunk.inside, chunk.count, left_);
    if (IsNear()) SampleNear(chunk, out);
    if (columnWeights_.size() < WarpChunk::kPixels) columnWeights_.resize(WarpChunk::kPixels);
    for (unsigned at = 0; at < chunk.count; ++at) {
      if (left_[at] == 0) continue;
      Span span{at, at + 1};
      while (span.end < chunk.count && left_[span.end] != 0 && IsOneLine(chunk, at, span.end)) {
        ++span.end;
      }
      SampleSpan(chunk, span, out);
      at = span.end - 1;
    }
  }

  static bool IsOneLine(const WarpChunk& chunk, unsigned a, unsigned b) {
    return chunk.y[a] == chunk.y[b] && chunk.b[a] == chunk.b[b];
  }

  WarpKernel Kernel() const { return this->rule_.kernel; }

  /// True for kernels of few pixels, which are summed position by position.
  bool IsNear() const {
    const WarpFootprint& size = this->rule_.footprint;
    return IsWeighing(Kernel()) && CountTaps(Kernel(), size.width) <= NearWeights::kMostTaps &&
           CountTaps(Kernel(), size.height) <= NearWeights::kMostTaps;
  }

  /// Makes the pixels whose kernel lies within the source.
  void SampleNear(const WarpChunk& chunk, std::size_t out) {
    const WarpSource<T>& source = this->Source();
    const WarpTarget<T>& target = this->Target();
    const WarpFootprint& size = this->rule_.footprint;
    FindNearWeights(Kernel(), chunk.x, chunk.a, chunk.count, size.width, near_[0]);
    FindNearWeights(Kernel(), chunk.y, chunk.b, chunk.count, size.height, near_[1]);
    std::uint8_t wanted[WarpChunk::kPixels];
    const SubRectProj window = source.window;
    for (unsigned i = 0; i < chunk.count; ++i) {
      const bool isWithin = IsWithin(near_[0], i, window.left, window.right) &&
                            IsWithin(near_[1], i, window.top, window.bottom) && !IsLast(i);
      wanted[i] = isWithin ? left_[i] : 0;
      left_[i] -= wanted[i];
    }
    const bool isPixelwise = source.strides.band == 1;
    for (unsigned run = 0; run < Runs(); ++run) {
      const NearPixels<T> pixels{source.pixels + run * source.strides.band,
                                 source.strides.pixel,
                                 source.strides.line,
                                 isPixelwise ? target.bands : 1,
                                 target.pixels + out + run * target.strides.band,
                                 target.strides.pixel,
                                 target.strides.band};
      WeighNear(pixels, near_[0], near_[1], wanted, chunk.count);
    }
    if (source.state != nullptr) SettleNear(chunk, wanted, out);
  }

  /// True when the last pixel of the block is needed, behind which there is nothing to be read.
  bool IsLast(unsigned i) const {
    const SubRectProj& window = this->Source().window;
    return near_[0].first[i] + near_[0].taps == window.Width() &&
           near_[1].first[i] + near_[1].taps == window.Height();
  }

  /// Counts the pixels from a window's edge; false when some of them lie outside of it.
  static bool IsWithin(NearWeights& weights, unsigned i, std::int32_t low, std::int32_t high) {
    const std::int32_t first = weights.first[i];
    weights.first[i] = first - low;
    return first >= low && first + static_cast<std::int32_t>(weights.taps) - 1 <= high;
  }

  /// Makes anew what isn't valid everywhere.
  void SettleNear(const WarpChunk& chunk, const std::uint8_t* wanted, std::size_t out) {
    for (unsigned i = 0; i < chunk.count; ++i) {
      if (wanted[i] == 0) continue;
      bool hasWeights = false;
      for (unsigned band = 0; band < this->Target().bands; ++band) {
        if (IsValidState(StatesNear(i, band))) continue;
        if (!hasWeights) FindWeights(chunk, i);
        hasWeights = true;
        SampleValid(chunk, i, band,
                    out + i * this->Target().strides.pixel + band * this->Target().strides.band);
      }
    }
  }

  unsigned char StatesNear(unsigned i, unsigned band) const {
    const auto& [x, y] = near_;
    const BlockStrides& strides = this->Source().strides;
    const unsigned char* const first = this->Source().state + band * strides.band +
                                       static_cast<std::size_t>(x.first[i]) * strides.pixel +
                                       static_cast<std::size_t>(y.first[i]) * strides.line;
    unsigned char any = 0;
    for (unsigned line = 0; line < y.taps; ++line) {
      if (y.of[line][i] == 0) continue;
      for (unsigned column = 0; column < x.taps; ++column) {
        if (x.of[column][i] != 0) any |= first[line * strides.line + column * strides.pixel];
      }
    }
    return any;
  }

  /// The weights of a pixel, one direction at a time.
  void FindWeights(const WarpChunk& chunk, unsigned i) {
    const SubRectProj& window = this->Source().window;
    const WarpFootprint& size = this->rule_.footprint;
    if (columnWeights_.size() < WarpChunk::kPixels) columnWeights_.resize(WarpChunk::kPixels);
    FindKernelWeights(Kernel(), chunk.x[i] + chunk.a[i], size.width, window.left, window.right,
                      columnWeights_[i]);
    FindKernelWeights(Kernel(), chunk.y[i] + chunk.b[i], size.height, window.top, window.bottom,
                      lineWeights_);
  }

  void SampleSpan(const WarpChunk& chunk, Span& span, std::size_t out) {
    const SubRectProj& window = this->Source().window;
    const WarpFootprint& size = this->rule_.footprint;
    FindKernelWeights(Kernel(), chunk.y[span.begin] + chunk.b[span.begin], size.height, window.top,
                      window.bottom, lineWeights_);
    std::int32_t left = window.right, end = window.left;
    for (unsigned i = span.begin; i < span.end; ++i) {
      KernelWeights& weights = columnWeights_[i];
      FindKernelWeights(Kernel(), chunk.x[i] + chunk.a[i], size.width, window.left, window.right,
                        weights);
      left = std::min(left, weights.first);
      end = std::max(end, weights.first + static_cast<std::int32_t>(weights.of.size()));
    }
    span.left = left;
    span.columns = static_cast<std::size_t>(end - left);
    const bool isOfValues = !IsWeighing(Kernel());
    if (!isOfValues) AddLines(span);
    if (this->Source().state != nullptr) JoinLines(span);
    for (unsigned i = span.begin; i < span.end; ++i) {
      for (unsigned band = 0; band < this->Target().bands; ++band) {
        const std::size_t at =
            out + i * this->Target().strides.pixel + band * this->Target().strides.band;
        const bool isWhole = this->Source().state == nullptr || IsWholeUnder(span, i, band);
        if (isWhole && !isOfValues) {
          this->Target().pixels[at] = StorePixel<T>(SumOf(span, i, band));
        } else {
          SampleValid(chunk, i, band, at);
        }
      }
    }
  }

  /// Elements between neighbouring columns in the sums, and between bands.
  std::size_t ColumnStep() const { return this->Source().strides.pixel; }
  std::size_t BandStep(const Span& span) const {
    return this->Source().strides.band == 1 ? 1 : span.columns;
  }
  /// Runs of elements of a line that lie next to one another: all bands, or one.
  unsigned Runs() const { return this->Source().strides.band == 1 ? 1 : this->Target().bands; }
  std::size_t RunLength(const Span& span) const {
    const std::size_t bands = this->Source().strides.band == 1 ? this->Target().bands : 1;
    return (span.columns - 1) * ColumnStep() + bands;
  }

  const T* At(std::int32_t x, std::int32_t y, unsigned band) const {
    return this->Source().pixels + IndexOf(x, y, band);
  }
  std::size_t IndexOf(std::int32_t x, std::int32_t y, unsigned band) const {
    const SubRectProj& window = this->Source().window;
    const BlockStrides& strides = this->Source().strides;
    return static_cast<std::size_t>(x - window.left) * strides.pixel +
           static_cast<std::size_t>(y - window.top) * strides.line + band * strides.band;
  }

  /// Adds the lines up, each times its weight.
  void AddLines(const Span& span) {
    const std::size_t length = RunLength(span);
    sums_.assign(length * Runs(), 0.0);
    for (unsigned run = 0; run < Runs(); ++run) {
      std::int32_t line = lineWeights_.first;
      for (const double weight : lineWeights_.of) {
        const T* const at = At(span.left, line++, run);
        if (weight != 0) AddWeighed(at, length, weight, &sums_[run * length]);
      }
    }
  }

  /// Gathers the states of the lines.
  void JoinLines(const Span& span) {
    const std::size_t length = RunLength(span);
    joined_.assign(length * Runs(), 0);
    for (unsigned run = 0; run < Runs(); ++run) {
      unsigned char* const all = &joined_[run * length];
      for (std::size_t k = 0; k < lineWeights_.of.size(); ++k) {
        if (lineWeights_.of[k] == 0) continue;
        const std::int32_t line = lineWeights_.first + static_cast<std::int32_t>(k);
        const unsigned char* const state = this->Source().state + IndexOf(span.left, line, run);
        for (std::size_t i = 0; i < length; ++i) all[i] |= state[i];
      }
    }
  }

  std::size_t FirstOf(const Span& span, unsigned i, unsigned band) const {
    const auto column = static_cast<std::size_t>(columnWeights_[i].first - span.left);
    return column * ColumnStep() + band * BandStep(span);
  }

  double SumOf(const Span& span, unsigned i, unsigned band) const {
    const double* at = &sums_[FirstOf(span, i, band)];
    double sum = 0;
    for (const double weight : columnWeights_[i].of) {
      if (weight != 0) sum += weight * *at;
      at += ColumnStep();
    }
    return sum;
  }

  bool IsWholeUnder(const Span& span, unsigned i, unsigned band) const {
    std::size_t at = FirstOf(span, i, band);
    unsigned char any = 0;
    for (const double weight : columnWeights_[i].of) {
      if (weight != 0) any |= joined_[at];
      at += ColumnStep();
    }
    return IsValidState(any);
  }

  /// Makes a pixel of a band from those pixels that are valid.
  void SampleValid(const WarpChunk& chunk, unsigned i, unsigned band, std::size_t at) {
    const KernelWeights* columns = &columnWeights_[i];
    const KernelWeights* lines = &lineWeights_;
    if (Kernel() == WarpKernel::kCubic || Kernel() == WarpKernel::kLanczos) {
      const SubRectProj& window = this->Source().window;
      const WarpFootprint& size = this->rule_.footprint;
      FindKernelWeights(WarpKernel::kLinear, chunk.x[i] + chunk.a[i], size.width, window.left,
                        window.right, linear_[0]);
      FindKernelWeights(WarpKernel::kLinear, chunk.y[i] + chunk.b[i], size.height, window.top,
                        window.bottom, linear_[1]);
      columns = &linear_[0];
      lines = &linear_[1];
    }
    unsigned char all = PixelValueState::NotValid;
    GatherValid(*columns, *lines, band, all);
    const WarpTarget<T>& target = this->Target();
    if (values_.empty()) {
      target.state[at] = all != 0 ? all : static_cast<unsigned char>(PixelValueState::NoData);
      target.pixels[at] = target.background[band];
    } else {
      target.pixels[at] = Choose();
    }
  }

  /// Lists the valid pixels with their weights.
  /// @param all  [in,out] the bits of not valid pixels that all of them have.
  void GatherValid(const KernelWeights& columns, const KernelWeights& lines, unsigned band,
                   unsigned char& all) {
    constexpr double kNoWeight = 1e-5;
    values_.clear();
    double sum = 0;
    std::int32_t y = lines.first;
    for (const double lineWeight : lines.of) {
      std::size_t from = IndexOf(columns.first, y++, band);
      for (const double columnWeight : columns.of) {
        const T value = this->Source().pixels[from];
        const unsigned char state = this->Source().state == nullptr
                                        ? 0
                                        : this->Source().state[from] &
                                              static_cast<unsigned char>(PixelValueState::NotValid);
        from += ColumnStep();
        all = state == 0 ? 0 : all & state;
        const double weight = lineWeight * columnWeight;
        if (state != 0 || weight <= 0) continue;
        values_.push_back({value, weight});
        sum += weight;
      }
    }
    if (sum < kNoWeight && IsWeighing(Kernel())) values_.clear();
  }

  /// The kernel's value of the pixels listed; numbers that compare with none count last.
  T Choose() {
    if (IsWeighing(Kernel())) {
      double sum = 0, weight = 0;
      for (const auto& [value, of] : values_) {
        sum += of * static_cast<double>(value);
        weight += of;
      }
      return StorePixel<T>(sum / weight);
    }
    const auto isNumber = [](const auto& entry) { return entry.first == entry.first; };
    const auto end = std::partition(values_.begin(), values_.end(), isNumber);
    if (end == values_.begin()) return values_.front().first;
    values_.erase(end, values_.end());
    const auto less = [](const auto& a, const auto& b) { return a.first < b.first; };
    switch (Kernel()) {
      case WarpKernel::kMin:
        return std::min_element(values_.begin(), values_.end(), less)->first;
      case WarpKernel::kMax:
        return std::max_element(values_.begin(), values_.end(), less)->first;
      case WarpKernel::kMedian: {
        const auto middle = values_.begin() + static_cast<std::ptrdiff_t>((values_.size() - 1) / 2);
        std::nth_element(values_.begin(), middle, values_.end(), less);
        return middle->first;
      }
      default:
        std::stable_sort(values_.begin(), values_.end(), less);
        return MostOf();
    }
  }

  /// The value with the largest weight in a sorted list; of several the least.
  T MostOf() const {
    constexpr double kMore = 1e-9;
    T best = values_.front().first, current = best;
    double most = 0, weight = 0;
    for (const auto& [value, of] : values_) {
      if (value != current) weight = 0;
      current = value;
      weight += of;
      if (weight > most + kMore) {
        most = weight;
        best = value;
      }
    }
    return best;
  }

  std::uint8_t left_[WarpChunk::kPixels];  // 1 for a pixel that has to be made yet
  std::array<NearWeights, 2> near_;        // of columns, and of lines
  KernelWeights lineWeights_;
  std::vector<KernelWeights> columnWeights_;
  std::array<KernelWeights, 2> linear_;
  std::vector<double> sums_;           // of the columns under a span
  std::vector<unsigned char> joined_;  // states likewise
  std::vector<std::pair<T, double>> values_;
};

}  // namespace lumo
