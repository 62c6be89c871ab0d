#pragma once

#include "foundation/fault.h"
#include "pyramid/level_cascade_body.h"
#include "pyramid/reduced_levels.h"
#include "raster/tile_process.h"

namespace lumo {

template <typename T>
bool ReducedLevels<T>::Make(const PyramidPlan<T>& plan, LevelReduction reduction,
                            const Array<unsigned>& bands, const ObjectPtr& stats, const IPC& ipc) {
  const unsigned samples = plan.source->Samples(), lines = plan.source->Lines();
  const unsigned side = TilingOf(plan.source->Bands(), plan.tileSide).side;
  detail::LevelCascade<T> cascade({samples, lines, side, plan.levelMin, plan.levelMax, 0, 0, lines},
                                  reduction, detail::NoDataValuesOf(*plan.source, bands),
                                  detail::SinksOf(plan.full, bands));
  const TileDimensions blocks =
      WideTiles(plan.source.Get(), sizeof(T), RasterIteratorStream<T>::kBudget, 0);
  TileProcess<> process("ReducedLevels", ipc);
  const auto slot =
      process.Read(RasterIteratorPtr<T>(new RasterIterator<T>(plan.source, blocks, bands)));
  if constexpr (std::is_arithmetic_v<T>) {
    if (stats) {
      process.template AddTask<RasterStatsAccumulateTask<T, RasterStats<T>>>(ArgIDs({slot.id}),
                                                                             stats);
    }
  }
  process.Add("ReducedLevels", StageOrder::kOneByOne,
              [&](ArgList& token, const AbortFlag* /*abort*/) {
                const TilePtr<T> block = slot.In(token);
                return block && block->IsValid() && cascade.Take(*block);
              });
  process.Close();
  return process.RunProcess(process.kHere);
}

}  // namespace lumo
