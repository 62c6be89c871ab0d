#pragma once

#include <functional>

#include "tasks/task.h"

namespace lumo {

/// Names the ways in which tokens go through a stage that is a function.
enum class StageOrder {
  kOneByOne,       ///< one at a time, in order: the function may keep something between tokens
  kSeveralAtOnce,  ///< as many as there are threads: it keeps nothing, or guards it itself
};

/// Makes a stage of a process out of a function: a task that calls it for each token.
class VEXG_EXPORT FunctionStage final : public TaskFactory {
 public:
  /// Works on the slots of a token that the stage is bound to. `abort`, null outside a run, is for
  /// the loops inside. False fails the process, with the fault that SetFault has set; after an
  /// abort it means nothing.
  using Function = std::function<bool(ArgList& slots, const AbortFlag* abort)>;

  /// @param name      outlives the stage.
  /// @param function  is called on any worker; with kSeveralAtOnce on several at the same time.
  FunctionStage(const char* name, StageOrder order, Function function)
      : name_(name), order_(order), function_(std::move(function)) {}

  /// False without a function.
  bool IsReady() override { return function_ != nullptr; }
  Task* Create(ArgList& setupArgs) override;
  bool Destroy(Task* task) override;

 private:
  class FunctionTask;

  const char* name_;
  StageOrder order_;
  Function function_;
};

}  // namespace lumo
