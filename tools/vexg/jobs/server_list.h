#pragma once

#include <string>

#include "jobs/raster_job.h"
#include "output/json_number.h"

namespace lumo::host {

/// The options of a verb that lists something of a server.
struct ServerListOptions {
  ServerOptions server;
  bool json = false;

  void AddTo(OptionSet& line);
};

/// Has the server run a command without inputs, and gives its values.
Map<String, String> AskServer(const ServerListOptions& options, const char* command);

/// Prints a list as JSON, or as lines below a heading.
/// @param none  the line for an empty list.
void PrintList(const ServerListOptions& options, const Json& all, const std::string& heading,
               const std::string& lines, const char* none);

}  // namespace lumo::host
