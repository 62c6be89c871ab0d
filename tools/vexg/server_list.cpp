#include "server_list.h"

#include <iostream>

#include <CLI/CLI.hpp>

namespace lumo::host {

void ServerListOptions::AddTo(CLI::App& app) {
  app.add_option("server", server.name, "Name of the server")->capture_default_str();
  app.add_flag("--json", json, "As JSON");
  server.AddNoWait(app);
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
