#pragma once

#include "platform/export.h"

namespace lumo {

/// Has the levels that this thread asks rasters for be placed exactly, as long as it lives: a
/// level's pixels are 2^level times as large as the raster's. Otherwise they are as large as the
/// told form has it, the whole part of the quotient of the sizes. The operations of a raster have
/// no room for this wish, so it goes beside the call:
///
///     const ExactLevels exact(true);
///     const RasterPtr<T> level = raster->PyramidLevel(3);  // with pixels 8 times as large
class VEXG_EXPORT ExactLevels {
 public:
  /// @param wanted  false has no effect.
  explicit ExactLevels(bool wanted);
  ~ExactLevels();
  ExactLevels(const ExactLevels&) = delete;
  ExactLevels& operator=(const ExactLevels&) = delete;

  /// True while one that wants it lives on this thread.
  static bool AreWanted();

 private:
  const bool before_;
};

}  // namespace lumo
