#pragma once

#include <algorithm>
#include <memory>

#include "raster/interleave.h"
#include "raster/pixel_states.h"
#include "raster/tile_strips.h"
#include "stats/plane_kernels.h"

// A part of a tile as planes of its bands, whatever the order of the tile's axes.

namespace lumo {

/// Planes of the same pixels, one for each band: that of band b begins at values + b * stride.
template <typename T>
struct PlaneGroup {
  const T* values;              ///< the plane of band 0
  const unsigned char* states;  ///< in the same order; null: all valid
  std::size_t stride;           ///< from one band's plane to the next one's
  std::size_t count;            ///< pixels, kPlane at most
};

/// Cuts a part of a tile into groups of planes that fit the first caches. Where the tile's pixels
/// are interleaved, they are deinterleaved into memory of its own; else the planes lie in the tile.
///
///     PlaneWalk<float> walk(tile);
///     walk.ForEach(part, [&](const PlaneGroup<float>& group) {
///       for (std::size_t band = 0; band < bands; ++band) {
///         Use(band, group.values + band * group.stride, group.count);
///       }
///     });
///
/// Threads: one at a time; each thread of a loop has its own.
template <typename T>
class PlaneWalk {
 public:
  /// @param tile  outlives the walk; without borders unless its order is BIP.
  explicit PlaneWalk(const Tile<T>& tile)
      : values_(tile.PixelArray().GetData()),
        states_(tile.StateArray().GetData()),
        tile_(tile),
        allValid_(tile.HasNoStates()),
        bands_(tile.Bands()),
        groupPixels_(GroupPixels(tile.Bands())) {}

  /// Calls `visit(group)` for all pixels of `part`, row by row.
  template <typename F>
  void ForEach(const TilePart& part, const F& visit) {
    const std::size_t width = part.columnTo - part.columnFrom;
    const std::size_t rows = part.rowTo - part.rowFrom;
    // Whole rows of pixels without a gap are one run, unless each has its bands in turn.
    const bool joined = width == tile_.FullWidth() && tile_.Order() != Interleave::BIL;
    for (std::size_t row = 0; row < (joined ? std::min<std::size_t>(rows, 1) : rows); ++row) {
      VisitRun(FirstOf(part.rowFrom + row, part.columnFrom), joined ? rows * width : width, visit);
    }
  }

 private:
  static std::size_t GroupPixels(std::size_t bands) {
    constexpr std::size_t kGroupBytes = 16 * 1024;
    constexpr std::size_t kStep = 64;
    const std::size_t fits = kGroupBytes / (bands * sizeof(T)) / kStep * kStep;
    return std::clamp(fits, 2 * kStep, kPlane);
  }

  /// Where the first band of a pixel stands.
  std::size_t FirstOf(std::size_t row, std::size_t column) const {
    const std::size_t width = tile_.Width();
    switch (tile_.Order()) {
      case Interleave::BIL:
        return row * width * bands_ + column;
      case Interleave::BSQ:
        return row * width + column;
      default:
        return tile_.Offset(static_cast<std::int64_t>(column), static_cast<std::int64_t>(row));
    }
  }

  template <typename F>
  void VisitRun(std::size_t first, std::size_t pixels, const F& visit) {
    const bool parted = tile_.Order() == Interleave::BIP && bands_ > 1;
    for (std::size_t done = 0; done < pixels; done += groupPixels_) {
      const std::size_t count = std::min(groupPixels_, pixels - done);
      const Stretch valid = parted ? ValidOf(first + done * bands_, count * bands_, bands_)
                                   : ValidInPlace(first + done, count);
      if (valid.count == 0) continue;
      const std::size_t from = done + valid.first;
      visit(parted ? Parted(first + from * bands_, valid.count)
                   : InPlace(first + from, valid.count));
    }
  }

  /// Pixels of a group.
  struct Stretch {
    std::size_t first;
    std::size_t count;
  };

