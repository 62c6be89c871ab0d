#include <memory>

#include "jobs/raster_job.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct AbortOptions {
  ServerOptions server;
  unsigned job = 0;
};

int Abort(const AbortOptions& options) {
  JobDraft draft;
  draft.Step("abort", "AbortJobCommand").AddInput("Job", options.job);
  RunOnServer(options.server, draft);
  return kExitSuccess;
}

const VerbRegistration abortRegistration(
    "abort", "Has a server give up a job", [](OptionSet& line) {
      const auto options = std::make_shared<AbortOptions>();
      line.AddNote(
          "The job ends as soon as its commands look at the request, and is answered as always.");
      line.AddExample("vexg abort vexg 17");
      line.Add("server", options->server.name, "Name of the server").Required();
      line.Add("job", options->job, "Number of the job, see vexg jobs").Required();
      options->server.AddNoWait(line);
      return VerbRegistration::Work([options] { return Abort(*options); });
    });

}  // namespace
}  // namespace lumo::host
