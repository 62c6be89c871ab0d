#pragma once

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "raster/raster.h"
#include "stats/turn.h"

namespace lumo {

/// Counts a histogram and waits for the end, after the runs of other commands that go on. The
/// histogram is then among those at hand of the raster.
/// @param request  which values, bands and bins.
/// @param turn     whether the command waits for others.
/// @return no text, or why it could not be counted.
template <typename T>
String RunHistogram(Raster<T>& raster, const HistogramRequest<T>& request, const Turn& turn,
                    const IPC& ipc) {
  const auto faultOr = [](const char* text) {
    const String fault = TakeFault();
    return fault.GetLength() != 0 ? fault : String(text);
  };
  if (ShareScope::Current() != nullptr) TakeFault();
  const std::uint64_t writes = raster.WriteCount();
  AsyncPtr run = raster.CountHistogram(request, ipc);
  // Another run may have begun meanwhile.
  while (!run && raster.HistogramAsync() && turn.AwaitRuns()) {
    run = raster.CountHistogram(request, ipc);
  }
  if (!run && ShareScope::Current() != nullptr) {  // it has ended
    return ipc.abort->IsSet() ? String("the run was aborted") : TakeFault();
  }
  if (!run) return faultOr("the run could not be started");
  run->WaitFinished();
  if (run->IsValid() && run->IsAborted()) return "the run was aborted";
  raster.HistogramAsync();  // takes the run over, and its fault
  if (!run->IsValid()) return faultOr("the pixels could not be counted");
  if (raster.WriteCount() != writes) return "the pixels were written while they were counted";
  return {};
}

}  // namespace lumo
