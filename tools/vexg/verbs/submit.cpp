#include <memory>

#include "jobs/job_channel.h"
#include "jobs/progress_view.h"
#include "jobs/result_output.h"
#include "jobs/server_link.h"
#include "platform/durability.h"
#include "platform/interrupt.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// The channel that the document names, or one that is added to it.
JobChannel ChannelOf(Document& document) {
  const XMLElement* const named = document.FindChannel();
  if (named != nullptr) return JobChannel(*named);
  JobChannel channel;
  channel.AddTo(document.GetRoot());
  return channel;
}

int SubmitJobFile(const JobOptions& options, const ServerOptions& server) {
  String text;
  Document document = ReadJob(options, text);
  Output output(options.output, options.file);
  platform::SetDurable(options.isDurable);
  JobChannel channel = ChannelOf(document);
  document.GetRoot().AddChild("Reasons");
  if (AsksForStrictChecks(document)) document.GetRoot().attributes["Checks"] = "Strict";
  ServerLink link(server);
  String result;
  auto outcome = Outcome::kDone;
  {
    const platform::InterruptWatch interrupts([&] { channel.Abort(); }, output.IsStandardOutput());
    link.Connect();
    ProgressView view(channel.GetProgress(), ChooseProgressStyle(options.progress, options.quiet));
    result = link.Run(document.Write());
    outcome = OutcomeOf(result, channel.IsAborted());
    view.SetOutcome(outcome);
  }
  WriteResult(document, result, options.json, output);
  return ExitCodeAfter(outcome, ExitCodeOf(document, result));
}

const VerbRegistration submitRegistration(
    "submit", "Has a server run a job document and prints its result", [](OptionSet& line) {
      const auto options = std::make_shared<JobOptions>();
      const auto server = std::make_shared<ServerOptions>();
      line.AddExample("vexg submit --server vexg --progress=bar job.xml");
      options->AddTo(line);
      line.Add("--server", server->name, "Name of the server").ShowsDefault();
      server->AddNoWait(line);
      return VerbRegistration::Work([options, server] { return SubmitJobFile(*options, *server); });
    });

}  // namespace

void ServerOptions::AddNoWait(OptionSet& line) {
  line.Add("--no-wait", noWait, "Try once instead of waiting 30 s for a server to come");
}

}  // namespace lumo::host
