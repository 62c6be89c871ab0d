#pragma once

#include <algorithm>

#include "fx/task_setup.h"
#include "fx/variance_process.h"
#include "tasks/task_errors.h"

namespace lumo {

template <typename T>
RasterVarianceSubrectTask<T>::RasterVarianceSubrectTask(ArgList& setup)
    : StatelessTask("RasterVarianceSubrectTask") {
  if (!ReadSetup(setup, 0, result_) || result_ == nullptr) SetErrorState(TaskErrorBadParams());
}

template <typename T>
bool RasterVarianceSubrectTask<T>::Execute(ArgList& args) {
  const TilePtr<T> tile(args.Get(0));
  if (tile.IsNull() || !tile->IsValid()) return false;
  const auto [column, row] = tile->Index();
  const std::size_t at = std::size_t{column} * result_->variances.GetExtent(1) + row;
  const auto [x, y] = tile->Origin();
  const unsigned rect[] = {x, x + tile->Width() - 1, y, y + tile->Height() - 1};
  std::copy(std::begin(rect), std::end(rect), result_->subrects.GetData() + at * 4);

  const unsigned bands = tile->Bands();
  const std::size_t values = tile->PixelArray().GetCount();
  for (unsigned band = 0; band < bands; ++band) {
    double mean = 0, sum = 0;
    unsigned count = 0;
    for (std::size_t i = band; i < values; i += bands) {
      if (!IsValidState(std::as_const(*tile).StateArray()[i])) continue;
      const auto value = static_cast<double>(tile->PixelArray()[i]);
      const double difference = value - mean;
      mean += difference / ++count;
      sum += difference * (value - mean);
    }
    if (count < 2) continue;
    result_->variances[at] += sum / (count - 1) / bands;
    result_->pixelCounts[at] = count;
  }
  return true;
}

template <typename T>
RasterVarianceSubrectProcess<T>::RasterVarianceSubrectProcess(const RasterIteratorPtr<T>& iterator,
                                                              TileVariances& result, const IPC& ipc)
    : TileProcess<>("RasterVarianceSubrectProcess", ipc) {
  const TileSlot<T> tile = this->Read(iterator);
  this->template AddTask<RasterVarianceSubrectTask<T>>(ArgIDs({tile.id}), MakeSetup(&result));
  this->Close();
}

}  // namespace lumo
