#include "tasks/process_stages.h"

#include "foundation/fault.h"

namespace lumo {

TaskToken* TokenPool::Take(unsigned sequence) {
  const std::lock_guard lock(mutex_);
  if (free_.empty()) {
    tokens_.push_back(std::make_unique<TaskToken>(argCount_));
    free_.reserve(tokens_.size());
    free_.push_back(tokens_.back().get());
  }
  TaskToken* const token = free_.back();
  free_.pop_back();
  token->sequence = sequence;
  token->valid = true;
  token->error = false;
  return token;
}

void TokenPool::Return(TaskToken* token) {
  token->args.Clear();
  const std::lock_guard lock(mutex_);
  free_.push_back(token);
}

TaskToken* ProcessInitializer::Next() {
  if (process_.ShouldStop()) return nullptr;
  return pool_.Take(++lastSequence_);
}

ProcessTask::ProcessTask(BasicProcess& process, const TaskDescriptor& descriptor,
                         const ArgList& args)
    : process_(process), descriptor_(descriptor), list_(descriptor.GetTokenArgs().GetCount()) {
  if (!descriptor_.IsUsable()) return;
  const Array<ArgID>& setupArgs = descriptor_.GetSetupArgs();
  ArgList setup(setupArgs.GetCount());
  for (unsigned i = 0; i < setupArgs.GetCount(); ++i) setup.Set(i, args.Get(setupArgs[i]));
  task_ = descriptor_.GetFactory()->Create(setup);
  if (task_ != nullptr) task_->SetProcess(&process_);
}

ProcessTask::~ProcessTask() {
  if (task_ != nullptr) descriptor_.GetFactory()->Destroy(task_);
}

TaskToken* ProcessTask::Process(TaskToken* token) {
  if (token == nullptr) return nullptr;
  // Several tokens may have passed the stage in front at once, when one of them failed there.
  if (process_.ShouldStop() || ended_) {
    token->valid = false;
  } else if (token->valid) {
    if (!IsUsable(*token)) {
      token->valid = false;
      token->error = true;
    } else if (IsParallel()) {
      ArgList list(list_.GetCount());
      Execute(*token, list);
    } else {
      Execute(*token, list_);
    }
  }
  if (!token->valid && !IsParallel()) ended_ = true;
  return token;
}

bool ProcessTask::IsUsable(const TaskToken& token) const {
  return task_ != nullptr && task_->IsValid() && token.args.IsValid() && list_.IsValid() &&
         descriptor_.GetTokenArgs().IsValid();
}

void ProcessTask::Execute(TaskToken& token, ArgList& list) {
  const Array<ArgID>& tokenArgs = descriptor_.GetTokenArgs();
  for (unsigned i = 0; i < tokenArgs.GetCount(); ++i) list.Set(i, token.args.Get(tokenArgs[i]));
  if (task_->Execute(list)) {
    for (unsigned i = 0; i < tokenArgs.GetCount(); ++i) token.args.Set(tokenArgs[i], list.Get(i));
  } else {
    token.valid = false;
    token.error = task_->IsStateless() || task_->HasError();
    if (token.error) process_.KeepFault(TakeFault());
  }
  list.Clear();
}

bool ProcessTerminator::Write(TaskToken* token) {
  if (token == nullptr) {
    process_.TokenEnded(false, false);
    return false;
  }
  process_.TokenEnded(token->valid, token->error);
  pool_.Return(token);
  return true;
}

}  // namespace lumo
