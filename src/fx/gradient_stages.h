#pragma once

#include <algorithm>

#include "fx/gradient_tasks.h"
#include "fx/segment_process.h"
#include "fx/task_setup.h"

// How processes place the stage that makes gradients.

namespace lumo::detail {

/// The border of tiles from which gradients with a border of their own are computed.
inline unsigned GradientBorder(SegmentAlgorithm algorithm, unsigned border) {
  return algorithm == SegmentAlgorithm::kSobel ? std::max(border + 1, 2U) : border;
}

/// Places the stage that makes gradients in slot `to` of the tiles in slot `from`.
template <typename T>
void AddGradient(TileProcess<>& process, SegmentAlgorithm algorithm, ArgID from, ArgID to,
                 unsigned border) {
  const Array<ArgID> slots = ArgIDs({from, to});
  if (algorithm == SegmentAlgorithm::kSobel) {
    process.AddTask<RasterSobelBandMaxTask<T, double>>(slots, MakeSetup(border));
  } else {
    process.AddTask<RasterIntensityTask<T, double>>(slots, MakeSetup(border));
  }
}

}  // namespace lumo::detail
