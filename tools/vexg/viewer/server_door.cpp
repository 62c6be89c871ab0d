#include "viewer/server_door.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <list>
#include <mutex>
#include <optional>
#include <thread>

#include "pictures/block_reader.h"
#include "platform/owned_name.h"
#include "raster/pixel_types.h"
#include "verb.h"
#include "viewer/opening_gate.h"

namespace lumo::host {
namespace {

constexpr std::size_t kLines = 6;    // connections for short work, which a server runs side by side
constexpr std::size_t kOpened = 48;  // rasters that a connection keeps open

/// A connection to the server, and the rasters that it holds open by the jobs that open them.
class Line {
 public:
  explicit Line(const ServerOptions& server) : link_(server) {}

  String Send(const JobDraft& draft) {
    if (!isConnected_) link_.Connect();
    isConnected_ = true;
    return link_.Run(draft.Write());
  }

  JobResults Run(const JobDraft& draft) { return ReadResults(draft, Send(draft)); }

  /// The URI of the raster that a job opens.
  const String& Open(const JobDraft& raster) {
    const String text = raster.Write();
    const auto at = std::find_if(opened_.begin(), opened_.end(),
                                 [&](const Opened& each) { return each.text == text; });
    if (at != opened_.end()) {
      opened_.splice(opened_.begin(), opened_, at);
      return opened_.front().uris.back();
    }
    while (opened_.size() >= kOpened) CloseLast();
    const String answer = Send(raster);
    JobResults results;
    JobResultParser(results).Parse(answer);
    Opened opened{text, {}};
    for (const JobDraft::StepInfo& step : raster.GetSteps()) {
      const String uri = results.Find(step.name).returns.Find(step.output);
      if (uri.GetLength() != 0) opened.uris.push_back(uri);
    }
    opened_.push_front(std::move(opened));
    try {
      ReadResults(raster, answer);
    } catch (...) {
      Close(opened_.begin());
      throw;
    }
    return opened_.front().uris.back();
  }

  void CloseAll() {
    while (!opened_.empty()) CloseLast();
  }

  BlockMemory& MemoryOf(unsigned elementBytes) {
    std::optional<BlockMemory>& memory = memories_[elementBytes];
    if (!memory) memory.emplace(platform::OwnedName("vexg-view"), elementBytes);
    return *memory;
  }

 private:
  struct Opened {
    String text;
    std::vector<String> uris;  // from the source upwards
  };

  void CloseLast() { Close(std::prev(opened_.end())); }
  void Close(std::list<Opened>::iterator at) {
    JobDraft draft;
    for (std::size_t i = at->uris.size(); i-- > 0;) {
      draft.Close("close" + std::to_string(i), at->uris[i]);
    }
    opened_.erase(at);
    if (!draft.GetSteps().empty()) Send(draft);
  }

  ServerLink link_;
  bool isConnected_ = false;
  std::list<Opened> opened_;                             // the last used first
  std::array<std::optional<BlockMemory>, 17> memories_;  // by the bytes of a value
};

/// Carries the abort flag and the progress of a job over while it runs.
class Watch {
 public:
  Watch(JobChannel& channel, std::uint8_t* abort, double* progress)
      : thread_([this, &channel, abort, progress] {
          std::unique_lock lock(mutex_);
          for (bool isLast = false;;) {
            if (abort != nullptr && std::atomic_ref(*abort).load() == 1) channel.Abort();
            if (progress != nullptr) {
              std::atomic_ref(*progress).store(channel.GetProgress()->GetProgress());
            }
            if (isLast) return;
            isLast =
                wake_.wait_for(lock, std::chrono::milliseconds(50), [this] { return isOver_; });
          }
        }) {}
  ~Watch() {
    {
      const std::lock_guard lock(mutex_);
      isOver_ = true;
    }
    wake_.notify_all();
    thread_.join();
  }
  Watch(const Watch&) = delete;
  Watch& operator=(const Watch&) = delete;

 private:
  std::mutex mutex_;
  std::condition_variable wake_;
  bool isOver_ = false;
  std::thread thread_;
};

}  // namespace

struct ServerDoor::Impl {
  /// Waits for the server as long as the options say, and then for no connection any more: a server
  /// that has gone away is noticed at once.
  explicit Impl(const ServerOptions& options) : server{options.name, true} {
    ServerLink(options).Connect();
    for (std::size_t i = 0; i < kLines; ++i) free.push_back(std::make_unique<Line>(server));
  }

  /// Runs work with a connection, as soon as one is free.
  template <typename Work>
  auto With(const Work& work) {
    ThrowIfGone();
    std::unique_ptr<Line> line;
    {
      std::unique_lock lock(mutex);
      wake.wait(lock, [this] { return !free.empty(); });
      line = std::move(free.back());
      free.pop_back();
    }
    const Return back{*this, line};
    return Guard([&] { return work(*line); });
  }

