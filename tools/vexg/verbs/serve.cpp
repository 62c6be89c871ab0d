#include <algorithm>
#include <cstdlib>
#include <memory>

#include "commands/catalog_session.h"
#include "commands/served_jobs.h"
#include "commands/server.h"
#include "data/access_policy.h"
#include "data/format_table.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/thread_roll.h"
#include "jobs/server_options.h"
#include "options/option_values.h"
#include "platform/durability.h"
#include "platform/file_fence.h"
#include "platform/interrupt.h"
#include "platform/message_pipe.h"
#include "platform/module.h"
#include "platform/pipe_listener.h"
#include "platform/process.h"
#include "verb.h"

namespace lumo::host {
namespace {

std::string WhyNot(platform::PipeFault fault, const std::string& name) {
  switch (fault) {
    case platform::PipeFault::kTaken:
      return "the server \"" + name + "\" runs already; stop it with vexg stop " + name +
             ", or take another name";
    case platform::PipeFault::kBadDirectory:
      return "the directory of the pipes is not usable; it must belong to you alone, with mode "
             "0700";
    case platform::PipeFault::kSystem:
      return "the system gives no pipe for the server \"" + name + "\"; try again later";
    default:
      return "\"" + name +
             "\" can't name a server; take a short name without /, %, a leading dot and ..";
  }
}

struct ServeOptions {
  std::string name = kDefaultServer;
  bool quiet = false;
  bool shared = false;
  std::vector<std::string> roots;
  std::vector<std::string> allowed;

  bool Allows(const char* what) const {
    return std::find(allowed.begin(), allowed.end(), what) != allowed.end();
  }
};

void AddVariable(std::vector<std::string>& paths, const char* name) {
  if (const char* const value = std::getenv(name)) paths.emplace_back(value);
}

/// Has the kernel keep the server to the roots too: a library that opens a file by itself can't
/// reach further then.
void FenceIn(bool quiet) {
  for (std::uint32_t row = 0; row < FormatCount(); ++row) LoadFormat(row);
  TakeFault();  // of formats that have no plug-in here
  const AccessPolicy policy = GetAccessPolicy();
  const EnvironmentImpl& folders = GetGlobalEnvironmentImpl();
  platform::FileFence fence;
  fence.network = policy.network;
  fence.writable = policy.roots;
  fence.writable.push_back(folders.Find(Environment::kPeDirectory).ToUTF8());
  AddVariable(fence.writable, "metadata_parse_log_dir");
  fence.readable.push_back(platform::LibraryDirectory());
  for (const ContextKey& key : {Environment::kBinDirectory, Environment::kXmlDirectory,
                                Environment::kGdalDirectory, Environment::kMdfDirectory}) {
    fence.readable.push_back(folders.Find(key).ToUTF8());
  }
  for (const char* const name : {"PROJ_DATA", "PROJ_LIB", "GDAL_DATA", "GDAL_DRIVER_PATH"}) {
    AddVariable(fence.readable, name);
  }
  std::string fault;
  if (!platform::RaiseFileFence(fence, fault) && !quiet) {
    Say("--root is kept by the server alone, not by the kernel: " + fault);
  }
}

/// Keeps the jobs of clients to what the user named.
void LimitAccess(const ServeOptions& options) {
  AccessPolicy policy;
  policy.roots = options.roots;
  policy.network = options.Allows("network");
  policy.virtualFiles = options.Allows("virtual");
  policy.memory = options.Allows("memory");
  policy.indirect = options.Allows("indirect");
  policy.special = options.Allows("special");
  if (!SetAccessPolicy(policy)) {
    throw HostError(kExitUsage, "--root: " + TakeFault().ToUTF8());
  }
  if (!policy.roots.empty()) FenceIn(options.quiet);
}

int Serve(const ServeOptions& options) {
  constexpr double kPatience = 5.0;  // s, for threads that are on their way out
  const std::string& name = options.name;
  LimitAccess(options);
  platform::RaiseDescriptorLimit();
  platform::SetDurable(true);
  auto& dispatch = dynamic_cast<PipeServerDispatch&>(GetServerDispatch(String(name)));
  dispatch.SetReleaseOnQuit(!options.shared);
  bool allGone = false;
  {
    const platform::InterruptWatch interrupts([&] {
      dispatch.EndNow();
      ServedJobs::Get().AbortFromNowOn();
    });
    if (!dispatch.Open() && !dispatch.StopRequested()) {
      throw HostError(kExitFailed, WhyNot(dispatch.GetFault(), name));
    }
    if (!options.quiet)
      Say("serving \"" + name + "\"; end it with vexg stop " + name + " or Ctrl-C");
    dispatch.Run();
    // No new messages, then no jobs, then no clients; only then can what they have opened go.
    EndServers();
    for (const String& fault : catalog::Empty()) Say(fault.ToUTF8());
    allGone = JoinThreads(kPatience);
  }
  platform::RemoveOwnPipes();
  // A thread that hangs in a source has no part in the end: the process ends around it.
  if (!allGone) platform::EndProcess(kExitSuccess);
  return kExitSuccess;
}

const VerbRegistration serveRegistration(
    "serve", "Serves jobs of other processes of this user, until it is stopped",
    [](OptionSet& line) {
      const auto options = std::make_shared<ServeOptions>();
      line.AddNote(
          "Jobs reach no further than --root and --allow say. Links are followed before a file is "
          "judged.");
      line.AddExample("vexg serve --root /data/scenes --root /data/results");
      line.Add("name", options->name, "Name of the server").ShowsDefault();
      line.Add("--quiet,-q", options->quiet, "Say nothing at the start");
      line.Add("--shared", options->shared,
               "What a client opened stays open when it goes, for other clients to use and close");
      line.Add("--root", options->roots,
               "A folder in which jobs open and make files; may come again; all folders when "
               "absent")
          .IsFile("DIR");
      line.Add("--allow", options->allowed,
               "What jobs may use beside plain files: network, virtual (files inside other "
               "files), memory (addresses), indirect (formats whose files name other files), "
               "special (devices and pipes); may come again")
          .Shows("WHAT")
          .Takes(OneOf({"network", "virtual", "memory", "indirect", "special"}));
      return VerbRegistration::Work([options] { return Serve(*options); });
    });

}  // namespace
}  // namespace lumo::host
