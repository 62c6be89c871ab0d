#include <memory>

#include "commands/named_pipe.h"
#include "commands/server.h"
#include "jobs/server_options.h"
#include "verb.h"

namespace lumo::host {
namespace {

int Stop(const ServerOptions& server) {
  NamedPipe pipe{String(server.name)};
  if (!pipe.ConnectWithin(server.Patience()) || pipe.Write(kQuitWord) == 0) {
    throw HostError(kExitNoServer,
                    "no server \"" + server.name + "\" answers; there is nothing to stop");
  }
  return kExitSuccess;
}

const VerbRegistration stopRegistration(
    "stop", "Ends a server, once the jobs that it is running are done", [](OptionSet& line) {
      const auto server = std::make_shared<ServerOptions>();
      line.AddExample("vexg stop vexg");
      line.Add("name", server->name, "Name of the server").ShowsDefault();
      server->AddNoWait(line);
      return VerbRegistration::Work([server] { return Stop(*server); });
    });

}  // namespace
}  // namespace lumo::host
