#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "raster_job.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  ServerOptions server;
  bool json = false;
};

int List(const Options& options) {
  JobDraft draft;
  draft.Step("open", "ListOpenObjectsCommand");
  const JobResults results = RunOnServer(options.server, draft);
  const Map<String, String>& list = results.Find("open").returns;
  const auto uris = ParseValue<Array<URI>>(list.Find("URIs"));
  const auto kinds = ParseValue<Array<String>>(list.Find("Kinds"));
  const auto opens = ParseValue<Array<unsigned>>(list.Find("Opens"));
  const auto clients = ParseValue<Array<unsigned>>(list.Find("Clients"));

  std::string text;
  nlohmann::ordered_json all = nlohmann::ordered_json::array();
  for (unsigned i = 0; i < uris.GetCount(); ++i) {
    const std::string client = clients[i] != 0 ? std::to_string(clients[i]) : "nobody";
    text +=
        fmt::format("{:>8} {:>6} {:9} {}\n", client, opens[i], kinds[i].ToUTF8(), uris[i].ToUTF8());
    all.push_back({{"uri", uris[i].ToUTF8()},
                   {"kind", kinds[i].ToUTF8()},
                   {"opens", opens[i]},
                   {"client", clients[i]}});
  }
  if (options.json) {
    std::cout << all.dump(2) << '\n';
  } else if (text.empty()) {
    std::cout << "nothing is open\n";
  } else {
    std::cout << fmt::format("{:>8} {:>6} {:9} {}\n", "client", "opens", "kind", "object") << text;
  }
  return kExitSuccess;
}

const VerbRegistration registration(
    "open", "Lists what is open in a server, and who has opened it", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "A client is named by the number of its process; what outlived its client is nobody's.\n"
          "Example: vexg open vexg\n");
      app.add_option("server", options->server.name, "Name of the server")->capture_default_str();
      app.add_flag("--json", options->json, "As JSON");
      options->server.AddNoWait(app);
      return VerbRegistration::Work([options] { return List(*options); });
    });

}  // namespace
}  // namespace lumo::host
