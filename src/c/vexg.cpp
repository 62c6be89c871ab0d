#include "c/vexg.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <exception>
#include <memory>
#include <mutex>
#include <string>

#include "c/block_transfer.h"
#include "c/lent_controls.h"
#include "c/raster_store.h"
#include "commands/catalog.h"
#include "commands/command_json.h"
#include "commands/job_parser.h"
#include "commands/job_result.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/library.h"
#include "foundation/thread_roll.h"
#include "platform/process.h"
#include "raster/raster_description.h"
#include "tasks/thread_limit.h"

using namespace lumo;

namespace {

/// A text that vexg_free takes back; null when there is no memory.
char* Hand(const std::string& text) noexcept {
  char* const copy = static_cast<char*>(std::malloc(text.size() + 1));
  if (copy != nullptr) std::memcpy(copy, text.c_str(), text.size() + 1);
  return copy;
}

/// Sets a fault, in one line.
void Tell(char** fault, std::string why) {
  if (fault == nullptr) return;
  std::replace_if(
      why.begin(), why.end(), [](char c) { return c == '\n' || c == '\r'; }, ' ');
  *fault = Hand(why);
}

/// The number of the process that made the library ready; 0 before.
std::atomic<int>& MakerProcess() {
  static std::atomic<int> process{0};
  return process;
}

/// Makes the library ready. False, with the fault text set, in a child of the process that did.
bool Begin() {
  static std::once_flag once;
  const int process = platform::ProcessNumber();
  const int maker = MakerProcess().load();
  if (maker != 0 && maker != process) {
    SetFault(
        "vexg was in use before this process was forked, and its threads stayed behind; start "
        "processes anew instead (spawn), or fork before the first use");
    return false;
  }
  std::call_once(once, [&] {
    MakerProcess() = process;
    InitEnvironment();
    VEXInit();
  });
  return true;
}

/// The rasters that calls have named by their texts. It is never destroyed: at the end of the
/// process the threads of sources may have gone before it.
RasterStore& Store() {
  static RasterStore& store = *new RasterStore(VEXG_KEPT_RASTERS);
  return store;
}

/// Runs the body of a function of the door: takes what it gives, or tells why it gave nothing.
/// @param otherwise  is said where nobody set a fault text.
template <typename Body>
auto Enter(char** fault, const char* otherwise, const Body& body) noexcept -> decltype(body()) {
  if (fault != nullptr) *fault = nullptr;
  try {
    TakeFault();
    if (Begin()) {
      if (const auto given = body()) return given;
    }
    Tell(fault, TakeFaultOr(otherwise).ToUTF8());
  } catch (const std::bad_alloc&) {
    Tell(fault, "out of memory");
  } catch (const std::exception& thrown) {
    Tell(fault, thrown.what());
  } catch (...) {
    Tell(fault, otherwise);
  }
  return {};
}

/// Whether a text names an object that is open in the catalog.
bool NamesOpenObject(const std::string& text) {
  return text.starts_with('[');
}

/// Calls `use` with the raster that a text names.
template <typename Use>
auto WithRaster(const char* text, const Use& use) -> decltype(use(std::declval<BasicRaster&>())) {
  if (text == nullptr || *text == 0) {
    SetFault("no raster is named");
    return {};
  }
  const std::string name(text);
  if (NamesOpenObject(name)) {
    const BasicRasterPtr raster(catalog::Find(ParseValue<URI>(String(name))));
    if (raster && raster->IsValid()) return use(*raster);
    SetFault("no open raster " + name);
    return {};
  }
  const auto named = Store().Get(name);
  if (!named) return {};
  return use(*named->Raster());
}

/// The flag and the report of a caller, for as long as its call lasts.
class LentControls {
 public:
  LentControls(std::uint8_t* abort, double* progress)
      : abort_(new LentAbortFlag(abort)), progress_(new LentProgressReport(progress)) {}
  ~LentControls() {
    abort_->Return();
    progress_->Return();
  }
  LentControls(const LentControls&) = delete;
  LentControls& operator=(const LentControls&) = delete;

