#pragma once

#include <cstdint>

#include "raster/raster_tasks.h"

// The stages that turn gradients into the levels that a flood goes through.

namespace lumo {

/// Maps numbers to integers in a straight line.
struct VEXG_EXPORT LinearStretch {
  double low = 0;       ///< what becomes outLow
  double high = 0;      ///< what becomes outHigh
  double outLow = -1;   ///< -1: not set, which is 0
  double outHigh = -1;  ///< -1: not set, which is 2147483647

  /// Both ends of the result, where they are not set, or outHigh is not above outLow, 0 and
  /// 2147483647.
  void SetDefaults();
  /// (value - low) / (high - low) * (outHigh - outLow) + outLow without its fraction. What an int
  /// can't hold becomes the nearest one that it can, and what is not a number the lowest.
  /// @param count  of the values.
  void Apply(const double* values, std::size_t count, std::int32_t* levels) const;
};

/// The lowest and the highest level of a flood.
struct VEXG_EXPORT ClipLimits {
  std::int32_t floor = 0;
  std::int32_t ceiling = 0;

  /// The levels that gradients up to `segmentValue`, and those from `high` on, become under a
  /// stretch of low ... high to 0 ... stretchValue; 0 unless high is above low.
  static ClipLimits Of(double low, double high, double segmentValue, double stretchValue);
  /// Limits levels to the ceiling first, and to the floor then.
  void Apply(std::int32_t* levels, std::size_t count) const;
};

/// Cuts a number to an integer as LinearStretch does.
VEXG_EXPORT std::int32_t CutToInt(double value);

/// Makes a tile of levels, in slot 1, of the one in slot 0; they may be one slot. Setup argument:
/// Scalar<LinearStretch>. Exists for double and int.
template <typename T, typename R>
class VEXG_EXPORT RasterLinearStretchTask final : public StatelessTask {
 public:
  explicit RasterLinearStretchTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  LinearStretch stretch_;
  TilePool<R> pool_;
};

/// Limits the levels of the tile in slot 0. Setup argument: Scalar<ClipLimits>. Exists for int.
template <typename T>
class VEXG_EXPORT RasterClipInPlaceTask final : public StatelessTask {
 public:
  explicit RasterClipInPlaceTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  ClipLimits limits_;
};

/// RasterClipInPlaceTask that makes a new tile, in slot 1. Exists for int and int.
template <typename T, typename R>
class VEXG_EXPORT RasterClipTask final : public StatelessTask {
 public:
  explicit RasterClipTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  ClipLimits limits_;
  TilePool<R> pool_;
};

}  // namespace lumo
