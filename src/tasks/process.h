#pragma once

#include <cstdint>
#include <initializer_list>

#include "foundation/locks.h"
#include "tasks/task.h"

namespace lumo {

/// Makes the list of argument ids that a TaskDescriptor takes: ArgIDs({tile, sums}).
VEXG_EXPORT Array<ArgID> ArgIDs(std::initializer_list<ArgID> ids);

/// How a process makes one stage: which task, which arguments of the run its constructor receives,
/// and which slots of a token its Execute sees.
///
/// Ownership: refers to the factory, which outlives the process.
/// Failure: after a copy for which there was no memory the copy holds ObjectErrorNotConstructed.
class VEXG_EXPORT TaskDescriptor : public ErrorState {
 public:
  TaskDescriptor() = default;
  /// @param tokenArgs  slots of the token, in the order of the list that Execute receives.
  /// @param setupArgs  arguments of the run, in the order of the list for the task's constructor.
  TaskDescriptor(TaskFactory* factory, const Array<ArgID>& tokenArgs,
                 const Array<ArgID>& setupArgs);
  TaskDescriptor(const TaskDescriptor& other);
  TaskDescriptor& operator=(const TaskDescriptor& other);

  /// True when a task can be made: a factory that is ready, and no error.
  bool IsUsable() const { return !HasError() && factory_ != nullptr && factory_->IsReady(); }

  /// The factory, which is not the descriptor's; null for a default one.
  TaskFactory* GetFactory() const { return factory_; }
  /// Slots of the token that the task sees, in the order of its list.
  const Array<ArgID>& GetTokenArgs() const { return tokenArgs_; }
  /// Arguments of the run that the task's constructor sees, in the order of its list.
  const Array<ArgID>& GetSetupArgs() const { return setupArgs_; }

 private:
  void CheckArrays();

  TaskFactory* factory_ = nullptr;
  Array<ArgID> tokenArgs_;
  Array<ArgID> setupArgs_;
};

/// The unit that flows through a process: the values of one block of work, usually a tile.
struct TaskToken {
  explicit TaskToken(unsigned argCount) : args(argCount) {}

  unsigned sequence = 0;  ///< 1 for the first token of a run
  ArgList args;           ///< the slots, by the ids that TakeTokenArg gave
  bool valid = true;      ///< false: no stage is to work on it any more
  bool error = false;     ///< a stage failed on it
};

/// Holds for all processes their stages, the counts of their arguments, and the state of a run.
///
/// Threads: one thread runs it; the stages read and change its state from any worker, under its
///          lock.
class VEXG_EXPORT BasicProcess : public ErrorState, public Lockable {
 public:
  /// @param name  for people; nothing looks it up.
  /// @param ipc   the flag that aborts a run, and the report of its progress.
  explicit BasicProcess(const String& name, const IPC& ipc = {}) : name_(name), ipc_(ipc) {}
  virtual ~BasicProcess() = default;
  BasicProcess(const BasicProcess&) = delete;
  BasicProcess& operator=(const BasicProcess&) = delete;

  /// Runs the chain to its end on this thread. @return false when a stage failed.
  virtual bool Run(ArgList& args) = 0;

  /// Places a stage. Positions between that are never filled make a chain whose first token fails.
  /// @return false, with no change, for a descriptor that isn't usable; false with
  ///         ObjectErrorOutOfMemory stored when the table can't grow.
  bool AddTask(unsigned index, const TaskDescriptor& descriptor);

  /// The next free argument of the run, from 0.
  ArgID TakeSetupArg() { return nextSetupArg_++; }
  /// The next free slot of a token, from 0.
  ArgID TakeTokenArg() { return nextTokenArg_++; }

  const String& GetName() const { return name_; }
  /// Stages, places that were never filled among them.
  unsigned GetTaskCount() const { return tasks_.GetCount(); }
  /// Slots of a token: one above the highest that a stage is bound to.
  unsigned GetTokenArgCount() const { return tokenArgCount_; }
  /// Arguments that a run needs at least.
  unsigned GetSetupArgCount() const { return setupArgCount_; }
  const IPC& GetIPC() const { return ipc_; }

