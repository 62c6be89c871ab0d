#include <memory>

#include <CLI/CLI.hpp>

#include "job_channel.h"
#include "platform/durability.h"
#include "platform/interrupt.h"
#include "progress_view.h"
#include "result_output.h"
#include "server_link.h"
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

const VerbRegistration registration(
    "submit", "Has a server run a job document and prints its result", [](CLI::App& app) {
      const auto options = std::make_shared<JobOptions>();
      const auto server = std::make_shared<ServerOptions>();
      app.footer("Example: vexg submit --server vexg --progress=bar job.xml\n");
      options->AddTo(app);
      app.add_option("--server", server->name, "Name of the server")->capture_default_str();
      server->AddNoWait(app);
      return VerbRegistration::Work([options, server] { return SubmitJobFile(*options, *server); });
    });

}  // namespace

void ServerOptions::AddNoWait(CLI::App& app) {
  app.add_flag("--no-wait", noWait, "Try once instead of waiting 30 s for a server to come");
}

}  // namespace lumo::host
