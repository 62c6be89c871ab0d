#pragma once

#include <mutex>
#include <vector>

#include "raster/raster_iterator.h"
#include "tasks/task.h"

namespace lumo {

/// Tiles that are used again: a tile is free when nobody but the pool holds it any more. It keeps
/// as many as were in use at once, which in a process are the tokens in flight. Threads: tiles may
/// be taken, and let go, on any.
template <typename T>
class TilePool {
 public:
  /// A tile that nobody else holds; its size and contents are those of its last use.
  TilePtr<T> Take();

 private:
  std::mutex mutex_;
  std::vector<TilePtr<T>> tiles_;  // under mutex_
};

/// The first stage of a process over a raster: reads the tiles row by row, left to right, and gives
/// one in slot 0. Setup arguments: the iterator; of some tiles alone the first, and how many, as
/// Scalar<std::uint64_t>. Exists for TwelveTypes. A block that can't be read fails with TaskError.
template <typename T>
class RasterReadTask final : public SequentialTask {
 public:
  explicit RasterReadTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  RasterIteratorPtr<T> iterator_;
  std::uint64_t tileCount_ = 0;
  std::uint64_t nextTile_ = 0;
  unsigned columns_ = 0;
  TilePool<T> pool_;
};

/// The last stage of a process that makes a raster: writes the tile in slot 0 at its index. Setup
/// arguments: the iterator. Exists for TwelveTypes.
template <typename T>
class RasterWriteTask final : public SequentialTask {
 public:
  explicit RasterWriteTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  RasterIteratorPtr<T> iterator_;
};

VEXG_EXTERN(TWELVE, TilePool);
VEXG_EXTERN(TWELVE, RasterReadTask);
VEXG_EXTERN(TWELVE, RasterWriteTask);

}  // namespace lumo