  /// Runs work, and notes where the server has gone.
  template <typename Work>
  auto Guard(const Work& work) {
    ThrowIfGone();
    try {
      return work();
    } catch (const HostError& error) {
      if (error.code != kExitNoServer) throw;
    }
    if (!isGone.exchange(true) && isServing) Say(DescribeGone());
    throw HostError(kExitNoServer, DescribeGone());
  }

  std::string DescribeGone() const { return "the server \"" + server.name + "\" has gone away"; }

  void ThrowIfGone() const {
    if (isGone) throw HostError(kExitNoServer, DescribeGone());
  }

  struct Return {
    Impl& impl;
    std::unique_ptr<Line>& line;
    ~Return() {
      {
        const std::lock_guard lock(impl.mutex);
        impl.free.push_back(std::move(line));
      }
      impl.wake.notify_all();
    }
  };

  const ServerOptions server;
  std::mutex mutex;  // of what follows
  std::condition_variable wake;
  std::vector<std::unique_ptr<Line>> free;  // the one used last behind
  std::atomic<bool> isGone = false;
  std::atomic<bool> isServing = false;  // else the one who called tells the user
  OpeningGate opening;
};

ServerDoor::ServerDoor(const ServerOptions& server) : impl_(std::make_unique<Impl>(server)) {}

ServerDoor::~ServerDoor() = default;

bool ServerDoor::IsGone() const {
  return impl_->isGone;
}

void ServerDoor::SetServing() {
  impl_->isServing = true;
}

JobResults ServerDoor::Run(const JobDraft& draft, std::uint8_t* abort, double* progress) {
  if (abort == nullptr && progress == nullptr) {
    return impl_->With([&](Line& line) { return line.Run(draft); });
  }
  return impl_->Guard([&] {
    ServerLink link(impl_->server);  // of its own: it may take long
    link.Connect();
    JobChannel channel;
    const Watch watch(channel, abort, progress);
    return ReadResults(draft, link.Run(draft.Write(&channel)));
  });
}

JobResults ServerDoor::RunOpening(const JobDraft& draft) {
  const auto alone = impl_->opening.EnterAlone();
  std::vector<std::unique_ptr<Line>> lines;
  {
    // Who holds one only lends it for a job, and gets no other one.
    std::unique_lock lock(impl_->mutex);
    impl_->wake.wait(lock, [this] { return impl_->free.size() == kLines; });
    lines.swap(impl_->free);
  }
  const auto giveBack = [&] {
    {
      const std::lock_guard lock(impl_->mutex);
      impl_->free.swap(lines);
    }
    impl_->wake.notify_all();
  };
  try {
    JobResults results = impl_->Guard([&] {
      for (const std::unique_ptr<Line>& line : lines) line->CloseAll();
      return lines.front()->Run(draft);
    });
    giveBack();
    return results;
  } catch (...) {
    giveBack();
    throw;
  }
}

Json ServerDoor::Describe(const JobDraft& raster) {
  const auto shared = impl_->opening.Enter();
  return impl_->With([&](Line& line) {
    JobDraft draft;
    draft.Step("describe", "DescribeRasterCommand").AddInput("URI", line.Open(raster));
    return Json::parse(line.Run(draft).Find("describe").returns.Find("Description").ToUTF8());
  });
}

NamedBlock ServerDoor::Read(const JobDraft& raster, const SubRect& rect,
                            const std::vector<std::uint32_t>& bands, unsigned code) {
  BlockRequest block{rect, Array<unsigned>(ArrayDims(static_cast<unsigned>(bands.size()))),
                     Interleave::BSQ};
  std::copy(bands.begin(), bands.end(), block.bands.begin());
  const auto shared = impl_->opening.Enter();
  return impl_->With([&](Line& line) {
    BlockMemory& memory = line.MemoryOf(DataTypeBytes(code));
    memory.Make(block.GetCount());
    JobDraft draft;
    memory.AddStep(draft, "block", line.Open(raster), block);
    CheckReturn(line.Run(draft), "block", "the pixels can't be read");
    const unsigned char* const pixels = memory.GetPixels();
    const unsigned char* const states = memory.GetStates();
    return NamedBlock{{pixels, pixels + block.GetCount() * DataTypeBytes(code)},
                      {states, states + block.GetCount()}};
  });
}

void ServerDoor::Check() {
  impl_->With([](Line& line) { return line.Send(JobDraft()); });
}

std::vector<String> ServerDoor::ListRasters() {
  JobDraft draft;
  draft.Step("list", "ListOpenObjectsCommand");
  const Map<String, String> list = Run(draft, nullptr, nullptr).Find("list").returns;
  const auto uris = ParseValue<Array<URI>>(list.Find("URIs"));
  const auto kinds = ParseValue<Array<String>>(list.Find("Kinds"));
  std::vector<String> open;
  for (unsigned i = 0; i < uris.GetCount(); ++i) {
    const String uri = FormatValue(uris[i]);
    const bool isThere = std::find(open.begin(), open.end(), uri) != open.end();
    if (kinds[i] == "raster" && !isThere) open.push_back(uri);
  }
  return open;
}

}  // namespace lumo::host
