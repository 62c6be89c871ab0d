#include "jobs/server_link.h"

#include "commands/server.h"
#include "verb.h"

namespace lumo::host {

ServerLink::ServerLink(const ServerOptions& options)
    : options_(options), client_(String(options.name), options.Patience()) {}

ServerLink::~ServerLink() {
  client_.SetPatience(0.0);
}

void ServerLink::Connect() {
  if (!client_.Connect()) {
    throw HostError(kExitNoServer, "no server \"" + options_.name +
                                       "\" answers; start one with vexg serve " + options_.name);
  }
  if (client_.GetName() == String(options_.name + "::" + kErrorWord)) {
    throw HostError(kExitNoServer, "the server \"" + options_.name +
                                       "\" can take no more clients; try again later");
  }
}

String ServerLink::Run(const String& document) {
  String result;
  if (client_.Send(document, result)) return result;
  throw HostError(kExitNoServer, "the server \"" + options_.name +
                                     "\" went away before it answered; the job may have run in "
                                     "part");
}

}  // namespace lumo::host
