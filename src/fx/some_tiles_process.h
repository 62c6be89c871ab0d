#pragma once

#include "commands/division.h"
#include "fx/task_setup.h"
#include "raster/tile_process.h"

namespace lumo {

/// Some tiles of a grid, which are counted row by row.
struct TileRange {
  std::uint64_t first = 0;
  std::uint64_t count = 0xFFFFFFFFFFFFFFFF;  ///< or as many as there are

  static TileRange Of(const Share& share, std::uint64_t tiles) {
    return {share.Begin(tiles), share.End(tiles) - share.Begin(tiles)};
  }
};

/// A process over some tiles of a grid.
class SomeTilesProcess : public TileProcess<> {
 public:
  using TileProcess<>::TileProcess;

  /// Places a stage that reads the tiles of a range. The first one sets the number of tokens.
  template <typename T>
  TileSlot<T> ReadSome(const RasterIteratorPtr<T>& tiles, const TileRange& range) {
    const std::uint64_t all = std::uint64_t{tiles->Columns()} * tiles->Rows();
    const std::uint64_t first = std::min(range.first, all);
    const std::uint64_t count = std::min(range.count, all - first);
    if (this->GetPipeline().GetTaskCount() == 0) this->GetPipeline().SetTotalTokens(count);
    const auto slot = this->template TakeSlot<TileSlot<T>>();
    this->template AddTask<RasterReadTask<T>>(ArgIDs({slot.id}), tiles, MakeSetup(first),
                                              MakeSetup(count));
    return slot;
  }
};

}  // namespace lumo
