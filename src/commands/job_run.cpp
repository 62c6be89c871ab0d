#include "commands/job_run.h"

#include <algorithm>
#include <memory>
#include <string_view>

#include "commands/catalog_session.h"
#include "commands/variable_text.h"
#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "platform/memory_shortage.h"

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
      if (IsVariable(value) || descriptor->expanded.Contains(inputName)) continue;
      const String name = String::Format("TMP_VAR_%08x", counter++);
      variables.SetLiteral(name, MakeText(value));
      value = name;
    }
  }
}

/// Ends a command as failed that memory was too short for; never throws.
void GiveUp(CommandDescriptor& descriptor) {
  try {
    descriptor.command->FailUnstarted(platform::kOutOfMemory);
  } catch (...) {
    NoteException();  // it retires without a result
  }
}

/// Lets go of what a command was given to report by; never throws.
void DropReports(CommandDescriptor& descriptor) noexcept {
  try {
    descriptor.ipc = IPC();
  } catch (...) {
    NoteException();  // it goes with the job then
  }
}

/// The stages of one run with what they share. Each thread of the run holds it, as the last one may
/// still be leaving the lock when the run returns.
struct JobRun {
  explicit JobRun(Job& job)
      : variables(job),
        starter(job, variables),
        executor(variables, job.checks),
        finisher(variables) {}

  catalog::Session* const session = catalog::CurrentSession();  // whose opens the job's are

  /// Runs a command. It ends come what may, since the run waits for it.
  void Execute(CommandDescriptor& descriptor) {
    try {
      executor.Process(&descriptor);
    } catch (...) {
      GiveUp(descriptor);
    }
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
    // Commands that this one held up run here, rather than on threads that have to be made first.
    while (descriptor_ != nullptr) {
      run_->Execute(*descriptor_);
      descriptor_ = run_->finisher.WriteAndTake(*descriptor_);
    }
  }

 private:
  std::shared_ptr<JobRun> run_;
  CommandDescriptor* descriptor_;
};

void StartCommandThread(const std::shared_ptr<JobRun>& run, CommandDescriptor* descriptor) {
  try {
    if (StartThread(SimpleThreadPtr(new JobExecutorThread(run, descriptor)))) return;
    descriptor->command->FailUnstarted(platform::kOutOfMemory);  // which a thread takes
  } catch (...) {
    GiveUp(*descriptor);
  }
  run->finisher.Write(descriptor);
}

ValueKind KindOf(const CommandDescriptor& descriptor, const String& input) {
  const CommandDeclaration* const declaration = descriptor.command->GetDeclaration();
  if (declaration == nullptr) return ValueKind::kText;
  for (const InputDeclaration& declared : declaration->inputs) {
    if (input == declared.name) return declared.kind;
  }
  return ValueKind::kText;
}

std::string NameOf(const CommandDescriptor& descriptor) {
  const String& name = descriptor.name.GetLength() != 0 ? descriptor.name : descriptor.id;
  return std::string("\"").append(Printable(name.ToUTF8(), 80)).append("\"");
}

constexpr std::string_view kSkipped = "skipped, as ";

/// Why a command that has ended without success gave nothing; the first of a chain stands for all.
String ExplainFailure(const CommandDescriptor& writer) {
  const std::string reason = writer.GetReason().ToUTF8();
  if (reason.starts_with(kSkipped)) return writer.GetReason();
  const bool isAborted = writer.command->GetResult() == CommandResult::kAborted;
  return String(std::string(kSkipped) + NameOf(writer) + (isAborted ? " was aborted" : " failed"));
}

String ExplainOutput(const CommandDescriptor& writer, const String& variable) {
  std::vector<std::string> known;
  if (const CommandDeclaration* const declaration = writer.command->GetDeclaration()) {
    for (const OutputDeclaration& output : declaration->outputs) known.emplace_back(output.name);
  }
  for (const auto& [output, target] : writer.outputs) {
    const std::string name = output.ToUTF8();
    if (target != variable) continue;
    return String(NameOf(writer) + " gave no output " + Printable(name, 80) +
                  (std::find(known.begin(), known.end(), name) == known.end()
                       ? DidYouMean(name, known)
                       : ""));
  }
  return {};
}

}  // namespace

JobVariables::JobVariables(Job& job) : schedule_(job) {
  for (const CommandDescriptorPtr& descriptor : job.commands) {
    for (const auto& [output, variable] : descriptor->outputs) {
      writers_[variable].push_back(descriptor.Get());
    }
  }
}

ObjectPtr JobVariables::FindOrMake(const String& variable) {
  return variables_[variable];
}

/// Why `variable` holds nothing, as far as the job knows.
String JobVariables::ExplainEmpty(const CommandDescriptor& reader, const String& variable) {
  const std::string name = Printable(variable.ToUTF8(), 80);
  const auto found = writers_.find(variable);
  if (found == writers_.end()) {
    std::vector<std::string> known;
    if (hints_ != 0) {
      --hints_;
      for (const auto& entry : writers_) known.push_back(entry.first.ToUTF8());
    }
    return String("nothing has written " + name + DidYouMean(variable.ToUTF8(), known));
  }
  // The last that stands before the reader, else the first of all.
  const std::vector<const CommandDescriptor*>& writers = found->second;
  const auto behind = std::partition_point(
      writers.begin(), writers.end(),
      [&](const CommandDescriptor* writer) { return writer->position < reader.position; });
  const CommandDescriptor* const writer =
      behind != writers.begin() ? *std::prev(behind) : writers.front();
  if (writer == &reader) return String("nothing has written " + name + " before");
  const Command& command = *writer->command;
  if (command.GetState() != CommandState::kRetired) {
    return String(NameOf(*writer) + " writes " + name +
                  ", but has not ended yet; a DependsOn orders them");
  }
  if (command.GetResult() != CommandResult::kSuccess) return ExplainFailure(*writer);
  return ExplainOutput(*writer, variable);
}

