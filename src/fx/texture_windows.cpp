#include "fx/texture_windows.h"

#include "fx/window_entropy.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

constexpr std::size_t kMostTerms = 1U << 16;  // that are kept in tables
constexpr double kBins = 3;

double TimesLog(double count) {
  return count > 0 ? count * std::log(count) : 0;
}

}  // namespace

template <typename T>
TextureWindows<T>::TextureWindows(unsigned reach)
    : reach_(reach), side_(2 * std::size_t{reach} + 1), lines_(side_) {
  const std::size_t terms = side_ < 256 ? side_ * side_ + 1 : kMostTerms;
  for (std::size_t count = 0; count < terms; ++count) {
    overBins_.push_back(EntropyTerm(static_cast<double>(count), kBins));
    logs_.push_back(TimesLog(static_cast<double>(count)));
  }
}

template <typename T>
void TextureWindows<T>::Load(const Tile<T>& tile, unsigned band, unsigned rowFrom, unsigned rowTo) {
  tile_ = &tile;
  band_ = band;
  row_ = rowFrom;
  line_ = 0;
  width_ = tile.Width();
  columns_ = width_ + 2 * reach_;
  const std::size_t lines = rowTo - rowFrom + 2 * reach_;
  plane_.resize(lines * columns_);
  shift_ = 0;
  bool hasShift = kSlides;
  const std::size_t bands = tile.Bands();
  for (std::size_t y = 0; y < lines; ++y) {
    const std::size_t at =
        tile.Offset(-static_cast<std::int64_t>(reach_),
                    static_cast<std::int64_t>(rowFrom + y) - static_cast<std::int64_t>(reach_)) +
        band;
    const T* const values = tile.PixelArray().GetData() + at;
    const unsigned char* const states = tile.StateArray().GetData() + at;
    Plane* const to = plane_.data() + y * columns_;
    for (std::size_t x = 0; x < columns_; ++x) {
      const T value = values[x * bands];
      bool has = IsValidState(states[x * bands]);
      if constexpr (std::is_floating_point_v<T>) has = has && std::isfinite(value);
      if (has && !hasShift) {
        shift_ = static_cast<double>(value);
        hasShift = true;
      }
      if constexpr (kSlides) {
        to[x] = has ? value : kNoValue<Plane>;
      } else {
        to[x] = has ? static_cast<double>(value) - shift_ : kNoValue<Plane>;
      }
    }
  }
}

template <typename T>
void TextureWindows<T>::SumColumns() {
  const bool isFirst = line_ == 0;
  const ColumnSums sums{columnSum_.data(), columnSquares_.data(), columnCount_.data()};
  if constexpr (kSlides) {
    if (!isFirst) {
      TakeLineOff(LineAt(line_ - 1), columns_, sums);
      AddLine(LineAt(line_ + side_ - 1), columns_, sums);
      return;
    }
  }
  columnSum_.assign(columns_, 0);
  columnSquares_.assign(columns_, 0);
  columnCount_.assign(columns_, 0);
  const ColumnSums cleared{columnSum_.data(), columnSquares_.data(), columnCount_.data()};
  for (std::size_t y = 0; y < side_; ++y) AddLine(LineAt(line_ + y), columns_, cleared);
}

template <typename T>
void TextureWindows<T>::ComputeLine() {
  for (std::size_t y = 0; y < side_; ++y) lines_[y] = LineAt(line_ + y);
  SumColumns();
  sum_ = columnSum_;
  squares_ = columnSquares_;
  count_ = columnCount_;
  scratch_.resize(columns_);
  countScratch_.resize(columns_);
  min_.resize(columns_);
  max_.resize(columns_);
  first_.resize(width_);
  third_.resize(width_);
  SumWindows(sum_.data(), width_, side_, scratch_.data());
  SumWindows(squares_.data(), width_, side_, scratch_.data());
  SumWindows(count_.data(), width_, side_, countScratch_.data());
  ColumnExtremes(lines_.data(), side_, columns_, min_.data(), max_.data());
  MinWindows(min_.data(), width_, side_);
  MaxWindows(max_.data(), width_, side_);
  IncludeMiddle();
  CountBins(lines_.data(), width_, side_, min_.data(), max_.data(), first_.data(), third_.data());
  ComputeFigures();
  ++line_;
  ++row_;
}

/// Lets the middle pixel of each window set its extremes, also where its own band isn't valid.
template <typename T>
void TextureWindows<T>::IncludeMiddle() {
  const T* const values = tile_->PixelArray().GetData() + tile_->Offset(0, row_) + band_;
  raw_.resize(width_);
  for (std::size_t x = 0; x < width_; ++x) raw_[x] = values[x * tile_->Bands()];
  const Plane* const middle = lines_[reach_] + reach_;
  for (std::size_t x = 0; x < width_; ++x) {
    const bool has = kSlides ? middle[x] != kNoValue<Plane> : middle[x] == middle[x];
    if (has || !IsCounted(x)) continue;
    const auto value = kSlides ? static_cast<Plane>(raw_[x])
                               : static_cast<Plane>(static_cast<double>(raw_[x]) - shift_);
    min_[x] = std::min(min_[x], value);
    max_[x] = std::max(max_[x], value);
  }
}

template <typename T>
void TextureWindows<T>::ComputeFigures() {
  for (auto& figure : figures_) figure.assign(width_, 0);
  double* const range = figures_[TextureSums::kRange].data();
  double* const mean = figures_[TextureSums::kMean].data();
  double* const variance = figures_[TextureSums::kVariance].data();
  for (std::size_t x = 0; x < width_; ++x) {
    const auto n = static_cast<double>(count_[x]);
    if (count_[x] == 0) continue;
    range[x] = static_cast<double>(max_[x]) - static_cast<double>(min_[x]);
    mean[x] = sum_[x] / n + shift_;
    // Of integers both products are exact, and so a window of equal values has no variance.
    const double spread = n * squares_[x] - sum_[x] * sum_[x];
    if (count_[x] > 1 && spread > 0) variance[x] = spread / (n * (n - 1));
  }
  double* const entropy = figures_[TextureSums::kEntropy].data();
  double* const overN = figures_[TextureSums::kEntropyOverN].data();
  for (std::size_t x = 0; x < width_; ++x) {
    if (!(range[x] > kEvenRange)) continue;
    const std::int32_t counts[] = {first_[x], count_[x] - first_[x] - third_[x], third_[x]};
    double terms = 0, logs = 0;
    for (const std::int32_t count : counts) {
      const bool isKept = static_cast<std::size_t>(count) < overBins_.size();
      terms -= isKept ? overBins_[static_cast<std::size_t>(count)] : EntropyTerm(count, kBins);
      logs += isKept ? logs_[static_cast<std::size_t>(count)] : TimesLog(count);
    }
    const auto n = static_cast<double>(count_[x]);
    entropy[x] = terms;
    overN[x] = std::max((TimesLog(n) - logs) / n, 0.0);
  }
}

VEXG_INSTANCES(EIGHT, TextureWindows);

}  // namespace lumo
