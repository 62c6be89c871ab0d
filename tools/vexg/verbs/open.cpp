#include <memory>

#include <fmt/format.h>

#include "jobs/server_list.h"
#include "verb.h"

namespace lumo::host {
namespace {

int List(const ServerListOptions& options) {
  const Map<String, String> list = AskServer(options, "ListOpenObjectsCommand");
  const auto uris = ParseValue<Array<URI>>(list.Find("URIs"));
  const auto kinds = ParseValue<Array<String>>(list.Find("Kinds"));
  const auto opens = ParseValue<Array<unsigned>>(list.Find("Opens"));
  const auto clients = ParseValue<Array<unsigned>>(list.Find("Clients"));

  std::string text;
  Json all = Json::array();
  for (unsigned i = 0; i < uris.GetCount(); ++i) {
    const std::string client = clients[i] != 0 ? std::to_string(clients[i]) : "nobody";
    text +=
        fmt::format("{:>8} {:>6} {:9} {}\n", client, opens[i], kinds[i].ToUTF8(), uris[i].ToUTF8());
    all.push_back({{"uri", uris[i].ToUTF8()},
                   {"kind", kinds[i].ToUTF8()},
                   {"opens", opens[i]},
                   {"client", clients[i]}});
  }
  PrintList(options, all, fmt::format("{:>8} {:>6} {:9} {}\n", "client", "opens", "kind", "object"),
            text, "nothing is open");
  return kExitSuccess;
}

const VerbRegistration openRegistration(
    "open", "Lists what is open in a server, and who has opened it", [](OptionSet& line) {
      const auto options = std::make_shared<ServerListOptions>();
      line.AddNote(
          "A client is named by the number of its process; what outlived its client is nobody's.");
      line.AddExample("vexg open vexg");
      options->AddTo(line);
      return VerbRegistration::Work([options] { return List(*options); });
    });

}  // namespace
}  // namespace lumo::host
