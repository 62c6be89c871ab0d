#pragma once

#include <vector>

#include "raster/tile_process.h"
#include "tasks/task_errors.h"

namespace lumo {

/// Names a block of the grid of an iterator.
struct TilePlace {
  unsigned column = 0;
  unsigned row = 0;
};

/// The stage that reads some tiles of a raster, in the order of a list, and gives one in slot 0.
/// Setup arguments: the iterator, and an Array<unsigned> of columns and rows.
template <typename T>
class ChosenReadTask final : public SequentialTask {
 public:
  explicit ChosenReadTask(ArgList& setup)
      : SequentialTask("ChosenReadTask"), iterator_(setup.Get(0)), places_(setup.Get(1)) {
    if (iterator_.IsNull() || !iterator_->IsValid() || places_.IsNull()) {
      SetErrorState(TaskErrorBadParams());
    }
  }

  bool Execute(ArgList& args) override {
    if (HasError() || next_ + 1 >= places_->GetCount()) return false;  // at the end too
    const TilePtr<T> tile = pool_.Take();
    if (!iterator_->Read((*places_)[next_], (*places_)[next_ + 1], *tile)) {
      SetErrorState(TaskError());
      return false;
    }
    next_ += 2;
    return args.Set(0, tile);
  }

 private:
  RasterIteratorPtr<T> iterator_;
  Pointer<Array<unsigned>> places_;
  unsigned next_ = 0;
  TilePool<T> pool_;
};

/// A process over blocks of rasters that are chosen beforehand, where a TileProcess reads all.
///
///     ChosenBlocks process("Edges", {{0, 2}, {0, 5}}, ipc);
///     const auto tiles = process.ReadChosen(iterator);
class ChosenBlocks final : public TileProcess<> {
 public:
  /// @param places  one at least.
  ChosenBlocks(const char* name, const std::vector<TilePlace>& places, const IPC& ipc)
      : TileProcess<>(name, ipc),
        places_(new Array<unsigned>(ArrayDims(static_cast<unsigned>(2 * places.size())))) {
    unsigned at = 0;
    for (const TilePlace& place : places) {
      (*places_)[at++] = place.column;
      (*places_)[at++] = place.row;
    }
    GetPipeline().SetTotalTokens(places.size());
  }

  /// Places a stage that reads the blocks, in the order of the list.
  template <typename T>
  TileSlot<T> ReadChosen(const RasterIteratorPtr<T>& iterator) {
    const auto slot = TakeSlot<TileSlot<T>>();
    AddTask<ChosenReadTask<T>>(ArgIDs({slot.id}), iterator, places_);
    return slot;
  }

 private:
  const Pointer<Array<unsigned>> places_;
};

}  // namespace lumo
