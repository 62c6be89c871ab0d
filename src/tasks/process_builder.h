#pragma once

#include "foundation/async.h"
#include "tasks/process.h"

namespace lumo {

/// A process as a unit of asynchronous work. A process class derives from it: its constructor takes
/// argument ids, adds the stages, sets the arguments, and says SetBuilt() last.
///
/// Made on the stack for a run that is wanted at once; made into a Pointer for one in the
/// background, which shares it until it has ended.
/// Failure: a run that fails, or throws, stores AsyncErrorExecuteFailed. The task's own error stays
///          on the task and goes with it. An aborted run is no failure.
template <typename P>
class ProcessBuilder : public Async, public SelfPointing {
 public:
  static constexpr unsigned kHere = 0;          ///< on the calling thread, to the end
  static constexpr unsigned kInBackground = 1;  ///< on a thread of its own

  /// @param name  the name of the process class.
  explicit ProcessBuilder(const String& name, const IPC& ipc = {},
                          const AsyncCallbackPtr& callback = {});

  /// Stores a setup argument. @return false for a null object, or when the list can't grow.
  bool SetArg(ArgID id, const ObjectPtr& object) { return args_.Set(id, object); }

  /// Runs the process once.
  /// @param mode  kHere or kInBackground.
  /// @return with kHere, whether it ran well; with kInBackground, whether it could be started.
  ///         False, with nothing run, when it isn't built, or is to run in the background and no
  ///         Pointer owns it.
  bool RunProcess(unsigned mode);

  /// The mode of the last RunProcess; kHere before.
  unsigned GetRunMode() const { return runMode_; }

  /// The reason of the last run's failure in words, as far as a stage gave one; no text after a
  /// success.
  String GetFault() const { return process_.GetFault(); }

  /// The work itself, for whoever starts it.
  void Execute() override;

 protected:
  /// The process, for a constructor to add stages to.
  P& GetPipeline() { return process_; }
  /// The arguments that a run gets.
  ArgList& GetArgs() { return args_; }
  /// Declares the process complete; without it no run begins.
  void SetBuilt() { built_ = true; }
  bool IsBuilt() const { return built_; }

 private:
  ArgList args_;
  P process_;
  bool built_ = false;
  unsigned runMode_ = kHere;
};

extern template class VEXG_EXPORT ProcessBuilder<Process>;

/// A process whose end an object hears of, unless the run was aborted, to go on from there:
/// `receiver->OnProcessEnd(*this)` is called on the thread of the run, after the last progress
/// report and before a waiter sees the run finished.
template <typename P, typename C>
class ProcessBuilderCallback : public ProcessBuilder<P> {
 public:
  /// @param receiver  outlives the run.
  ProcessBuilderCallback(const String& name, C* receiver, const IPC& ipc = {},
                         const AsyncCallbackPtr& callback = {})
      : ProcessBuilder<P>(name, ipc, callback), receiver_(receiver) {}

  void Finish() override {
    if (receiver_ != nullptr && !this->IsAborted()) receiver_->OnProcessEnd(*this);
    ProcessBuilder<P>::Finish();
  }

 private:
  C* receiver_;
};

}  // namespace lumo