  /// Leaves the pixels at both ends of a group out that are valid in no band, in steps of whole
  /// vectors: as outside of a region, where often all those between are valid.
  /// @param elements  of the group, `step` for each pixel.
  Stretch ValidOf(std::size_t first, std::size_t elements, std::size_t step) const {
    if (allValid_) return {0, elements / step};
    constexpr std::size_t kStep = 64;  // pixels
    const unsigned char* const states = states_ + first;
    const std::size_t pixels = elements / step;
    if (IsValidState(states[0]) && IsValidState(states[elements - 1])) return {0, pixels};
    const std::size_t from = CountLeadingInvalid(states, elements) / step;
    if (from == pixels) return {0, 0};
    const std::size_t begin = from / kStep * kStep;
    const std::size_t end = pixels - CountTrailingInvalid(states, elements) / step;
    return {begin, std::min(pixels, (end + kStep - 1) / kStep * kStep) - begin};
  }

  Stretch ValidInPlace(std::size_t first, std::size_t count) const {
    const std::size_t stride = InPlaceStride();
    std::size_t begin = count, end = 0;
    for (std::size_t band = 0; band < bands_; ++band) {
      const Stretch valid = ValidOf(first + band * stride, count, 1);
      if (valid.count == 0) continue;
      begin = std::min(begin, valid.first);
      end = std::max(end, valid.first + valid.count);
    }
    return {std::min(begin, end), end - std::min(begin, end)};
  }

  /// From one band's plane to the next one's, of a tile whose planes lie in it.
  std::size_t InPlaceStride() const {
    const std::size_t width = tile_.Width();
    return tile_.Order() == Interleave::BSQ ? width * tile_.Height() : width;
  }

  PlaneGroup<T> InPlace(std::size_t first, std::size_t count) const {
    const std::size_t stride = InPlaceStride();
    PlaneGroup<T> group{values_ + first, nullptr, stride, count};
    for (std::size_t band = 0; band < bands_ && !allValid_; ++band) {
      if (AllValid(states_ + first + band * stride, count)) continue;
      group.states = states_ + first;
      break;
    }
    return group;
  }

  PlaneGroup<T> Parted(std::size_t first, std::size_t count) {
    Provide(partedValues_);
    ConvertInterleave(values_ + first, Interleave::BIP, partedValues_.get(), Interleave::BSQ, count,
                      1, bands_, sizeof(T));
    PlaneGroup<T> group{partedValues_.get(), nullptr, count, count};
    if (!allValid_ && !AllValid(states_ + first, count * bands_)) {
      Provide(partedStates_);
      ConvertInterleave(states_ + first, Interleave::BIP, partedStates_.get(), Interleave::BSQ,
                        count, 1, bands_, 1);
      group.states = partedStates_.get();
    }
    return group;
  }

  /// Makes memory for a group, which holds anything.
  template <typename E>
  void Provide(std::unique_ptr<E[]>& parted) const {
    if (!parted) parted = std::make_unique_for_overwrite<E[]>(groupPixels_ * bands_);
  }

  const T* values_;
  const unsigned char* states_;
  const Tile<T>& tile_;
  bool allValid_;
  std::size_t bands_;
  std::size_t groupPixels_;
  std::unique_ptr<T[]> partedValues_;
  std::unique_ptr<unsigned char[]> partedStates_;
};

/// The valid values of one plane.
template <typename T>
struct ValidPlane {
  const T* values;            ///< with the filler in place of those that aren't valid
  const unsigned char* mask;  ///< 0xFF where a value is valid, else 0; null: all are
  std::size_t count;          ///< how many are valid; 0: nothing else means anything
  T filler;                   ///< one of the valid values
};

/// Finds the valid values of planes, in memory that is used again.
template <typename T>
class ValidPlanes {
 public:
  /// Finds the valid values of a plane: finite ones whose state has no bit of NotValid. The result
  /// means something until the next call.
  /// @param states  null: all valid. @param allFinite  known beforehand.
  ValidPlane<T> Find(const T* values, const unsigned char* states, std::size_t count,
                     bool allFinite = !std::is_floating_point_v<T>) {
    if (states == nullptr && allFinite) return {values, nullptr, count, T()};
    std::size_t valid = MaskValid(states, count, mask_);
    if constexpr (std::is_floating_point_v<T>) {
      if (valid != 0 && !allFinite) valid = MaskFinite(values, count, mask_);
    }
    if (valid == count) return {values, nullptr, count, T()};
    if (valid == 0) return {values, mask_, 0, T()};
    const T filler = values[std::find(mask_, mask_ + count, 0xFF) - mask_];
    Select(values, mask_, count, filler, filled_);
    return {filled_, mask_, valid, filler};
  }

 private:
  unsigned char mask_[kPlane];
  T filled_[kPlane];
};

}  // namespace lumo
