#include "commands/command_json.h"

#include <vector>

#include <nlohmann/json.hpp>

#include "commands/command.h"

namespace lumo {
namespace {

using Json = nlohmann::ordered_json;

Json AsJson(const CommandDeclaration& command) {
  Json inputs = Json::array();
  for (const InputDeclaration& input : command.inputs) {
    inputs.push_back(
        {{"name", input.name},
         {"required", input.presence == Presence::kRequired},
         {"kind", Describe(input.kind).name},
         {"form", Describe(input.kind).form},
         {"unit", input.unit},
         {"words", input.words == nullptr ? std::vector<const char*>() : input.words()},
         {"meaning", input.meaning}});
  }
  Json outputs = Json::array();
  for (const OutputDeclaration& output : command.outputs) {
    outputs.push_back({{"name", output.name},
                       {"kind", Describe(output.kind).name},
                       {"form", Describe(output.kind).form},
                       {"unit", output.unit},
                       {"returned", output.returned},
                       {"meaning", output.meaning}});
  }
  return {{"name", command.name},
          {"group", command.group},
          {"meaning", command.meaning},
          {"inputs", inputs},
          {"outputs", outputs}};
}

}  // namespace

std::string CommandsAsJson() {
  Json all = Json::array();
  for (const auto& entry : GetCommandRegistry()) {
    all.push_back(AsJson(entry.second->GetDeclaration()));
  }
  return all.dump(2) + "\n";
}

}  // namespace lumo
