#pragma once

#include <memory>
#include <span>
#include <vector>

#include "fx/region_sums.h"
#include "fx/texture_kernels.h"
#include "raster/tile.h"

namespace lumo {

/// Gives the figures of the square windows round the pixels of lines: range, mean, variance and
/// entropy of the valid values inside, as docs/attributes.md has their formulas. Exists for
/// EightTypes.
///
/// A value that isn't finite is in no window. Sums of integers of up to 16 bits are exact; others
/// are doubles, whose order depends on the place in the raster alone.
///
///     TextureWindows<float> windows(2);  // 5 by 5 pixels
///     windows.Load(tile, band, 0, 16);
///     windows.ComputeLine();
///     const double range = windows.Figure(TextureSums::kRange)[x];
///
/// Cost: a line costs a few operations a pixel, and for the entropy two compares for each pixel of
///       a window, all in vector registers. Threads: one at a time.
template <typename T>
class TextureWindows {
 public:
  /// @param reach       pixels on each side of the middle one.
  /// @param findsOverN  gives the entropy over the number of values too, which else is 0.
  explicit TextureWindows(unsigned reach, bool findsOverN = true);

  /// Takes lines of a band, with those round them. @param tile  with borders of the reach.
  void Load(const Tile<T>& tile, unsigned band, unsigned rowFrom, unsigned rowTo);
  /// Computes the figures of the next line, from `rowFrom` on.
  void ComputeLine();

  /// A figure of TextureSums, for each pixel of the line.
  const double* Figure(unsigned figure) const { return figures_[figure].data(); }
  /// False for a pixel whose own value isn't finite.
  bool IsCounted(std::size_t x) const {
    return !std::is_floating_point_v<T> || std::isfinite(raw_[x]);
  }

 private:
  using Plane = std::conditional_t<std::is_integral_v<T> && sizeof(T) <= 2, std::int32_t, double>;
  static constexpr bool kSlides = std::is_same_v<Plane, std::int32_t>;

  const Plane* LineAt(std::size_t line) const { return plane_.data() + line * columns_; }
  void SumColumns();
  void IncludeMiddle();
  void ComputeFigures();

  std::size_t reach_;
  std::size_t side_;
  bool findsOverN_;
  std::size_t width_ = 0;
  std::size_t columns_ = 0;
  std::size_t line_ = 0;  // the first of the window's lines
  const Tile<T>* tile_ = nullptr;
  unsigned band_ = 0;
  unsigned row_ = 0;
  double shift_ = 0;
  std::vector<Plane> plane_;
  std::vector<const Plane*> lines_;
  std::vector<T> raw_;  // the middle line, of floating-point numbers
  std::vector<double> columnSum_, columnSquares_, sum_, squares_, scratch_;
  std::vector<std::int32_t> columnCount_, count_, countScratch_, first_, third_;
  std::vector<Plane> min_, max_;
  std::vector<double> figures_[TextureSums::kFigures];
  // For each count c of values, as far as windows have them:
  std::vector<double> terms_;  // EntropyTerm of c over the bins
  std::vector<double> logs_;   // c * ln(c)
};

VEXG_EXTERN_HIDDEN(EIGHT, TextureWindows);

}  // namespace lumo
