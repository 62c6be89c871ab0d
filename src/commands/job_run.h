#pragma once

#include <condition_variable>
#include <mutex>

#include "commands/job.h"
#include "foundation/pipeline_stages.h"
#include "foundation/progress.h"
#include "foundation/thread.h"

namespace lumo {

/// What the stages of one run share: the variables through which outputs become inputs, and the
/// news that a command has retired.
/// Threads: everything goes through its lock, which is never held while a command runs.
class JobVariables {
 public:
  /// Stores a literal; no other thread is there yet.
  void SetLiteral(const String& name, const ObjectPtr& value) { variables_[name] = value; }

  /// The objects that the inputs of `descriptor` name. A variable that nobody has written is made,
  /// empty, so that the input exists and fails the command's own check.
  void FillInputs(const CommandDescriptor& descriptor, ParameterMap& inputs);

  /// Stores the outputs of `descriptor`; a result that the command did not give is stored empty.
  void TakeOutputs(const CommandDescriptor& descriptor, ParameterMap& results);

  /// Ends the run: lets go of all objects.
  void Close();

  /// Sets the state of the command to retired, and wakes the waiters.
  void Retire(Command& command);

  /// Gives what `look` gives, which runs under the lock; null once the run is over, when the job
  /// may be gone.
  template <typename Look>
  CommandDescriptor* WhileRunning(Look look) {
    const std::lock_guard lock(mutex_);
    return over_ ? nullptr : look();
  }

  /// Blocks until `done` gives true, which is asked at the start and after each retirement.
  template <typename Done>
  void WaitUntil(Done done) {
    std::unique_lock lock(mutex_);
    retired_.wait(lock, done);
  }

 private:
  std::mutex mutex_;
  std::condition_variable retired_;
  Map<String, ObjectPtr> variables_;
  bool over_ = false;
};

/// The first stage of a run: hands out the commands as what they depend on retires.
class JobStarter : public IPipelineReader<CommandDescriptor> {
 public:
  /// Gives each command the job's abort flag and a slot of the job's progress.
  JobStarter(Job& job, JobVariables& variables);

  /// Blocks until a command may run, and gives the first such in document order with its state set
  /// to started; null when all have been handed out.
  CommandDescriptor* Next() override;

  /// As Next, without waiting: null also when no command may run yet.
  CommandDescriptor* TryNext();

 private:
  CommandDescriptor* TakeReady();
  bool AllStarted() const;

  Job& job_;
  JobVariables& variables_;
  ConcurrentProgressReport progress_;
};

/// The middle stage: runs one command, with its inputs out of the variables and its outputs back.
class JobExecutor : public ISimplePipelineProcess<CommandDescriptor> {
 public:
  explicit JobExecutor(JobVariables& variables) : variables_(variables) {}

  bool IsParallel() const override { return true; }
  bool IsOrdered() const override { return false; }
  CommandDescriptor* Process(CommandDescriptor* descriptor) override;

 private:
  JobVariables& variables_;
};

/// The last stage: retires the command.
class JobFinisher : public IPipelineWriter<CommandDescriptor> {
 public:
  explicit JobFinisher(JobVariables& variables) : variables_(variables) {}

  /// False for null.
  bool Write(CommandDescriptor* descriptor) override;

 private:
  JobVariables& variables_;
};

}  // namespace lumo
