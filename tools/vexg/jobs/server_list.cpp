#include "jobs/server_list.h"

#include <iostream>

namespace lumo::host {

void ServerListOptions::AddTo(OptionSet& line) {
  line.Add("server", server.name, "Name of the server").ShowsDefault();
  line.Add("--json", json, "As JSON");
  server.AddNoWait(line);
}

Map<String, String> AskServer(const ServerListOptions& options, const char* command) {
  JobDraft draft;
  draft.Step("list", command);
  return RunOnServer(options.server, draft).Find("list").returns;
}

void PrintList(const ServerListOptions& options, const Json& all, const std::string& heading,
               const std::string& lines, const char* none) {
  if (options.json) {
    std::cout << all.dump(2) << '\n';
  } else if (lines.empty()) {
    std::cout << none << '\n';
  } else {
    std::cout << heading << lines;
  }
}

}  // namespace lumo::host
