#include "tasks/function_stage.h"

#include "tasks/task_errors.h"

namespace lumo {

/// Calls the function of a stage, which outlives it.
class FunctionStage::FunctionTask final : public Task {
 public:
  explicit FunctionTask(const FunctionStage& stage)
      : Task(stage.name_, true, stage.order_ == StageOrder::kSeveralAtOnce), stage_(stage) {}

  bool Execute(ArgList& args) override {
    if (stage_.function_(args, GetAbortFlag()) || IsAborted()) return true;
    if (!IsStateless()) SetErrorState(TaskError());  // a stateless one fails by its answer
    return false;
  }

 private:
  const FunctionStage& stage_;
};

Task* FunctionStage::Create(ArgList& /*setupArgs*/) {
  return new (std::nothrow) FunctionTask(*this);
}

bool FunctionStage::Destroy(Task* task) {
  const bool valid = task != nullptr && task->IsValid();
  delete task;
  return valid;
}

}  // namespace lumo
