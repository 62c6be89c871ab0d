#pragma once

#include <algorithm>

#include "foundation/scalar.h"
#include "raster/raster_tasks.h"
#include "tasks/task_errors.h"

namespace lumo {

template <typename T>
TilePtr<T> TilePool<T>::Take() {
  const std::lock_guard lock(mutex_);
  for (TilePtr<T>& tile : tiles_) {
    if (tile.GetCount() == 1) return tile;
  }
  tiles_.push_back(TilePtr<T>(new Tile<T>));
  return tiles_.back();
}

template <typename T>
RasterReadTask<T>::RasterReadTask(ArgList& setup)
    : SequentialTask("RasterReadTask"), iterator_(setup.Get(0)) {
  if (iterator_.IsNull() || !iterator_->IsValid()) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  columns_ = iterator_->Columns();
  tileCount_ = std::uint64_t{columns_} * iterator_->Rows();
  const auto* const first = FindScalarValue<std::uint64_t>(setup.Get(1));
  const auto* const count = FindScalarValue<std::uint64_t>(setup.Get(2));
  if (first == nullptr || count == nullptr) return;
  nextTile_ = std::min(*first, tileCount_);
  tileCount_ = nextTile_ + std::min(*count, tileCount_ - nextTile_);
}

template <typename T>
bool RasterReadTask<T>::Execute(ArgList& args) {
  if (HasError()) return false;
  if (args.GetCount() == 0) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  if (nextTile_ == tileCount_) return false;
  const TilePtr<T> tile = pool_.Take();
  if (!iterator_->Read(static_cast<unsigned>(nextTile_ % columns_),
                       static_cast<unsigned>(nextTile_ / columns_), *tile)) {
    SetErrorState(TaskError());
    return false;
  }
  ++nextTile_;
  return args.Set(0, tile);
}

template <typename T>
RasterWriteTask<T>::RasterWriteTask(ArgList& setup)
    : SequentialTask("RasterWriteTask"), iterator_(setup.Get(0)) {
  if (iterator_.IsNull() || !iterator_->IsValid()) SetErrorState(TaskErrorBadParams());
}

template <typename T>
bool RasterWriteTask<T>::Execute(ArgList& args) {
  if (HasError()) return false;
  const TilePtr<T> tile(args.Get(0));
  if (tile.IsNull() || !tile->IsValid()) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  const auto [column, row] = tile->Index();
  if (column >= iterator_->Columns() || row >= iterator_->Rows()) return false;
  if (iterator_->Write(column, row, *tile)) return true;
  SetErrorState(TaskError());
  return false;
}

}  // namespace lumo
