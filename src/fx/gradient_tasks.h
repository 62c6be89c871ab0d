#pragma once

#include "raster/raster_tasks.h"
#include "raster/tile_loops.h"

// The stages that reduce the bands of a tile to one band of gradients, or of brightness. Slot 0 of
// a token holds the tile with all bands, slot 1 receives a tile of one band; they may be one slot.
// Setup argument: Scalar<unsigned>, the border of the tile that is made, on each side at most the
// border that there is.
//
// A pixel is excluded, which its state says, when one of its bands has no valid value.

namespace lumo {

/// Computes the mean of the bands of each pixel of a tile, borders included; excluded pixels keep
/// what stands there.
template <typename T, typename R>
class ParallelBorderedRasterIntensity final : public BorderedTileParallelFor2<R> {
 public:
  /// @param in   borders at least those of `out`.
  /// @param out  one band, with the states of the pixels.
  ParallelBorderedRasterIntensity(const Tile<T>& in, Tile<R>& out);
  void Body(int xBegin, int xEnd, int yBegin, int yEnd) override;

 private:
  const Tile<T>& in_;
  Array<double> weights_;
};

/// Makes a tile of the mean band values of each pixel. Exists for EightTypes and double.
template <typename T, typename R>
class RasterIntensityTask final : public StatelessTask {
 public:
  explicit RasterIntensityTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  unsigned border_ = 0;
  TilePool<R> pool_;
};

/// Makes a tile of the gradient of each pixel, see ComputeSobelRow. A pixel is excluded when one of
/// the nine in its neighbourhood is. Exists for EightTypes and double.
///
/// A pixel at the edge of what the tile in slot 0 holds, where a neighbour is missing, has the
/// gradient and the state of its neighbour further inside. So that this happens at the edges of the
/// raster alone, the tile has a border one pixel wider than the one that is made, and of at least
/// 2. In a tile under 3 pixels wide or high all are excluded.
template <typename T, typename R>
class RasterSobelBandMaxTask final : public StatelessTask {
 public:
  explicit RasterSobelBandMaxTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  unsigned border_ = 0;
  TilePool<R> pool_;
};

#define VEXG_EXTERN_GRADIENTS(T)                                    \
  extern template class VEXG_EXPORT RasterIntensityTask<T, double>; \
  extern template class VEXG_EXPORT RasterSobelBandMaxTask<T, double>;
VEXG_FOR_ALL(EIGHT, VEXG_EXTERN_GRADIENTS);
#undef VEXG_EXTERN_GRADIENTS

}  // namespace lumo
