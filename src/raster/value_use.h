#pragma once

#include <bitset>
#include <cmath>
#include <limits>
#include <optional>
#include <vector>

#include "raster/pixel_types.h"

namespace lumo {

/// Notes which values pixels have, to find one that none of them has, as a raster needs for its
/// no-data value. Exists for TwelveTypes.
///
/// Of types of 8 and 16 bits all values are noted, of larger integers the 64 least ones, of
/// floating-point types and of real parts NaN and the least number.
///
///     ValueUse<std::uint8_t> use;
///     for (const std::uint8_t value : pixels) use.Note(value);
///     const std::optional<double> noData = use.FindFree();
///
/// Cost: up to 8 KiB for types of 16 bits. Threads: one at a time; each has its own, and Join
///       brings them together.
template <typename T>
class ValueUse {
 public:
  /// Notes that a pixel has the value.
  void Note(T value) {
    if constexpr (std::is_integral_v<T>) {
      const auto index = static_cast<std::make_unsigned_t<T>>(value - kLeast);
      if (kNoted == kAll || index < kNoted) used_[index] = true;
    } else if constexpr (std::is_floating_point_v<T>) {
      hasNaN_ = hasNaN_ || value != value;
      hasLeast_ = hasLeast_ || value == kLeast;
    } else {
      parts_.Note(value.real);
    }
  }

  /// Notes what another one has noted.
  void Join(const ValueUse& other) {
    for (std::size_t i = 0; i < used_.size(); ++i) used_[i] = used_[i] || other.used_[i];
    hasNaN_ = hasNaN_ || other.hasNaN_;
    hasLeast_ = hasLeast_ || other.hasLeast_;
    parts_.Join(other.parts_);
  }

  /// A value, exact as a double, that was not noted: the least one where that is free, of unsigned
  /// types 0 or the greatest, NaN of floating-point types. Nothing when all are in use.
  std::optional<double> FindFree() const {
    if constexpr (std::is_integral_v<T>) {
      if (kNoted == kAll && used_[0] && !used_[kAll - 1]) {
        return static_cast<double>(std::numeric_limits<T>::max());
      }
      for (std::size_t i = 0; i < kNoted; ++i) {
        // The least numbers of 64 bits are no doubles but for the first.
        if (!used_[i] && (sizeof(T) < 8 || std::is_unsigned_v<T> || i == 0)) {
          return static_cast<double>(kLeast) + static_cast<double>(i);
        }
      }
      return std::nullopt;
    } else if constexpr (std::is_floating_point_v<T>) {
      if (!hasNaN_) return NAN;
      return hasLeast_ ? std::nullopt : std::optional<double>(kLeast);
    } else {
      return parts_.FindFree();
    }
  }

 private:
  struct Nothing {
    void Note(float) {}
    void Join(const Nothing&) {}
    std::optional<double> FindFree() const { return std::nullopt; }
  };
  template <typename C>
  struct PartOf {
    using Type = Nothing;
  };
  template <typename P>
  struct PartOf<Complex<P>> {
    using Type = ValueUse<P>;
  };

  static constexpr T LeastOf() {
    if constexpr (std::is_arithmetic_v<T>) return std::numeric_limits<T>::lowest();
    return T{};
  }

  static constexpr T kLeast = LeastOf();
  static constexpr std::size_t kAll = sizeof(T) <= 2 ? std::size_t{1} << 8 * sizeof(T) : 0;
  static constexpr std::size_t kNoted = kAll != 0 ? kAll : 64;

  std::vector<bool> used_ = std::vector<bool>(kNoted);
  bool hasNaN_ = false;
  bool hasLeast_ = false;
  [[no_unique_address]] typename PartOf<T>::Type parts_;
};

}  // namespace lumo
