#pragma once

#include "commands/share_scope.h"
#include "data/packed_levels.h"
#include "pyramid/level_shares.h"
#include "pyramid/pyramid_process.h"
#include "raster/level_reduction.h"

namespace lumo {

/// Makes the levels of a pyramid in shares: MakeShare the packed tiles of some lines of the raster,
/// and Join the pyramid out of those of all. Exists for TwelveTypes.
///
/// Levels up to LevelShares::Top() come out of shares as they are to be stored. Of the last of them
/// a share keeps its lines as well, with the sums and counts of means, out of which Join makes the
/// levels above as one run does. Statistics are those of the blocks of one run, in its order.
///
/// The file of a share holds, for each group of bands that is stored together, pieces that begin
/// with a word of what they are, and behind all of them the statistics of bands that are stored
/// apart.
///
/// Memory: a strip of tiles and a line for each level.
/// Failure: false, with the fault set. True as well after an abort.
template <typename T>
class SharedLevels {
 public:
  /// @param plan    its `full` is needed by Join alone.
  /// @param shares  has begun, and outlives the object.
  /// @param stats   RasterStats of the raster; empty for complex numbers.
  SharedLevels(const PyramidPlan<T>& plan, LevelReduction reduction, ShareScope& shares,
               const ObjectPtr& stats, const IPC& ipc);

  /// @param packing  of the store that will take the tiles.
  bool MakeShare(Packing packing);
  /// @param store  of the levels of `full`.
  bool Join(PackedLevels& store);

 private:
  class Part;
  class NearestLevels;

  bool MakeGroup(const Array<unsigned>& bands, Packing packing);
  bool MakeStats();
  bool JoinGroup(const Array<unsigned>& bands, PackedLevels& store);
  bool JoinStats();
  bool TakeRow(ShareReader& in, PackedLevels& store) const;
  bool TakeStats(ShareReader& in) const;
  TileDimensions Blocks() const;

  const PyramidPlan<T> plan_;
  const LevelReduction reduction_;
  ShareScope& shares_;
  const ObjectPtr stats_;
  const IPC ipc_;
  const unsigned side_;
  const LevelShares cut_;
};

VEXG_EXTERN(TWELVE, SharedLevels);

}  // namespace lumo
