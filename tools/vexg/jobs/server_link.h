#pragma once

#include "jobs/server_options.h"

namespace lumo::host {

/// A private server of a running server, for the jobs of one verb.
class ServerLink {
 public:
  explicit ServerLink(const ServerOptions& options);
  /// Lets go of the private server, without waiting for one that has gone.
  ~ServerLink();
  ServerLink(const ServerLink&) = delete;
  ServerLink& operator=(const ServerLink&) = delete;

  /// Waits for a server as long as the options say. Throws HostError when none answers.
  void Connect();

  /// Has a job document run and gives its result. Throws HostError when the server goes away.
  String Run(const String& document);

 private:
  ServerOptions options_;
  PipeClient client_;
};

}  // namespace lumo::host