/// The text of an input with the values of its variables; empty, with the reason, when one of them
/// holds none.
ObjectPtr JobVariables::Expand(const CommandDescriptor& descriptor, const String& input,
                               const String& text, String& why) {
  String expanded;
  const auto read = [&](const String& variable, String& value) {
    const String* const found = FindText(FindOrMake(variable));
    if (found != nullptr) {
      value = *found;
    } else if (why.GetLength() == 0) {
      why = ExplainEmpty(descriptor, variable);
    }
    return found != nullptr;
  };
  if (!ExpandVariables(text, KindOf(descriptor, input), read, expanded)) return {};
  return MakeText(expanded);
}

String JobVariables::FillInputs(const CommandDescriptor& descriptor, ParameterMap& inputs) {
  const std::lock_guard lock(mutex_);
  String why;
  for (const auto& [inputName, variable] : descriptor.inputs) {
    if (descriptor.expanded.Contains(inputName)) {
      inputs[inputName].object = Expand(descriptor, inputName, variable, why);
    } else if (variable.GetLength() != 0) {
      const ObjectPtr object = FindOrMake(variable);
      if (object.IsNull() && why.GetLength() == 0) why = ExplainEmpty(descriptor, variable);
      inputs[inputName].object = object;
    }
  }
  return why;
}

void JobVariables::TakeOutputs(const CommandDescriptor& descriptor, ParameterMap& results) {
  const std::lock_guard lock(mutex_);
  for (const auto& [outputName, variable] : descriptor.outputs) {
    variables_[variable] = results[outputName].object;
  }
}

void JobVariables::Close() {
  const std::lock_guard lock(mutex_);
  variables_.Clear();
}

void JobVariables::RetireLocked(CommandDescriptor& descriptor) {
  descriptor.command->SetState(CommandState::kRetired);
  schedule_.Retire(descriptor);
}

void JobVariables::Retire(CommandDescriptor& descriptor) {
  const std::lock_guard lock(mutex_);
  RetireLocked(descriptor);
  changed_.notify_all();
}

CommandDescriptor* JobVariables::RetireAndTake(CommandDescriptor& descriptor) {
  const std::lock_guard lock(mutex_);
  RetireLocked(descriptor);
  CommandDescriptor* const next = schedule_.TakeReady();
  if (schedule_.HasReady() || schedule_.AllStarted()) changed_.notify_all();
  return next;
}

CommandDescriptor* JobVariables::AwaitReady() {
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [this] { return schedule_.HasReady() || schedule_.AllStarted(); });
  return schedule_.TakeReady();
}

void JobVariables::AwaitEnd() {
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [this] { return schedule_.AllRetired(); });
}

JobStarter::JobStarter(Job& job, JobVariables& variables)
    : variables_(variables), progress_(job.GetIPC().progress, job.commands.GetCount()) {
  for (unsigned i = 0; i < job.commands.GetCount(); ++i) {
    job.commands[i]->ipc = IPC(job.GetIPC().abort, progress_.GetSlot(i));
  }
}

CommandDescriptor* JobExecutor::Process(CommandDescriptor* descriptor) {
  if (descriptor == nullptr) return nullptr;
  Command& command = *descriptor->command;
  ParameterMap inputs;
  const String empty = variables_.FillInputs(*descriptor, inputs);
  String misfit;
  if (checks_ == JobChecks::kStrict && !descriptor->ipc.abort->IsSet()) {
    misfit = descriptor->complaint;
    const CommandDeclaration* const declaration = command.GetDeclaration();
    if (misfit.GetLength() == 0) misfit = empty;
    if (misfit.GetLength() == 0 && declaration != nullptr) {
      misfit = FindMisfit(*declaration, inputs, descriptor->outputs);
    }
  }
  if (misfit.GetLength() != 0) {
    command.FailUnstarted(misfit);
    descriptor->ipc.progress->Update(1.0);
    return descriptor;
  }
  ParameterMap& results = command.Run(inputs, descriptor->ipc);
  // "Input X holds no value" is true, but helps nobody.
  if (command.GetResult() == CommandResult::kFailed) descriptor->explanation = empty;
  variables_.TakeOutputs(*descriptor, results);
  return descriptor;
}

bool JobFinisher::Write(CommandDescriptor* descriptor) {
  if (descriptor == nullptr) return false;
  DropReports(*descriptor);
  variables_.Retire(*descriptor);
  return true;
}

CommandDescriptor* JobFinisher::WriteAndTake(CommandDescriptor& descriptor) {
  DropReports(descriptor);
  return variables_.RetireAndTake(descriptor);
}

bool RunJob(Job& job) {
  if (job.commands.GetCount() == 0) return true;
  const auto run = std::make_shared<JobRun>(job);
  NameLiterals(job, run->variables);
  const bool alone = job.commands.GetCount() == 1;
  while (CommandDescriptor* const descriptor = run->starter.Next()) {
    if (alone) {
      run->Execute(*descriptor);
      run->finisher.Write(descriptor);
    } else {
      StartCommandThread(run, descriptor);
    }
  }
  run->variables.AwaitEnd();
  run->variables.Close();
  return true;
}

}  // namespace lumo
