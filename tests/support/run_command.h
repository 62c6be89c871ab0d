#pragma once

#include <map>
#include <string>

#include "commands/command.h"

namespace lumo::test {

/// The results of a command.
struct CommandOutcome {
  CommandResult result;
  std::string reason;
  std::map<std::string, std::string> outputs;  // as they stand, by the name asked for

  bool Succeeded() const { return result == CommandResult::kSuccess; }
};

/// Runs a command on texts, as a job would.
inline CommandOutcome RunCommand(const char* name, const std::map<std::string, std::string>& inputs,
                                 const IPC& ipc = {}) {
  const CommandPtr command = CreateCommand(name);
  EXPECT_TRUE(command) << name;
  if (!command) return {CommandResult::kNone, "no such command", {}};
  ParameterMap map;
  for (const auto& [key, text] : inputs) map[key].object = MakeText(text);
  command->SetState(CommandState::kStarted);
  const ParameterMap& results = command->Run(map, ipc);
  CommandOutcome outcome{command->GetResult(), command->GetReason().ToUTF8(), {}};
  for (const auto& [key, parameter] : results) {
    const String* const text = FindText(parameter.object);
    if (text != nullptr) outcome.outputs[key.ToUTF8()] = text->ToUTF8();
  }
  return outcome;
}

}  // namespace lumo::test
