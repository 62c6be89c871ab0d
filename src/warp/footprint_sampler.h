#pragma once

#include <array>
#include <utility>
#include <vector>

#include "warp/warp_samplers.h"

// The sampler of kernels that widen. Bodies of templates; only reprojection.cpp includes this.

namespace lumo {

/// True for a rule that wants all pixels under a footprint; the others read as many whatever it is.
inline bool IsOfFootprints(const WarpRule& rule) {
  switch (rule.kernel) {
    case WarpKernel::kTold:
    case WarpKernel::kNearest:
      return false;
    case WarpKernel::kLinear:
    case WarpKernel::kCubic:
      return rule.footprint.IsWide();
    default:
      return true;
  }
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
    if (columnWeights_.size() < WarpChunk::kPixels) columnWeights_.resize(WarpChunk::kPixels);
    for (unsigned at = 0; at < chunk.count;) {
      Span span{at, at + 1};
      while (span.end < chunk.count && chunk.inside[span.end] != 0 &&
             IsOneLine(chunk, at, span.end)) {
        ++span.end;
      }
      at = span.end;
      if (chunk.inside[span.begin] != 0) SampleSpan(chunk, span, out);
    }
  }

  static bool IsOneLine(const WarpChunk& chunk, unsigned a, unsigned b) {
    return chunk.y[a] == chunk.y[b] && chunk.b[a] == chunk.b[b];
  }

  WarpKernel Kernel() const { return this->rule_.kernel; }

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
  std::size_t RunLength(const Span& span) const { return span.columns * ColumnStep(); }

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
        AddWeighed(At(span.left, line++, run), length, weight, &sums_[run * length]);
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
      sum += weight * *at;
      at += ColumnStep();
    }
    return sum;
  }

  bool IsWholeUnder(const Span& span, unsigned i, unsigned band) const {
    std::size_t at = FirstOf(span, i, band);
    unsigned char any = 0;
    for (std::size_t k = 0; k < columnWeights_[i].of.size(); ++k, at += ColumnStep()) {
      any |= joined_[at];
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

  KernelWeights lineWeights_;
  std::vector<KernelWeights> columnWeights_;
  std::array<KernelWeights, 2> linear_;
  std::vector<double> sums_;           // of the columns under a span
  std::vector<unsigned char> joined_;  // states likewise
  std::vector<std::pair<T, double>> values_;
};

}  // namespace lumo
