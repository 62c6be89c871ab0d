#include <memory>

#include <CLI/CLI.hpp>

#include "raster_job.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  ServerOptions server;
  unsigned job = 0;
};

int Abort(const Options& options) {
  JobDraft draft;
  draft.Step("abort", "AbortJobCommand").AddInput("Job", options.job);
  RunOnServer(options.server, draft);
  return kExitSuccess;
}

const VerbRegistration registration("abort", "Has a server give up a job", [](CLI::App& app) {
  const auto options = std::make_shared<Options>();
  app.footer(
      "The job ends as soon as its commands look at the request, and is answered as always.\n"
      "Example: vexg abort vexg 17\n");
  app.add_option("server", options->server.name, "Name of the server")->required();
  app.add_option("job", options->job, "Number of the job, see vexg jobs")->required();
  options->server.AddNoWait(app);
  return VerbRegistration::Work([options] { return Abort(*options); });
});

}  // namespace
}  // namespace lumo::host
