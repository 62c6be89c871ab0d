#include <atomic>
#include <chrono>
#include <condition_variable>
#include <iostream>
#include <memory>
#include <mutex>
#include <thread>

#include <fmt/format.h>

#include "foundation/plugin_library.h"
#include "http/http_server.h"
#include "platform/browser.h"
#include "platform/interrupt.h"
#include "platform/module.h"
#include "platform/process.h"
#include "platform/random_bytes.h"
#include "verb.h"
#include "viewer/request_gate.h"
#include "viewer/server_door.h"
#include "viewer/viewer_site.h"

namespace lumo::host {
namespace {

struct ViewOptions {
  ViewRequest request;
  ServerOptions server{.name = ""};  ///< no name: in this process
  unsigned port = 0;
  bool noBrowser = false;
  double idle = 5;  // minutes
};

/// The function of the plug-in that makes servers.
http::MakeServerFunction* FindServerMaker() {
  std::string fault;
  const platform::Module plugin = LoadPlugin(platform::ModuleFileName("vexghttp"), fault);
  auto* const make = plugin.Find<http::MakeServerFunction>("VexgMakeHttpServer");
  if (make != nullptr) return make;
  throw HostError(kExitFailed, "pages can't be served: " + fault);
}

/// Stops a server once the page has been silent for long, or the user wants it.
class SilenceWatch {
 public:
  SilenceWatch(const ViewerSite& site, http::Server& server, double minutes, WorkFolder& folder)
      : thread_([this, &site, &server, minutes, &folder] {
          std::unique_lock lock(mutex_);
          while (!isOver_) {
            wake_.wait_for(lock, std::chrono::seconds(1));
            // A request to end that came just before the server ran did not reach it.
            const bool isSilent = minutes != 0 && site.GetSilence() > 60.0 * minutes;
            if (isSilent || platform::WasInterrupted()) {
              server.Stop();
              break;
            }
          }
          // An answer on its way may be held up for good, as by a server that has stopped.
          if (!wake_.wait_for(lock, std::chrono::seconds(10), [this] { return isOver_; })) {
            Say("what was still being read did not end within 10 s and was given up");
            folder.Remove();
            platform::EndProcess(kExitFailed);
          }
        }) {}
  ~SilenceWatch() {
    {
      const std::lock_guard lock(mutex_);
      isOver_ = true;
    }
    wake_.notify_all();
    thread_.join();
  }
  SilenceWatch(const SilenceWatch&) = delete;
  SilenceWatch& operator=(const SilenceWatch&) = delete;

 private:
  std::mutex mutex_;
  std::condition_variable wake_;
  bool isOver_ = false;
  std::thread thread_;
};

/// @param toServer  [out] the door, where it leads to a server.
std::unique_ptr<JobDoor> MakeDoor(const ServerOptions& server, ServerDoor*& toServer) {
  if (server.name.empty()) return MakeOwnDoor();
  auto door = std::make_unique<ServerDoor>(server);
  toServer = door.get();
  return door;
}

int View(const ViewOptions& options) {
  http::MakeServerFunction* const make = FindServerMaker();
  std::atomic<http::Server*> running = nullptr;
  WorkFolder folder;
  const platform::InterruptWatch interrupts([&] {
    if (http::Server* const server = running.load()) {
      server->Stop();
      return;
    }
    folder.Remove();
    platform::EndProcess(kExitFailed);  // while files are opened
  });
  ServerDoor* toServer = nullptr;
  const std::unique_ptr<JobDoor> door = MakeDoor(options.server, toServer);
  ViewRequest wanted = options.request;
  if (toServer != nullptr && wanted.files.empty() && wanted.mosaic.empty()) {
    wanted.open = toServer->ListRasters();
  }
  ViewedScene scene(*door, wanted, folder);
  if (scene.RasterCount() == 0) {
    throw HostError(kExitFailed, "the server \"" + options.server.name +
                                     "\" has no raster open that can be shown; name a file");
  }
  if (toServer != nullptr) toServer->SetServing();
  ViewerSite site(scene);
  std::unique_ptr<RequestGate> gate;
  const std::unique_ptr<http::Server> server(
      make({[&](const http::Request& request) { return gate->Judge(request); },
            [&](const http::Request& request) { return site.Answer(request); },
            ViewerSite::GetHeaders()}));
  const unsigned port = server->Bind(options.port);
  if (port == 0) {
    throw HostError(kExitFailed, options.port == 0
                                     ? std::string("no port of this machine can be had")
                                     : fmt::format("--port: {} is taken", options.port));
  }
  const std::string key = platform::RandomHex(16);
  gate = std::make_unique<RequestGate>(key, port);
  const std::string address = fmt::format("http://127.0.0.1:{}/#{}", port, key);
  std::cout << address << std::endl;
  if (!options.noBrowser && !platform::OpenInBrowser(address)) {
    Say("no browser could be opened; open the address by hand");
  }
  running = server.get();
  {
    const SilenceWatch watch(site, *server, options.idle, folder);
    if (!platform::WasInterrupted()) server->Run();
    running = nullptr;
    scene.Stop();
  }
  return toServer != nullptr && toServer->IsGone() ? kExitNoServer : kExitSuccess;
}

const VerbRegistration viewRegistration(
    "view", "Shows rasters, segments, classes and shapes in the browser", [](OptionSet& line) {
      const auto options = std::make_shared<ViewOptions>();
      line.AddNote(
          "Serves a page to this machine alone, prints its address and has the browser open it. "
          "The address holds a key: who does not know it gets nothing. It ends with Ctrl-C, or "
          "when the page has been closed for --idle minutes.");
      line.AddNote(
          "The pixels of the page are those of the first raster; others are carried to them. "
          "docs/viewer.md tells what the page can do.");
      line.AddExample("vexg view before.tif after.tif --labels segments.tif");
      line.AddExample("vexg view scene.tif --labels scene.tree --classes crops.tif");
      line.AddExample("vexg view --server vexg");
      line.Add("files", options->request.files, "The rasters").IsFile();
      line.Add("--labels", options->request.labels,
               "Segments over them: a raster of labels, or a tree named .tree")
          .IsFile("LABELS");
      line.Add("--classes", options->request.classes, "A map of classes over them").IsFile("MAP");
      line.Add("--shapes", options->request.shapes, "A vector file over them").IsFile();
      line.Add("--mosaic", options->request.mosaic,
               "A mosaic, with the footprints and seams of its scenes")
          .IsFile("MOSAIC");
      line.Add("--server", options->server.name,
               "Show rasters by the server of this name; those that are open there unless files "
               "are given")
          .Shows("NAME");
      options->server.AddNoWait(line);
      line.Add("--port", options->port, "Port to serve at; a free one by default")
          .Within(1024, 65535);
      line.Add("--no-browser", options->noBrowser, "Only print the address");
      line.Add("--idle", options->idle, "Minutes after which a closed page ends it; 0 never")
          .ShowsDefault();
      return VerbRegistration::Work([options] {
        if (options->request.files.empty() && options->request.mosaic.empty() &&
            options->server.name.empty()) {
          throw HostError(kExitUsage, "give a raster, --mosaic or --server");
        }
        if (!(options->idle >= 0)) throw HostError(kExitUsage, "--idle: not below 0");
        return View(*options);
      });
    });

}  // namespace
}  // namespace lumo::host
