#include <memory>

#include <CLI/CLI.hpp>

#include "command_text.h"
#include "result_output.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  bool json = false;
  bool markdown = false;
  bool names = false;
  std::string output = "-";
};

int List(const Options& options) {
  Output(options.output)
      .Write(options.json       ? CommandsAsJson()
             : options.markdown ? CommandsAsMarkdown()
             : options.names    ? CommandsAsNames()
                                : CommandsAsList());
  return kExitSuccess;
}

const VerbRegistration registration(
    "commands", "Lists the commands that a job may name", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer("Example: vexg commands --json\n");
      auto* const forms = app.add_option_group("form", "One of");
      forms->add_flag("--json", options->json, "All that they declare, as JSON");
      forms->add_flag("--markdown", options->markdown, "All that they declare, as a document");
      forms->add_flag("--names", options->names, "Their names alone");
      forms->require_option(0, 1);
      app.add_option("-o,--output", options->output, "Where the list goes")->type_name("FILE");
      return VerbRegistration::Work([options] { return List(*options); });
    });

}  // namespace
}  // namespace lumo::host
