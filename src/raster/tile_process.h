#pragma once

#include <memory>
#include <vector>

#include "raster/raster_tasks.h"
#include "tasks/function_stage.h"
#include "tasks/process_builder.h"

namespace lumo {

/// Names a place in the tokens of a process for a tile, which the stages hand on.
template <typename T>
struct TileSlot {
  ArgID id = 0;

  /// The tile; empty where there is none.
  TilePtr<T> In(const ArgList& token) const { return TilePtr<T>(token.Get(id)); }
  /// Hands a tile on to the stages behind. False for an empty one, or when there is no memory.
  bool Put(ArgList& token, const TilePtr<T>& tile) const { return token.Set(id, tile); }
};

/// Names a place in the tokens of a process for a value of any type.
template <typename T>
struct ValueSlot {
  ArgID id = 0;

  /// The value, which the token holds; null where there is none.
  T* In(const ArgList& token) const {
    const ObjectPtr object = token.Get(id);  // nothing but a Held is put there
    return object.IsNull() ? nullptr : &static_cast<Held*>(object.Get())->value;
  }
  /// Hands a value on to the stages behind. False when there is no memory.
  bool Put(ArgList& token, T&& value) const {
    return token.Set(id, ObjectPtr(new Held(std::move(value))));
  }

 private:
  struct Held final : Object {
    explicit Held(T&& held) : value(std::move(held)) {}
    T value;
  };
};

/// Runs stages over tiles that are functions: those who need more than the functions of
/// tile_functions.h derive from it, or put one together. All slots are taken before the first
/// function is placed, which sees all of them, and Close() comes last.
///
///     TileProcess<> process("Edges", ipc);
///     const auto tiles = process.Read(iterator);
///     process.Add("Edges", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag*) {
///       const TilePtr<float> tile = tiles.In(token);
///       return tile && MarkEdges(*tile);
///     });
///     process.Close();
///     const bool well = process.RunProcess(process.kHere);
///
/// @tparam Base  ProcessBuilder<Process>, or a ProcessBuilderCallback.
template <typename Base = ProcessBuilder<Process>>
class TileProcess : public Base {
 public:
  using Base::Base;

  /// A slot, of TileSlot or ValueSlot, that no stage uses yet.
  template <typename Slot>
  Slot TakeSlot() {
    return Slot{this->GetPipeline().TakeTokenArg()};
  }

  /// Places a stage of its own class, which sees `slots` and is made from the objects of `setup`.
  template <typename TaskClass, typename... Setup>
  void AddTask(const Array<ArgID>& slots, const Setup&... setup) {
    Place(std::make_unique<ManagedTask<TaskClass>>(), slots, {ObjectPtr(setup)...});
  }

  /// Places a stage that reads the tiles of an iterator row by row. The first one sets the number
  /// of tokens.
  template <typename T>
  TileSlot<T> Read(const RasterIteratorPtr<T>& iterator) {
    Process& process = this->GetPipeline();
    if (process.GetTaskCount() == 0) {
      process.SetTotalTokens(std::uint64_t{iterator->Columns()} * iterator->Rows());
    }
    const auto slot = TakeSlot<TileSlot<T>>();
    AddTask<RasterReadTask<T>>(ArgIDs({slot.id}), iterator);
    return slot;
  }

  /// Places a stage that is a function of the token's slots.
  void Add(const char* name, StageOrder order, FunctionStage::Function function) {
    Array<ArgID> slots{ArrayDims(this->GetPipeline().TakeTokenArg())};  // all that were taken
    for (unsigned i = 0; i < slots.GetCount(); ++i) slots[i] = i;
    Place(std::make_unique<FunctionStage>(name, order, std::move(function)), slots, {});
  }

  /// Places a stage that writes the tile of a slot where an iterator says.
  template <typename T>
  void Write(const TileSlot<T>& slot, const RasterIteratorPtr<T>& iterator) {
    AddTask<RasterWriteTask<T>>(ArgIDs({slot.id}), iterator);
  }

  /// Makes the process ready to run, unless a stage could not be placed.
  void Close() {
    if (placed_) this->SetBuilt();
  }

 private:
  void Place(std::unique_ptr<TaskFactory> stage, const Array<ArgID>& slots,
             std::initializer_list<ObjectPtr> setup) {
    Process& process = this->GetPipeline();
    Array<ArgID> setupArgs{ArrayDims(static_cast<unsigned>(setup.size()))};
    unsigned at = 0;
    for (const ObjectPtr& object : setup) {
      setupArgs[at] = process.TakeSetupArg();
      this->SetArg(setupArgs[at++], object);
    }
    placed_ = placed_ && process.AddTask(process.GetTaskCount(),
                                         TaskDescriptor(stage.get(), slots, setupArgs));
    stages_.push_back(std::move(stage));
  }

  std::vector<std::unique_ptr<TaskFactory>> stages_;
  bool placed_ = true;
};

}  // namespace lumo
