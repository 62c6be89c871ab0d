#pragma once

#include "raster/tile_process.h"

namespace lumo {

/// Holds the variances of the tiles of a raster; arrays are indexed by tile column, then tile row.
struct VEXG_EXPORT TileVariances {
  Array<double> variances;      ///< mean of the sample variances of the bands
  Array<unsigned> pixelCounts;  ///< pixels that count, of the last band that has more than one
  Array<unsigned> subrects;     ///< third index: first and last sample, first and last line

  /// All 0, for so many tiles. False when there is no memory.
  bool Resize(unsigned columns, unsigned rows);
};

/// Computes the variance of a tile: of each band with the divisor n - 1 (Welford, Note on a method
/// for calculating corrected sums of squares and products, 1962). Slot 0 holds the tile. Setup
/// argument: Scalar<TileVariances*>. Exists for EightTypes.
template <typename T>
class RasterVarianceSubrectTask final : public StatelessTask {
 public:
  explicit RasterVarianceSubrectTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  TileVariances* result_ = nullptr;
};

/// Computes the variances of the tiles of an iterator. Exists for EightTypes.
template <typename T>
class RasterVarianceSubrectProcess final : public TileProcess<> {
 public:
  /// @param result  outlives the process.
  RasterVarianceSubrectProcess(const RasterIteratorPtr<T>& iterator, TileVariances& result,
                               const IPC& ipc = {});
};

VEXG_EXTERN(EIGHT, RasterVarianceSubrectTask);
VEXG_EXTERN(EIGHT, RasterVarianceSubrectProcess);

}  // namespace lumo
