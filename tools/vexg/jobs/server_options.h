#pragma once

#include <string>

#include "commands/client.h"
#include "options/option.h"

namespace lumo::host {

inline constexpr const char* kDefaultServer = "vexg";

/// Which server a verb talks to, and how long it waits for one.
struct ServerOptions {
  std::string name = kDefaultServer;
  bool noWait = false;

  void AddNoWait(OptionSet& line);
  double Patience() const { return noWait ? 0.0 : PipeClient::kPatience; }
};

}  // namespace lumo::host
