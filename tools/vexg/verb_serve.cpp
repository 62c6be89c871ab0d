#include <memory>

#include <CLI/CLI.hpp>

#include "commands/server.h"
#include "platform/interrupt.h"
#include "platform/message_pipe.h"
#include "platform/pipe_listener.h"
#include "platform/process.h"
#include "server_options.h"
#include "verb.h"

namespace lumo::host {
namespace {

std::string WhyNot(platform::PipeFault fault, const std::string& name) {
  switch (fault) {
    case platform::PipeFault::kTaken:
      return "the server \"" + name + "\" runs already; stop it with vexg stop " + name +
             ", or take another name";
    case platform::PipeFault::kBadDirectory:
      return "the directory of the pipes is not usable; it must belong to you alone, with mode "
             "0700";
    case platform::PipeFault::kSystem:
      return "the system gives no pipe for the server \"" + name + "\"; try again later";
    default:
      return "\"" + name +
             "\" can't name a server; take a short name without /, %, a leading dot and ..";
  }
}

int Serve(const std::string& name, bool quiet) {
  platform::RaiseDescriptorLimit();
  auto& dispatch = dynamic_cast<PipeServerDispatch&>(GetServerDispatch(String(name)));
  {
    const platform::InterruptWatch interrupts([&] {
      dispatch.EndNow();
      AbortServedJobs();
    });
    if (!dispatch.Open() && !dispatch.StopRequested()) {
      throw HostError(kExitFailed, WhyNot(dispatch.GetFault(), name));
    }
    if (!quiet) Say("serving \"" + name + "\"; end it with vexg stop " + name + " or Ctrl-C");
    dispatch.Run();
    WaitServedJobs();
  }
  platform::RemoveOwnPipes();
  return kExitSuccess;
}

const VerbRegistration registration(
    "serve", "Serves jobs of other processes of this user, until it is stopped", [](CLI::App& app) {
      const auto name = std::make_shared<std::string>(kDefaultServer);
      const auto quiet = std::make_shared<bool>(false);
      app.add_option("name", *name, "Name of the server")->capture_default_str();
      app.add_flag("-q,--quiet", *quiet, "Say nothing at the start");
      return VerbRegistration::Work([name, quiet] { return Serve(*name, *quiet); });
    });

}  // namespace
}  // namespace lumo::host
