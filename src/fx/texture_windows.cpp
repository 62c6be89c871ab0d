#include "fx/texture_windows.h"

#include "fx/window_entropy.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

constexpr double kBins = 3;

double TimesLog(double count) {
  return count > 0 ? count * std::log(count) : 0;
}

}  // namespace

template <typename T>
TextureWindows<T>::TextureWindows(unsigned reach, bool findsOverN)
    : reach_(reach), side_(2 * std::size_t{reach} + 1), findsOverN_(findsOverN), lines_(side_) {
  for (std::size_t count = 0; count <= side_ * side_; ++count) {
    terms_.push_back(EntropyTerm(static_cast<double>(count), kBins));
    if (findsOverN) logs_.push_back(TimesLog(static_cast<double>(count)));
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
  const std::size_t bands = tile_->Bands();
  if constexpr (std::is_floating_point_v<T>) {
    raw_.resize(width_);
    for (std::size_t x = 0; x < width_; ++x) raw_[x] = values[x * bands];
  }
  const Plane* const middle = lines_[reach_] + reach_;
  for (std::size_t x = 0; x < width_; ++x) {
    const bool has = kSlides ? middle[x] != kNoValue<Plane> : middle[x] == middle[x];
    if (has || !IsCounted(x)) continue;
    const T raw = values[x * bands];
    const auto value =
        kSlides ? static_cast<Plane>(raw) : static_cast<Plane>(static_cast<double>(raw) - shift_);
    min_[x] = std::min(min_[x], value);
    max_[x] = std::max(max_[x], value);
  }
}

template <typename T>
void TextureWindows<T>::ComputeFigures() {
  for (auto& figure : figures_) figure.resize(width_);
  double* const range = figures_[TextureSums::kRange].data();
  FindFigures(
      count_.data(), sum_.data(), squares_.data(), min_.data(), max_.data(), shift_, width_,
      {range, figures_[TextureSums::kMean].data(), figures_[TextureSums::kVariance].data()});
  const WindowCounts counts{count_.data(), first_.data(), third_.data()};
  FindEntropy(counts, range, kEvenRange, terms_.data(), width_,
              figures_[TextureSums::kEntropy].data());
  if (!findsOverN_) return;
  FindEntropyOverN(counts, range, kEvenRange, logs_.data(), width_,
                   figures_[TextureSums::kEntropyOverN].data());
}

VEXG_INSTANCES(EIGHT, TextureWindows);

}  // namespace lumo
