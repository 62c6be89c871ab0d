#include <memory>

#include "commands/command_json.h"
#include "jobs/command_text.h"
#include "jobs/result_output.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct CommandsOptions {
  bool json = false;
  bool markdown = false;
  bool names = false;
  std::string output = "-";
};

int List(const CommandsOptions& options) {
  Output(options.output)
      .Write(options.json       ? CommandsAsJson()
             : options.markdown ? CommandsAsMarkdown()
             : options.names    ? CommandsAsNames()
                                : CommandsAsList());
  return kExitSuccess;
}

const VerbRegistration commandsRegistration(
    "commands", "Lists the commands that a job may name", [](OptionSet& line) {
      const auto options = std::make_shared<CommandsOptions>();
      line.AddExample("vexg commands --json");
      line.Add("--json", options->json, "All that they declare, as JSON");
      line.Add("--markdown", options->markdown, "All that they declare, as a document");
      line.Add("--names", options->names, "Their names alone");
      line.AllowOneOf({"--json", "--markdown", "--names"});
      line.Add("--output,-o", options->output, "Where the list goes").IsFile();
      return VerbRegistration::Work([options] { return List(*options); });
    });

}  // namespace
}  // namespace lumo::host
