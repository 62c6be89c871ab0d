#include "commands/command.h"

#include "commands/catalog.h"
#include "commands/command_errors.h"
#include "foundation/fault.h"
#include "foundation/library.h"
#include "foundation/thrown.h"
#include "platform/clock.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

Command::Times Now() {
  return {WallSeconds(), platform::ProcessCpuSeconds()};
}

}  // namespace

const char* GetResultWord(CommandResult result) {
  switch (result) {
    case CommandResult::kNone:
      return "None";
    case CommandResult::kSuccess:
      return "Success";
    case CommandResult::kFailed:
      return "Failed";
    case CommandResult::kAborted:
      return "Aborted";
  }
  return "Unknown";
}

ParameterMap& Command::Run(const ParameterMap& inputs, const IPC& ipc) {
  startTimes_ = Now();
  ipc_ = ipc;
  inputs_ = &inputs;
  ipc_.progress->Update(0.0);
  if (HasError() || state_ != CommandState::kStarted) {
    result_ = Fail("the command can't be run in this state");
  } else if (ipc_.abort->IsSet()) {
    state_ = CommandState::kFinished;
    result_ = CommandResult::kAborted;
  } else {
    state_ = CommandState::kRunning;
    TakeFault();
    result_ = ExecuteGuarded();
  }
  ipc_.progress->Update(1.0);
  inputs_ = nullptr;
  ipc_ = IPC();
  endTimes_ = Now();
  return results_;
}

CommandResult Command::ExecuteGuarded() {
  const platform::MemoryWatch memory;
  CommandResult result = CommandResult::kFailed;
  try {
    result = Execute();
  } catch (...) {
    result = Fail(DescribeException());
  }
  if (!memory.WasShort() || result == CommandResult::kAborted) return result;
  // Whatever a library made of it: what was computed without the memory is not to be believed.
  reason_ = String();
  results_.Clear();
  return Fail(platform::kOutOfMemory);
}

void Command::GetReturns(Map<String, String>& returns) {
  try {
    BuildReturn();
  } catch (...) {
    SetErrorState(CommandErrorFail());
  }
  returns = returns_;
}

void Command::FailUnstarted(const String& reason) {
  startTimes_ = endTimes_ = Now();
  result_ = Fail(reason);
}

CommandResult Command::Execute() {
  return Succeed();
}

void Command::BuildReturn() {
  if (declaration_ == nullptr) return;
  for (const OutputDeclaration& output : declaration_->outputs) {
    if (!output.returned) continue;
    const String* const text = FindText(results_.Find(output.name).object);
    if (text != nullptr) returns_[output.name] = ParseValue<String>(*text);
  }
}

ObjectPtr Command::GetInput(const char* name) const {
  return inputs_ != nullptr ? inputs_->Find(name).object : ObjectPtr();
}

bool Command::CheckRequired(const char* name) {
  const ObjectPtr input = GetInput(name);
  if (!input.IsNull() && input->IsA(ScalarObject::TypeCode)) return true;
  reason_ = String("input ") + name + (HasInput(name) ? " holds no value" : " is missing");
  return false;
}

bool Command::CheckOptional(const char* name) {
  return !HasInput(name) || CheckRequired(name);
}

bool Command::CheckInputs() {
  if (declaration_ == nullptr) return true;
  for (const InputDeclaration& input : declaration_->inputs) {
    const bool fits = input.presence == Presence::kRequired ? CheckRequired(input.name)
                                                            : CheckOptional(input.name);
    if (!fits) return false;
  }
  return true;
}

CommandResult Command::Succeed() {
  state_ = CommandState::kFinished;
  return CommandResult::kSuccess;
}

CommandResult Command::Fail(const String& reason) {
  const String told = TakeFault();
  if (reason_.GetLength() == 0) reason_ = reason.GetLength() != 0 ? reason : told;
  SetErrorState(CommandErrorFail());
  state_ = CommandState::kFinished;
  return CommandResult::kFailed;
}

void Command::CatalogAdd(const ObjectPtr& object) {
  catalog::Add(object);
}

ObjectPtr Command::CatalogFind(const URI& uri) {
  return catalog::Find(uri);
}

Map<String, CommandFactory*>& GetCommandRegistry() {
  // Never destroyed: factories of other libraries leave it when the process ends, in any order.
  static auto& registry = *new Map<String, CommandFactory*>(nullptr);
  return registry;
}

CommandPtr CreateCommand(const String& name) {
  const CommandFactory* const factory = GetCommandRegistry().Find(name);
  return factory != nullptr ? factory->Create() : CommandPtr();
}

CommandFactory::CommandFactory(const CommandDeclaration& declaration)
    : registry_(GetCommandRegistry()), name_(declaration.name), declaration_(declaration) {
  registry_[name_] = this;
}

CommandFactory::~CommandFactory() {
  if (registry_.Find(name_) == this) registry_.Remove(name_);
}

CommandPtr CommandFactory::Adopt(Command* command) const {
  command->declaration_ = &declaration_;
  return CommandPtr(command);
}

}  // namespace lumo
