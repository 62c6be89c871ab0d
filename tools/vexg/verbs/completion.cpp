#include <iostream>
#include <memory>

#include "options/completion_text.h"
#include "options/option_values.h"
#include "verb.h"

namespace lumo::host {
namespace {

const VerbRegistration completionRegistration(
    "completion", "Prints a script with which a shell completes command lines",
    [](OptionSet& line) {
      const auto shell = std::make_shared<std::string>();
      line.AddNote("A package of vexg installs these scripts where the shells look for them.");
      line.AddExample("eval \"$(vexg completion bash)\"");
      line.AddExample("vexg completion fish | source");
      line.Add("shell", *shell, "The shell").Takes(OneOf(CompletedShells())).Required();
      return VerbRegistration::Work([shell] {
        std::cout << VerbsAsCompletion(*shell);
        return int{kExitSuccess};
      });
    });

}  // namespace
}  // namespace lumo::host
