#include <memory>

#include <fmt/format.h>

#include "jobs/server_list.h"
#include "platform/process.h"
#include "verb.h"

namespace lumo::host {
namespace {

int List(const ServerListOptions& options) {
  const Map<String, String> list = AskServer(options, "ListJobsCommand");
  const auto jobs = ParseValue<Array<unsigned>>(list.Find("Jobs"));
  const auto clients = ParseValue<Array<unsigned>>(list.Find("Clients"));
  const auto seconds = ParseValue<Array<double>>(list.Find("Seconds"));
  const auto progress = ParseValue<Array<double>>(list.Find("Progress"));
  const auto aborted = ParseValue<Array<bool>>(list.Find("Aborted"));
  const auto commands = ParseValue<Array<String>>(list.Find("Commands"));

  std::string text;
  Json all = Json::array();
  for (unsigned i = 0; i < jobs.GetCount(); ++i) {
    if (clients[i] == static_cast<unsigned>(platform::ProcessNumber())) continue;  // this one
    const std::string at = commands[i].ToUTF8();
    text += fmt::format("{:>6} {:>8} {:>10.1f} {:>6.1f} % {:8} {}\n", jobs[i], clients[i],
                        seconds[i], progress[i] * 100.0, aborted[i] ? "aborted" : "running", at);
    all.push_back({{"job", jobs[i]},
                   {"client", clients[i]},
                   {"seconds", seconds[i]},
                   {"progress", progress[i]},
                   {"aborted", aborted[i]},
                   {"commands", at}});
  }
  PrintList(options, all,
            fmt::format("{:>6} {:>8} {:>10} {:>8} {:8} {}\n", "job", "client", "seconds",
                        "progress", "state", "commands"),
            text, "no jobs are running");
  return kExitSuccess;
}

const VerbRegistration jobsRegistration(
    "jobs", "Lists the jobs that a server is running, and who sent them", [](OptionSet& line) {
      const auto options = std::make_shared<ServerListOptions>();
      line.AddNote("A job is named by its number, a client by the number of its process.");
      line.AddExample("vexg jobs vexg");
      options->AddTo(line);
      return VerbRegistration::Work([options] { return List(*options); });
    });

}  // namespace
}  // namespace lumo::host
