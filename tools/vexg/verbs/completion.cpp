#include <iostream>
#include <memory>

#include "options/option_values.h"
#include "options/verb_text.h"
#include "verb.h"

namespace lumo::host {
namespace {

const VerbRegistration registration(
    "completion", "Prints a script with which a shell completes command lines",
    [](OptionSet& line) {
      const auto shell = std::make_shared<std::string>();
      line.AddExample("eval \"$(vexg completion bash)\"");
      line.Add("shell", *shell, "The shell").Takes(OneOf({"bash"})).Required();
      return VerbRegistration::Work([shell] {
        if (*shell == "bash") std::cout << VerbsAsBashCompletion();
        return int{kExitSuccess};
      });
    });

}  // namespace
}  // namespace lumo::host