  /// How many tokens a run will make, which gives it progress; 0 when it isn't known.
  void SetTotalTokens(std::uint64_t tokens) { totalTokens_ = tokens; }
  std::uint64_t GetTotalTokens() const { return totalTokens_; }

  /// Bounds the tokens in flight, for stages whose tokens take much memory; 0 for as many as the
  /// stages can work on at once.
  void SetTokenLimit(unsigned tokens) { tokenLimit_ = tokens; }
  unsigned GetTokenLimit() const { return tokenLimit_; }

  /// True when no more tokens are to be made and no stage is to do more work: at the end of the
  /// data, after a failure, or when the abort flag is set.
  bool ShouldStop() const;
  /// Called where a token ends: stops the run for one that isn't valid, fails it for one in error,
  /// and reports progress for one that was done.
  void TokenEnded(bool valid, bool error);
  /// True when a stage failed.
  bool HasFailed() const;
  /// Keeps the fault text of a stage that failed, which worked on a thread of its own. The first
  /// one stays; Run sets it on its thread.
  void KeepFault(const String& fault);
  /// The fault text of the last run; no text when there was none.
  String GetFault() const;

 protected:
  /// Clears the state of the run before, and reports progress 0.
  void BeginRun();

  Array<TaskDescriptor>& Tasks() { return tasks_; }

 private:
  String name_;
  Array<TaskDescriptor> tasks_;
  unsigned tokenArgCount_ = 0;
  unsigned setupArgCount_ = 0;
  ArgID nextSetupArg_ = 0;
  ArgID nextTokenArg_ = 0;
  std::uint64_t totalTokens_ = 0;
  unsigned tokenLimit_ = 0;
  IPC ipc_;

  // The state of a run, under the lock.
  bool stop_ = false;
  bool failed_ = false;
  String fault_;
  std::uint64_t done_ = 0;
};

/// A process on three collaborators: Initializer makes the tokens, Stage runs one task, Terminator
/// takes the tokens back. Exists for those of Process.
template <typename Initializer, typename Stage, typename Terminator>
class CustomProcess : public BasicProcess {
 public:
  using BasicProcess::BasicProcess;

  /// Makes the tasks, runs the pipeline with as many tokens in flight as can be worked on at once,
  /// and destroys the tasks. An abort is no failure: the caller looks at the flag.
  /// @param args  the arguments of the run. False, with no error stored, when they are too few.
  /// An exception of a task comes out here.
  bool Run(ArgList& args) override;
};

class ProcessInitializer;
class ProcessTask;
class ProcessTerminator;

extern template class VEXG_EXPORT CustomProcess<ProcessInitializer, ProcessTask, ProcessTerminator>;

/// A chain of tasks through which tokens flow. Each task works on one token at a time, in order,
/// unless it is a StatelessTask, which works on one for each thread; different tasks work on
/// different tokens at once. Memory stays bounded by the tokens in flight, which are as many as
/// there are tasks, or threads for a StatelessTask.
///
/// Most computations are written as functions, see raster/tile_functions.h. One put together by
/// hand:
///
///     Process process(String("Scale"), ipc);
///     const ArgID tile = process.TakeTokenArg();
///     const ArgID source = process.TakeSetupArg();
///     process.AddTask(0, TaskDescriptor(&reader, ArgIDs({tile}), ArgIDs({source})));
///     process.AddTask(1, TaskDescriptor(&scaler, ArgIDs({tile}), {}));
///     ArgList args;
///     args.Set(source, iterator);
///     const bool well = process.Run(args);
class VEXG_EXPORT Process final
    : public CustomProcess<ProcessInitializer, ProcessTask, ProcessTerminator> {
 public:
  using CustomProcess::CustomProcess;
};

}  // namespace lumo
