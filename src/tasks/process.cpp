#include "tasks/process.h"

#include <algorithm>
#include <limits>
#include <memory>
#include <new>
#include <vector>

#include "foundation/fault.h"
#include "foundation/grow_array.h"
#include "platform/memory_shortage.h"
#include "tasks/pipeline_body.h"
#include "tasks/process_stages.h"
#include "tasks/thread_limit.h"

namespace lumo {

const AbortFlag* Task::GetAbortFlag() const {
  return process_ != nullptr ? process_->GetIPC().abort.Get() : nullptr;
}

Array<ArgID> ArgIDs(std::initializer_list<ArgID> ids) {
  Array<ArgID> list{ArrayDims(static_cast<unsigned>(ids.size()))};
  std::copy(ids.begin(), ids.end(), list.begin());
  return list;
}

TaskDescriptor::TaskDescriptor(TaskFactory* factory, const Array<ArgID>& tokenArgs,
                               const Array<ArgID>& setupArgs)
    : factory_(factory), tokenArgs_(tokenArgs), setupArgs_(setupArgs) {
  CheckArrays();
}

TaskDescriptor::TaskDescriptor(const TaskDescriptor& other)
    : ErrorState(other),
      factory_(other.factory_),
      tokenArgs_(other.tokenArgs_),
      setupArgs_(other.setupArgs_) {
  CheckArrays();
}

TaskDescriptor& TaskDescriptor::operator=(const TaskDescriptor& other) {
  ErrorState::operator=(other);
  factory_ = other.factory_;
  tokenArgs_ = other.tokenArgs_;
  setupArgs_ = other.setupArgs_;
  CheckArrays();
  return *this;
}

void TaskDescriptor::CheckArrays() {
  if (!tokenArgs_.IsValid() || !setupArgs_.IsValid()) SetErrorState(ObjectErrorNotConstructed());
}

bool BasicProcess::AddTask(unsigned index, const TaskDescriptor& descriptor) {
  if (!descriptor.IsUsable()) return false;
  if (!GrowToHold(tasks_, index)) {
    SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
  for (const ArgID id : descriptor.GetTokenArgs())
    tokenArgCount_ = std::max(tokenArgCount_, id + 1);
  for (const ArgID id : descriptor.GetSetupArgs())
    setupArgCount_ = std::max(setupArgCount_, id + 1);
  tasks_[index] = descriptor;
  return true;
}

bool BasicProcess::ShouldStop() const {
  const MutexLock lock = Lock();
  return stop_ || ipc_.abort->IsSet();
}

bool BasicProcess::HasFailed() const {
  const MutexLock lock = Lock();
  return failed_;
}

void BasicProcess::KeepFault(const String& fault) {
  const MutexLock lock = Lock();
  if (fault_.GetLength() == 0) fault_ = fault;
}

String BasicProcess::GetFault() const {
  const MutexLock lock = Lock();
  return fault_;
}

void BasicProcess::TokenEnded(bool valid, bool error) {
  const MutexLock lock = Lock();
  if (error) failed_ = true;
  if (error || !valid) stop_ = true;
  if (stop_ || totalTokens_ == 0) return;
  ++done_;
  ipc_.progress->Update(
      std::min(1.0, static_cast<double>(done_) / static_cast<double>(totalTokens_)));
}

void BasicProcess::BeginRun() {
  const MutexLock lock = Lock();
  stop_ = false;
  failed_ = false;
  fault_ = String();
  done_ = 0;
  ipc_.progress->Update(0.0);
}

template <typename Initializer, typename Stage, typename Terminator>
bool CustomProcess<Initializer, Stage, Terminator>::Run(ArgList& args) {
  // A chain whose stages could not be placed has nothing that would ever end it.
  if (args.GetCount() < GetSetupArgCount() || GetTaskCount() == 0) return false;
  try {
    std::vector<std::unique_ptr<Stage>> stages;
    std::vector<ISimplePipelineProcess<TaskToken>*> chain;
    stages.reserve(GetTaskCount());
    chain.reserve(GetTaskCount());
    for (const TaskDescriptor& descriptor : Tasks()) {
      stages.push_back(std::make_unique<Stage>(*this, descriptor, args));
      chain.push_back(stages.back().get());
    }
    TokenPool pool(GetTokenArgCount());
    Initializer initializer(*this, pool);
    Terminator terminator(*this, pool);
    BeginRun();
    unsigned tokens = 0;
    for (const auto& stage : stages) tokens += stage->IsParallel() ? ThreadLimit::GetCurrent() : 1;
    if (GetTokenLimit() != 0) tokens = std::min(tokens, GetTokenLimit());
    const bool ran = RunPipeline<TaskToken>(initializer, chain, terminator, tokens);
    if (ran && !HasFailed()) return true;
    const String fault = GetFault();
    if (fault.GetLength() != 0) SetFault(fault);
    return false;
  } catch (const std::bad_alloc&) {
    platform::NoteMemoryShortage();
    SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
}

template bool RunPipeline(IPipelineReader<TaskToken>&,
                          std::span<ISimplePipelineProcess<TaskToken>* const>,
                          IPipelineWriter<TaskToken>&, unsigned);
template class CustomProcess<ProcessInitializer, ProcessTask, ProcessTerminator>;

}  // namespace lumo
