#pragma once

#include "fx/gradient_stages.h"
#include "fx/level_tasks.h"
#include "fx/segment_process.h"
#include "fx/some_tiles_process.h"
#include "tasks/thread_limit.h"

// Processes over strips of whole lines, and the stages that make levels for a watershed of them.

namespace lumo::detail {

/// Places the stages that make levels, with a border of 1, of the tiles in a slot, in their place.
/// These have a border of GradientBorder(request.algorithm, 1).
template <typename T>
void AddLevels(TileProcess<>& process, const SegmentRequest& request, ArgID slot) {
  const Array<ArgID> inPlace = ArgIDs({slot, slot});
  AddGradient<T>(process, request.algorithm, slot, slot, 1);
  process.AddTask<RasterLinearStretchTask<double, std::int32_t>>(inPlace,
                                                                 MakeSetup(request.stretch));
  process.AddTask<RasterClipInPlaceTask<std::int32_t>>(inPlace, MakeSetup(request.limits));
}

/// Whole lines of a raster, with borders above and below.
inline TileDimensions StripTiles(const BasicRaster& raster, unsigned lines, unsigned border) {
  TileDimensions strips;
  strips.width = raster.Samples();
  strips.height = lines;
  strips.borderTop = strips.borderBottom = border;
  strips.borderClamp = 1;
  return strips;
}

/// The pipeline of a pass, with as many strips in flight as there are threads and one more.
class StripProcess : public SomeTilesProcess {
 public:
  StripProcess(const char* name, const IPC& ipc) : SomeTilesProcess(name, ipc) {
    this->GetPipeline().SetTokenLimit(ThreadLimit::GetCurrent() + 1);
  }
  void SetStrips(unsigned strips) { this->GetPipeline().SetTotalTokens(strips); }
};

}  // namespace lumo::detail
