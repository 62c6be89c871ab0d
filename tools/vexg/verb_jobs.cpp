#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "platform/process.h"
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
  draft.Step("jobs", "ListJobsCommand");
  const JobResults results = RunOnServer(options.server, draft);
  const Map<String, String>& list = results.Find("jobs").returns;
  const auto jobs = ParseValue<Array<unsigned>>(list.Find("Jobs"));
  const auto clients = ParseValue<Array<unsigned>>(list.Find("Clients"));
  const auto seconds = ParseValue<Array<double>>(list.Find("Seconds"));
  const auto progress = ParseValue<Array<double>>(list.Find("Progress"));
  const auto aborted = ParseValue<Array<bool>>(list.Find("Aborted"));
  const auto commands = ParseValue<Array<String>>(list.Find("Commands"));

  std::string text;
  nlohmann::ordered_json all = nlohmann::ordered_json::array();
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
  if (options.json) {
    std::cout << all.dump(2) << '\n';
  } else if (text.empty()) {
    std::cout << "no jobs are running\n";
  } else {
    std::cout << fmt::format("{:>6} {:>8} {:>10} {:>8} {:8} {}\n", "job", "client", "seconds",
                             "progress", "state", "commands")
              << text;
  }
  return kExitSuccess;
}

const VerbRegistration registration(
    "jobs", "Lists the jobs that a server is running, and who sent them", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "A job is named by its number, a client by the number of its process.\n"
          "Example: vexg jobs vexg\n");
      app.add_option("server", options->server.name, "Name of the server")->capture_default_str();
      app.add_flag("--json", options->json, "As JSON");
      options->server.AddNoWait(app);
      return VerbRegistration::Work([options] { return List(*options); });
    });

}  // namespace
}  // namespace lumo::host
