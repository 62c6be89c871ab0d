#include <memory>

#include <CLI/CLI.hpp>

#include "commands/server.h"
#include "commands/shared_memory_channel.h"
#include "platform/interrupt.h"
#include "platform/process.h"
#include "platform/shared_memory.h"
#include "progress_view.h"
#include "result_output.h"
#include "server_options.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// The channel through which a job that runs elsewhere is watched and aborted: the one that its
/// document names, or one that is added to it.
class SubmitChannel {
 public:
  explicit SubmitChannel(Document& document) {
    const XMLElement* const named = document.FindChannel();
    if (named != nullptr) {
      watched_ = OpenChannel(named->name, named->attributes);
      return;
    }
    const std::string name = "vexg-submit-" + std::to_string(platform::ProcessNumber());
    block_ = platform::SharedMemoryBlock::Create(name, kSize);
    if (block_ == nullptr) return;
    XMLElement* const element = document.GetRoot().AddChild("ORVAIPC");
    element->attributes["Name"] = String(name);
    element->attributes["Size"] = String::Format("%u", kSize);
    watched_ = OpenChannel(element->name, element->attributes);
  }

  void Abort() {
    if (!watched_.IsNull()) watched_->abort->Set(true);
  }

  ProgressReportPtr GetProgress() const {
    return watched_.IsNull() ? ProgressReportPtr(new StandardProgressReport) : watched_->progress;
  }

 private:
  static constexpr unsigned kSize = 8;
  std::unique_ptr<platform::SharedMemoryBlock> block_;
  IPCPtr watched_;
};

void ConnectTo(PipeClient& client, const ServerOptions& server) {
  if (!client.Connect()) {
    throw HostError(kExitNoServer, "no server \"" + server.name +
                                       "\" answers; start one with vexg serve " + server.name);
  }
  if (client.GetName() == String(server.name + "::" + kErrorWord)) {
    client.SetPatience(0.0);
    throw HostError(kExitNoServer,
                    "the server \"" + server.name + "\" can take no more clients; try again later");
  }
}

int SubmitJobFile(const JobOptions& options, const ServerOptions& server) {
  String text;
  Document document = ReadJob(options, text);
  Output output(options.output);
  SubmitChannel channel(document);
  PipeClient client(String(server.name), server.Patience());
  String result;
  bool answered = false;
  {
    const platform::InterruptWatch interrupts([&] { channel.Abort(); });
    ConnectTo(client, server);
    const ProgressView view(channel.GetProgress(),
                            ChooseProgressStyle(options.progress, options.quiet));
    answered = client.Send(document.Write(), result);
  }
  client.SetPatience(0.0);
  if (!answered) {
    throw HostError(kExitNoServer,
                    "the server \"" + server.name +
                        "\" went away before it answered; the job may have run in part");
  }
  WriteResult(result, options.json, output);
  return ExitCodeOf(document, result);
}

const VerbRegistration registration(
    "submit", "Has a server run a job document and prints its result", [](CLI::App& app) {
      const auto options = std::make_shared<JobOptions>();
      const auto server = std::make_shared<ServerOptions>();
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
