#include "commands/job_run.h"

#include <algorithm>
#include <memory>

#include "commands/catalog_session.h"

namespace lumo {
namespace {

bool IsVariable(const String& value) {
  return value.GetLength() != 0 && value.GetData()[0] == u'$';
}

/// Replaces the literal inputs of all commands by variables that hold them.
void NameLiterals(Job& job, JobVariables& variables) {
  unsigned counter = 0;
  for (const CommandDescriptorPtr& descriptor : job.commands) {
    for (auto& [inputName, value] : descriptor->inputs) {
      if (IsVariable(value)) continue;
      const String name = String::Format("TMP_VAR_%08x", counter++);
      variables.SetLiteral(name, MakeText(value));
      value = name;
    }
  }
}

bool IsReady(const CommandDescriptor& descriptor) {
  return std::all_of(descriptor.dependsOn.begin(), descriptor.dependsOn.end(),
                     [](const CommandPtr& dependency) {
                       return dependency->GetState() == CommandState::kRetired;
                     });
}

bool AllRetired(const Job& job) {
  return std::all_of(job.commands.begin(), job.commands.end(), [](const auto& descriptor) {
    return descriptor->command->GetState() == CommandState::kRetired;
  });
}

/// Ends a command as failed that memory was too short for; never throws.
void GiveUp(CommandDescriptor& descriptor) {
  try {
    descriptor.command->FailUnstarted("memory is short");
  } catch (...) {
    // It retires without a result.
  }
}

/// The stages of one run with what they share. Each thread of the run holds it, as the last one may
/// still be leaving the lock when the run returns.
struct JobRun {
  explicit JobRun(Job& job) : starter(job, variables), executor(variables), finisher(variables) {}

  catalog::Session* const session = catalog::CurrentSession();  // whose opens the job's are

  void Execute(CommandDescriptor* descriptor) {
    try {
      executor.Process(descriptor);
    } catch (...) {
      GiveUp(*descriptor);
    }
    finisher.Write(descriptor);  // come what may: the run waits for it
  }

  JobVariables variables;
  JobStarter starter;
  JobExecutor executor;
  JobFinisher finisher;
};

/// The thread of a command, and of those that may start when it has ended.
class JobExecutorThread : public SimpleThread {
 public:
  JobExecutorThread(std::shared_ptr<JobRun> run, CommandDescriptor* descriptor)
      : run_(std::move(run)), descriptor_(descriptor) {}

  void Run() override {
    SetRunning();
    const catalog::SessionScope session(run_->session);
    // What this command held up runs here, rather than on a thread that has to be made first.
    for (CommandDescriptor* next = descriptor_; next != nullptr; next = run_->starter.TryNext()) {
      run_->Execute(next);
    }
  }

 private:
  std::shared_ptr<JobRun> run_;
  CommandDescriptor* descriptor_;
};

void StartCommandThread(const std::shared_ptr<JobRun>& run, CommandDescriptor* descriptor) {
  try {
    if (StartThread(SimpleThreadPtr(new JobExecutorThread(run, descriptor)))) return;
    descriptor->command->FailUnstarted("the system gives no thread for the command");
  } catch (...) {
    GiveUp(*descriptor);
  }
  run->finisher.Write(descriptor);
}

}  // namespace

void JobVariables::FillInputs(const CommandDescriptor& descriptor, ParameterMap& inputs) {
  const std::lock_guard lock(mutex_);
  for (const auto& [inputName, variable] : descriptor.inputs) {
    if (variable.GetLength() != 0) inputs[inputName].object = variables_[variable];
  }
}

void JobVariables::TakeOutputs(const CommandDescriptor& descriptor, ParameterMap& results) {
  const std::lock_guard lock(mutex_);
  for (const auto& [outputName, variable] : descriptor.outputs) {
    variables_[variable] = results[outputName].object;
  }
}

void JobVariables::Close() {
  const std::lock_guard lock(mutex_);
  over_ = true;
  variables_.Clear();
}

void JobVariables::Retire(Command& command) {
  const std::lock_guard lock(mutex_);
  command.SetState(CommandState::kRetired);
  retired_.notify_all();
}

JobStarter::JobStarter(Job& job, JobVariables& variables)
    : job_(job),
      variables_(variables),
      progress_(job.GetIPC().progress, AsyncCallbackPtr(), job.commands.GetCount()) {
  for (unsigned i = 0; i < job.commands.GetCount(); ++i) {
    job.commands[i]->ipc = IPC(job.GetIPC().abort, progress_.GetSlot(i));
  }
}

CommandDescriptor* JobStarter::Next() {
  CommandDescriptor* ready = nullptr;
  variables_.WaitUntil([&] {
    ready = TakeReady();
    return ready != nullptr || AllStarted();
  });
  return ready;
}

CommandDescriptor* JobStarter::TryNext() {
  return variables_.WhileRunning([this] { return TakeReady(); });
}

/// Under the lock, so that a command is handed out once.
CommandDescriptor* JobStarter::TakeReady() {
  for (const CommandDescriptorPtr& descriptor : job_.commands) {
    if (descriptor->command->GetState() == CommandState::kCreated && IsReady(*descriptor)) {
      descriptor->command->SetState(CommandState::kStarted);
      return descriptor.Get();
    }
  }
  return nullptr;
}

bool JobStarter::AllStarted() const {
  return std::none_of(job_.commands.begin(), job_.commands.end(), [](const auto& descriptor) {
    return descriptor->command->GetState() == CommandState::kCreated;
  });
}

CommandDescriptor* JobExecutor::Process(CommandDescriptor* descriptor) {
  if (descriptor == nullptr) return nullptr;
  ParameterMap inputs;
  variables_.FillInputs(*descriptor, inputs);
  ParameterMap& results = descriptor->command->Run(inputs, descriptor->ipc);
  variables_.TakeOutputs(*descriptor, results);
  return descriptor;
}

bool JobFinisher::Write(CommandDescriptor* descriptor) {
  if (descriptor == nullptr) return false;
  descriptor->ipc = IPC();
  variables_.Retire(*descriptor->command);
  return true;
}

bool RunJob(Job& job) {
  if (job.commands.GetCount() == 0) return true;
  const auto run = std::make_shared<JobRun>(job);
  NameLiterals(job, run->variables);
  const bool alone = job.commands.GetCount() == 1;
  while (CommandDescriptor* const descriptor = run->starter.Next()) {
    if (alone) {
      run->Execute(descriptor);
    } else {
      StartCommandThread(run, descriptor);
    }
  }
  run->variables.WaitUntil([&] { return AllRetired(job); });
  run->variables.Close();
  return true;
}

}  // namespace lumo
