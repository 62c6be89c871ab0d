#include "tiff_writer/block_reducer.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>

#include "raster/no_data_number.h"
#include "raster/pixel_mode.h"
#include "raster/pixel_types.h"

namespace lumo::tiff {
namespace {

template <typename T>
bool IsNumber(const T& value) {
  if constexpr (std::is_floating_point_v<T>) return !std::isnan(value);
  return true;
}

__extension__ typedef __int128 WideSum;  // of integers of 64 bits

/// The mean of one to four values; of whole numbers the nearest one, halves upwards.
template <typename T>
T MeanOf(const T* values, unsigned count) {
  if constexpr (std::is_integral_v<T>) {
    using Sum = std::conditional_t<sizeof(T) == 8, WideSum, std::int64_t>;
    Sum sum = 0;
    for (unsigned i = 0; i < count; ++i) sum += values[i];
    const Sum twice = 2 * sum + count, divisor = 2 * Sum{count};
    const Sum down = twice / divisor;  // towards 0
    return static_cast<T>(down - (twice % divisor < 0 ? 1 : 0));
  } else if constexpr (std::is_floating_point_v<T>) {
    double sum = 0;
    for (unsigned i = 0; i < count; ++i) sum += static_cast<double>(values[i]) / count;
    return static_cast<T>(sum);
  } else {
    T mean = values[0];
    double real = 0, imaginary = 0;
    for (unsigned i = 0; i < count; ++i) {
      real += static_cast<double>(values[i].real) / count;
      imaginary += static_cast<double>(values[i].imag) / count;
    }
    mean.real = static_cast<decltype(mean.real)>(real);
    mean.imag = static_cast<decltype(mean.imag)>(imaginary);
    return mean;
  }
}

/// Whether four values have a mean by the short formula.
template <typename T>
constexpr bool kHasShortMean = std::is_floating_point_v<T> ||
                               (std::is_integral_v<T> && sizeof(T) <= 4);

/// Makes the means of pixels that all count, of two lines.
/// @param count  pixels of the level.
/// @return false where some mean is no number; then all have to be made one by one.
template <typename T>
bool ShortMeans(const T* upper, const T* lower, unsigned count, unsigned depth, T* to) {
  bool areNumbers = true;
  for (unsigned x = 0; x < count; ++x, upper += 2 * depth, lower += 2 * depth, to += depth) {
    for (unsigned band = 0; band < depth; ++band) {
      if constexpr (std::is_integral_v<T>) {
        using Sum = std::conditional_t<sizeof(T) == 4, std::int64_t, std::int32_t>;
        const Sum sum = Sum{upper[band]} + upper[depth + band] + lower[band] + lower[depth + band];
        to[band] = static_cast<T>((sum + 2) >> 2);  // rounds down, of negative numbers too
      } else {
        const auto quarter = [](T value) { return static_cast<double>(value) / 4; };
        const double sum = 0 + quarter(upper[band]) + quarter(upper[depth + band]) +
                           quarter(lower[band]) + quarter(lower[depth + band]);
        to[band] = static_cast<T>(sum);
        areNumbers &= sum == sum;
      }
    }
  }
  return areNumbers;
}

}  // namespace

BlockReducer::BlockReducer(const RasterDef& def, unsigned depth, bool hasAlpha)
    : dataType_(def.dataType),
      depth_(depth),
      bands_(def.bands),
      hasAlpha_(hasAlpha),
      method_(def.creation.overviews),
      hasNoData_(def.bands),
      noData_(def.bands) {
  for (unsigned band = 0; band < def.bands; ++band) {
    const auto told = NoDataOf(def, band);
    noData_[band].resize(DataTypeBytes(def.dataType));
    DispatchType(TwelveTypes{}, def.dataType, [&]<typename T>() {
      const std::optional<T> value = told ? told->As<T>() : std::nullopt;
      hasNoData_[band] = value.has_value();
      if (value) std::memcpy(noData_[band].data(), &*value, sizeof(T));
      return true;
    });
  }
}

void BlockReducer::Reduce(const Reduction& work) const {
  DispatchType(TwelveTypes{}, dataType_, [&]<typename T>() {
    ReduceAs<T>(work);
    return true;
  });
}

template <typename T>
void BlockReducer::ReduceAs(const Reduction& work) const {
  const unsigned width = (work.width + 1) / 2, height = (work.height + 1) / 2;
  const bool hasAlpha = hasAlpha_ && depth_ == bands_;
  const unsigned alpha = bands_ - 1;
  const bool isPlain = method_ != OverviewMethod::kNearest && method_ != OverviewMethod::kMode &&
                       work.excluded == nullptr && !hasAlpha &&
                       std::find(hasNoData_.begin(), hasNoData_.end(), true) == hasNoData_.end();
  auto* to = reinterpret_cast<T*>(work.reduced);
  std::array<T, 4> values{};
  std::vector<T> noData(depth_);
  for (unsigned band = 0; band < depth_; ++band) {
    std::memcpy(&noData[band], noData_[work.firstBand + band].data(), sizeof(T));
  }
  for (unsigned y = 0; y < height; ++y) {
    const unsigned rows = std::min(2U, work.height - 2 * y);
    unsigned done = 0;
    if constexpr (kHasShortMean<T>) {
      if (isPlain && rows == 2) {
        const unsigned char* const upper = work.pixels + 2 * std::size_t{y} * work.line;
        done = work.width / 2;
        const bool areMade =
            ShortMeans(reinterpret_cast<const T*>(upper),
                       reinterpret_cast<const T*>(upper + work.line), done, depth_, to);
        if (!areMade) done = 0;
        to += std::size_t{done} * depth_;
      }
    }
    for (unsigned x = done; x < width; ++x, to += depth_) {
      const unsigned columns = std::min(2U, work.width - 2 * x);
      const T* from[4];  // the pixels that are there
      bool counts[4];
      unsigned count = 0;
      bool anyCounts = false;
      for (unsigned row = 0; row < rows; ++row) {
        for (unsigned column = 0; column < columns; ++column, ++count) {
          const std::size_t atLine = 2 * std::size_t{y} + row,
                            atPixel = 2 * std::size_t{x} + column;
          from[count] =
              reinterpret_cast<const T*>(work.pixels + atLine * work.line) + atPixel * depth_;
          counts[count] =
              work.excluded == nullptr || work.excluded[atLine * work.excludedLine + atPixel] == 0;
          anyCounts = anyCounts || counts[count];
        }
      }
      const bool isNearest = method_ == OverviewMethod::kNearest;
      if (work.reducedExcluded != nullptr) {
        work.reducedExcluded[std::size_t{y} * width + x] =
            (isNearest ? counts[0] : anyCounts) ? 0 : 1;
      }
      for (unsigned band = 0; band < depth_; ++band) {
        if (isNearest) {
          to[band] = from[0][band];
          continue;
        }
        unsigned valid = 0;
        const bool isMarked = hasAlpha && band != alpha;
        const bool hasNoData = hasNoData_[work.firstBand + band];
        for (unsigned i = 0; i < count; ++i) {
          const T value = from[i][band];
          const bool isValid = counts[i] && IsNumber(value) &&
                               !(hasNoData && IsSamePixel(value, noData[band])) &&
                               !(isMarked && from[i][alpha] == T{});
          if (isValid) values[valid++] = value;
        }
        if (valid == 0) {
          to[band] = hasNoData ? noData[band] : from[0][band];
        } else {
          to[band] = method_ == OverviewMethod::kMode ? ModeOf(values, valid)
                                                      : MeanOf(values.data(), valid);
          // A mean may come out as the value that says there is none.
          if (hasNoData && IsSamePixel(to[band], noData[band])) to[band] = values[0];
        }
      }
    }
  }
}

void BlockReducer::ExcludeNoData(const unsigned char* pixels, unsigned width, unsigned height,
                                 std::size_t line, std::vector<unsigned char>& excluded) const {
  if (std::find(hasNoData_.begin(), hasNoData_.end(), false) != hasNoData_.end()) return;
  if (depth_ != bands_) return;
  DispatchType(TwelveTypes{}, dataType_, [&]<typename T>() {
    for (unsigned y = 0; y < height; ++y) {
      const T* value = reinterpret_cast<const T*>(pixels + y * line);
      for (unsigned x = 0; x < width; ++x, value += depth_) {
        bool isNone = true;
        for (unsigned band = 0; isNone && band < depth_; ++band) {
          T noData;
          std::memcpy(&noData, noData_[band].data(), sizeof(T));
          isNone = IsSamePixel(value[band], noData);
        }
        if (isNone) excluded[std::size_t{y} * width + x] = 1;
      }
    }
    return true;
  });
}

}  // namespace lumo::tiff
