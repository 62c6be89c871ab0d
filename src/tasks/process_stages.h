#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <vector>

#include "foundation/pipeline_stages.h"
#include "tasks/process.h"

namespace lumo {

/// The tokens of one run. A token that has ended is emptied and used again, so a run makes no more
/// of them than are in flight at once. Tokens belong to it and go with it. Threads: tokens may be
/// taken and returned on any.
class TokenPool {
 public:
  explicit TokenPool(unsigned argCount) : argCount_(argCount) {}

  /// A token with `sequence`, empty slots, valid and without error. Belongs to the pool.
  TaskToken* Take(unsigned sequence);
  /// Takes back a token; the objects in its slots are released.
  void Return(TaskToken* token);

 private:
  std::mutex mutex_;
  unsigned argCount_;
  std::vector<std::unique_ptr<TaskToken>> tokens_;
  std::vector<TaskToken*> free_;
};

/// Makes the tokens of a run until it is to stop.
class ProcessInitializer final : public IPipelineReader<TaskToken> {
 public:
  ProcessInitializer(BasicProcess& process, TokenPool& pool) : process_(process), pool_(pool) {}
  /// Gives a fresh token; null once the process should stop.
  TaskToken* Next() override;

 private:
  BasicProcess& process_;
  TokenPool& pool_;
  unsigned lastSequence_ = 0;
};

/// One stage of a run: owns its task and hands it the tokens.
class ProcessTask final : public ISimplePipelineProcess<TaskToken> {
 public:
  /// @param args  the arguments of the run, from which the task's own are taken.
  ProcessTask(BasicProcess& process, const TaskDescriptor& descriptor, const ArgList& args);
  ~ProcessTask() override;
  ProcessTask(const ProcessTask&) = delete;
  ProcessTask& operator=(const ProcessTask&) = delete;

  /// True for a task that keeps nothing between tokens.
  bool IsParallel() const override { return task_ != nullptr && task_->IsStateless(); }
  bool IsOrdered() const override { return true; }
  /// Gives the token on, whatever happened, so that it reaches the terminator.
  TaskToken* Process(TaskToken* token) override;

 private:
  bool IsUsable(const TaskToken& token) const;
  void Execute(TaskToken& token, ArgList& list);

  BasicProcess& process_;
  const TaskDescriptor& descriptor_;
  Task* task_ = nullptr;
  ArgList list_;  // what the task sees of the token; used again for each that comes alone
  std::atomic<bool> ended_{false};  // in order: no token behind this one is worked on
};

/// Takes the tokens that have passed all stages.
class ProcessTerminator final : public IPipelineWriter<TaskToken> {
 public:
  ProcessTerminator(BasicProcess& process, TokenPool& pool) : process_(process), pool_(pool) {}
  /// Reports how the token ended to the process, and gives it back to the pool.
  bool Write(TaskToken* token) override;

 private:
  BasicProcess& process_;
  TokenPool& pool_;
};

}  // namespace lumo
