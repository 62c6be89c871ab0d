#pragma once

#include <new>

#include "commands/arg_list.h"
#include "foundation/run_controls.h"

namespace lumo {

class BasicProcess;

/// One stage's work in a Process: the object that does it for every token, one after the other.
///
/// A derived class takes its objects from the list of setup arguments in its constructor, and
/// stores TaskErrorBadParams when they are too few or unusable; a task in error fails the first
/// token that reaches it.
///
/// Threads: Execute never overlaps with itself, so a task needs no lock for its own fields; only a
///          StatelessTask has none that it changes. It runs on any worker, and beside the other
///          stages' tasks; what it shares with them is to be safe for that.
///
///     class ScaleTask final : public SequentialTask {
///      public:
///       explicit ScaleTask(ArgList& setup) : SequentialTask("ScaleTask"), factor_(setup.Get(0)) {
///         if (factor_.IsNull()) SetErrorState(TaskErrorBadParams());
///       }
///       bool Execute(ArgList& args) override {
///         const TilePtr<float> tile(args.Get(0));
///         if (tile.IsNull()) return false;
///         for (float& value : tile->PixelArray()) value *= factor_->value;
///         return true;
///       }
///
///      private:
///       ScalarPtr<float> factor_;
///     };
class VEXG_EXPORT Task : public ErrorState {
 public:
  virtual ~Task() = default;
  Task(const Task&) = delete;
  Task& operator=(const Task&) = delete;

  /// Works on one token.
  /// @param args  the values of the token that the stage is bound to. What is put into a slot goes
  ///              back to the token.
  /// @return true when the token is done. False without an error in this task is the end of the
  ///         data: no more tokens are made. False with an error fails the whole process.
  ///
  /// A body that takes long looks at IsAborted() once a row, and returns early when it is set; what
  /// it returns is then of no consequence.
  virtual bool Execute(ArgList& args) = 0;

  /// False for a task in error: the next token that reaches it fails the process.
  bool IsValid() const { return !HasError(); }
  /// The name of the class, for people.
  const String& GetName() const { return name_; }
  /// True when the body runs parallel loops inside. For readers: the pipeline treats both alike.
  bool IsConcurrent() const { return concurrent_; }
  /// True when Execute keeps nothing between tokens, and may run for several of them at once.
  bool IsStateless() const { return stateless_; }

  /// The process that runs this task, and owns it meanwhile; null outside a run.
  BasicProcess* GetProcess() const { return process_; }
  /// Called by the process when it takes the task over.
  void SetProcess(BasicProcess* process) { process_ = process; }

  /// True when the run was asked to abort.
  bool IsAborted() const { return GetAbortFlag() != nullptr && GetAbortFlag()->IsSet(); }
  /// The flag that aborts the run, for a parallel loop inside the body; null outside a run.
  const AbortFlag* GetAbortFlag() const;

 protected:
  Task(const char* name, bool concurrent, bool stateless)
      : name_(name), concurrent_(concurrent), stateless_(stateless) {}

 private:
  String name_;
  bool concurrent_;
  bool stateless_;
  BasicProcess* process_ = nullptr;
};

/// A task whose body is plain code.
class VEXG_EXPORT SequentialTask : public Task {
 protected:
  explicit SequentialTask(const char* name) : Task(name, false, false) {}
};

/// A task whose body runs parallel loops over its tile.
class VEXG_EXPORT ConcurrentTask : public Task {
 protected:
  explicit ConcurrentTask(const char* name, bool stateless = false) : Task(name, true, stateless) {}
};

/// A task that keeps nothing between tokens, whose Execute therefore runs for as many of them at
/// once as there are threads; the stages behind it get them in order again. It stores no error
/// after its construction: false is a failure of the process.
class VEXG_EXPORT StatelessTask : public ConcurrentTask {
 protected:
  explicit StatelessTask(const char* name) : ConcurrentTask(name, true) {}
};

/// Makes and destroys one kind of task. It outlives the processes that refer to it.
class VEXG_EXPORT TaskFactory {
 public:
  /// True when Create can make a task.
  virtual bool IsReady() = 0;
  /// @return a task that Destroy takes back; null when there is no memory for it.
  virtual Task* Create(ArgList& setupArgs) = 0;
  /// @return whether the task was valid; false for null.
  virtual bool Destroy(Task* task) = 0;
  virtual ~TaskFactory() = default;
};

/// The factory of T, which is made from a list of setup arguments. A process class holds one for
/// each of its stages, so that it lives as long as the process that refers to it.
template <typename T>
class ManagedTask final : public TaskFactory {
 public:
  bool IsReady() override { return true; }

  Task* Create(ArgList& setupArgs) override {
    try {
      return new T(setupArgs);
    } catch (const std::bad_alloc&) {
      return nullptr;
    }
  }

  bool Destroy(Task* task) override {
    const bool valid = task != nullptr && task->IsValid();
    delete task;
    return valid;
  }
};

}  // namespace lumo
