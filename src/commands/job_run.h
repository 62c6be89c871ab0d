#pragma once

#include <condition_variable>
#include <map>
#include <mutex>

#include "commands/job_progress.h"
#include "commands/job_schedule.h"
#include "foundation/pipeline_stages.h"
#include "foundation/thread.h"

namespace lumo {

/// Holds all that the stages of one run share: the variables through which outputs become inputs,
/// and which command may start next. Threads: everything goes through its lock, which is never held
/// while a command runs.
class JobVariables {
 public:
  explicit JobVariables(Job& job);

  /// Stores a literal; no other thread is there yet.
  void SetLiteral(const String& name, const ObjectPtr& value) { variables_[name] = value; }

  /// The objects that the inputs of `descriptor` name. A variable that nobody has written is made,
  /// empty, so that the input exists and fails the command's own check. Texts that hold variables
  /// are put together.
  /// @return why an input is empty, in one line; no text when none is.
  String FillInputs(const CommandDescriptor& descriptor, ParameterMap& inputs);

  /// Stores the outputs of `descriptor`; a result that the command did not give is stored empty.
  void TakeOutputs(const CommandDescriptor& descriptor, ParameterMap& results);

  /// Ends the run: lets go of all objects.
  void Close();

  /// Retires a command, and wakes who waits.
  void Retire(CommandDescriptor& descriptor);

  /// Retires a command and gives the next that may start, its state set to started; null when there
  /// is none now. After it the job may be gone.
  CommandDescriptor* RetireAndTake(CommandDescriptor& descriptor);

  /// Blocks until a command may start, and gives it; null when all have been handed out.
  CommandDescriptor* AwaitReady();

  /// Blocks until all commands have retired.
  void AwaitEnd();

 private:
  ObjectPtr FindOrMake(const String& variable);
  ObjectPtr Expand(const CommandDescriptor& descriptor, const String& input, const String& text,
                   String& why);
  String ExplainEmpty(const CommandDescriptor& reader, const String& variable);
  void RetireLocked(CommandDescriptor& descriptor);

  std::mutex mutex_;
  std::condition_variable changed_;
  Map<String, ObjectPtr> variables_;
  std::map<String, std::vector<const CommandDescriptor*>> writers_;  // of a variable, in order
  JobSchedule schedule_;
  unsigned hints_ = kMostHints;
};

/// The first stage of a run: hands out each command once all that it depends on have retired.
class JobStarter : public IPipelineReader<CommandDescriptor> {
 public:
  /// Gives each command the job's abort flag and a slot of the job's progress.
  JobStarter(Job& job, JobVariables& variables);

  /// Blocks until a command may run, and gives the first such in document order with its state set
  /// to started; null when all have been handed out.
  CommandDescriptor* Next() override { return variables_.AwaitReady(); }

 private:
  JobVariables& variables_;
  JobProgress progress_;
};

/// The middle stage: runs one command, with its inputs out of the variables and its outputs back.
/// In a strict job a command that is given what it can't read fails without running.
class JobExecutor : public ISimplePipelineProcess<CommandDescriptor> {
 public:
  JobExecutor(JobVariables& variables, JobChecks checks) : variables_(variables), checks_(checks) {}

  bool IsParallel() const override { return true; }
  bool IsOrdered() const override { return false; }
  CommandDescriptor* Process(CommandDescriptor* descriptor) override;

 private:
  JobVariables& variables_;
  const JobChecks checks_;
};

/// The last stage: retires the command.
class JobFinisher : public IPipelineWriter<CommandDescriptor> {
 public:
  explicit JobFinisher(JobVariables& variables) : variables_(variables) {}

  /// False for null.
  bool Write(CommandDescriptor* descriptor) override;

  /// Retires the command and gives the next that may run, as JobStarter::Next; null when none may
  /// run now. After it the job may be gone.
  CommandDescriptor* WriteAndTake(CommandDescriptor& descriptor);

 private:
  JobVariables& variables_;
};

}  // namespace lumo