  IPCPtr MakeIPC() const {
    return IPCPtr(new IPC(AbortFlagPtr(abort_), ProgressReportPtr(progress_)));
  }

 private:
  Pointer<LentAbortFlag> abort_;
  Pointer<LentProgressReport> progress_;
};

/// Runs a job. What an aborted one has opened is closed, since the commands that would have done so
/// did not run any more, and files that it was making are given up.
String RunDocument(const String& document, std::uint8_t* abort, double* progress) {
  catalog::Session session(platform::ProcessNumber());
  const catalog::SessionScope scope(&session);
  const LentControls controls(abort, progress);  // which the job still tells of its end
  Job job;
  JobParser(job).Parse(document);
  if (abort != nullptr || progress != nullptr) job.ipc = controls.MakeIPC();
  session.BeginJob();
  RunJob(job);
  const bool isAborted = job.GetIPC().abort->IsSet();
  session.EndJob(isAborted);
  if (isAborted) session.ReleaseAll();
  return JobResultWriter(job).Write();
}

}  // namespace

extern "C" {

int vexg_abi() {
  return VEXG_ABI;
}

const char* vexg_version() {
  return GetLibraryVersion();
}

int vexg_init(char** fault) {
  return Enter(fault, "the library can't be made ready", [] { return 1; });
}

char* vexg_run(const char* document, uint8_t* abort, double* progress, char** fault) {
  return Enter(fault, "the result could not be written", [&]() -> char* {
    if (document == nullptr) {
      SetFault("there is no document");
      return nullptr;
    }
    const String result = RunDocument(String(document), abort, progress);
    return result.GetLength() != 0 ? Hand(result.ToUTF8()) : nullptr;
  });
}

int vexg_read(const char* raster, const vexg_block* block, uint8_t* abort, char** fault) {
  return Enter(fault, "the block could not be read", [&] {
    return int{WithRaster(raster, [&](BasicRaster& found) {
      return block != nullptr && ReadBlock(found, *block, LentAbortFlag(abort));
    })};
  });
}

int vexg_write(const char* raster, const vexg_block* block, uint8_t* abort, char** fault) {
  return Enter(fault, "the block could not be written", [&] {
    return int{WithRaster(raster, [&](BasicRaster& found) {
      return block != nullptr && WriteBlock(found, *block, LentAbortFlag(abort));
    })};
  });
}

char* vexg_describe(const char* raster, char** fault) {
  return Enter(fault, "the raster can't be described", [&] {
    return WithRaster(raster, [](const BasicRaster& found) { return Hand(DescribeRaster(found)); });
  });
}

char* vexg_commands(char** fault) {
  return Enter(fault, "the commands can't be listed", [] { return Hand(CommandsAsJson()); });
}

int vexg_close(const char* raster, char** fault) {
  return Enter(fault, "the raster could not be closed", [&]() -> int {
    raster != nullptr ? Store().Close(raster) : Store().CloseAll();
    if (raster == nullptr) JoinThreads(1.0);
    const String why = TakeFault();
    if (why.GetLength() == 0) return 1;
    SetFault(why);
    return 0;
  });
}

int vexg_thread_limit(int threads, char** fault) {
  return Enter(fault, "the threads can't be limited", [&]() -> int {
    static std::mutex mutex;
    static std::unique_ptr<ThreadLimit> limit;
    const std::lock_guard lock(mutex);
    if (threads < 0) {
      SetFault("a limit of threads is 0 or more");
      return 0;
    }
    limit.reset();
    if (threads > 0) limit = std::make_unique<ThreadLimit>(static_cast<unsigned>(threads));
    return static_cast<int>(ThreadLimit::GetCurrent());
  });
}

void vexg_free(char* text) {
  std::free(text);
}

}  // extern "C"
