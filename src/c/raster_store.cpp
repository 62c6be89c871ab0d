#include "c/raster_store.h"

#include <algorithm>

#include "commands/catalog.h"
#include "commands/job_parser.h"
#include "commands/job_writer.h"
#include "foundation/fault.h"
#include "platform/process.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo {
namespace {

/// The job that opens a source by its connection strings.
String OpeningOf(const std::string& connStrings) {
  JobWriter writer;
  JobWriterCommand* const open = writer.AddCommand("open", "OpenRasterCommand");
  open->AddInput("ConnStr", String(connStrings));
  open->AddInput("CheckSource", SourceCheck::kCompared);
  return writer.Write();
}

/// The output by which a command gives what it has opened; null for a command that opens nothing,
/// or makes a file by running.
const char* OpenedOutput(const CommandDescriptor& descriptor) {
  if (descriptor.id == String("CreateRasterCommand")) return nullptr;
  const CommandDeclaration* const declaration = descriptor.command->GetDeclaration();
  if (declaration == nullptr) return nullptr;
  for (const OutputDeclaration& output : declaration->outputs) {
    if (output.kind == ValueKind::kURI && output.returned) return output.name;
  }
  return nullptr;
}

/// Why the job can't be that of a raster; no text when it can.
String FindFault(const Job& job) {
  for (const String& fault : job.faults) return fault;
  for (const UnknownCommand& unknown : job.unknown) return unknown.GetReason(true);
  if (job.commands.GetCount() == 0) return "the job of a raster opens one at least";
  for (const CommandDescriptorPtr& descriptor : job.commands) {
    if (OpenedOutput(*descriptor) != nullptr) continue;
    return descriptor->id + ": the job of a raster only opens sources and stands views on them";
  }
  return {};
}

/// Runs the job of a raster. @return the URIs that it opened, that of the raster last; none, with
/// the fault text set, when a command failed.
std::vector<URI> Open(const String& document) {
  Job job;
  JobParser(job).Parse(document);
  job.ipc = IPCPtr();
  const String fault = FindFault(job);
  if (fault.GetLength() != 0) {
    SetFault(fault);
    return {};
  }
  RunJob(job);
  std::vector<URI> uris;
  for (const CommandDescriptorPtr& descriptor : job.commands) {
    if (descriptor->command->GetResult() != CommandResult::kSuccess) {
      SetFault(descriptor->GetReason().GetLength() != 0 ? descriptor->GetReason()
                                                        : descriptor->id + " failed");
      return {};
    }
    Map<String, String> returns;
    descriptor->command->GetReturns(returns);
    uris.push_back(ParseValue<URI>(returns.Find(OpenedOutput(*descriptor))));
  }
  return uris;
}

}  // namespace

NamedRaster::NamedRaster(const std::string& text) : session_(platform::ProcessNumber()) {
  const catalog::SessionScope scope(&session_);
  const std::size_t first = text.find_first_not_of(" \t\r\n");
  const bool isJob = first != std::string::npos && text[first] == '<';
  const std::vector<URI> uris = Open(isJob ? String(text) : OpeningOf(text));
  if (uris.empty()) return;
  for (const URI& uri : uris) {
    const BasicRasterPtr raster(catalog::Find(uri));
    if (raster) opened_.push_back(raster);
  }
  raster_ = BasicRasterPtr(catalog::Find(uris.back()));
  if (!raster_) SetFault("the last command of the job gives no raster");
}

NamedRaster::~NamedRaster() {
  raster_ = BasicRasterPtr();
  opened_.clear();
  session_.ReleaseAll();
}

bool NamedRaster::IsUpToDate() const {
  return std::all_of(opened_.begin(), opened_.end(), [](const BasicRasterPtr& raster) {
    const auto* const source = dynamic_cast<const SourceRaster*>(raster.Get());
    return source == nullptr || source->IsUpToDate();
  });
}

/// The slot of a text, made where it isn't there.
/// @param dropped  [out] the slot that went for it.
RasterStore::SlotPtr RasterStore::FindSlot(const std::string& text, SlotPtr& dropped) {
  const std::lock_guard lock(mutex_);
  SlotPtr& slot = slots_[text];
  if (!slot) slot = std::make_shared<Slot>();
  slot->used = ++uses_;
  SlotPtr found = slot;
  if (slots_.size() > capacity_) {
    const auto oldest = std::min_element(
        slots_.begin(), slots_.end(),
        [](const auto& a, const auto& b) { return a.second->used < b.second->used; });
    dropped = oldest->second;
    slots_.erase(oldest);
  }
  return found;
}

std::shared_ptr<const NamedRaster> RasterStore::Get(const std::string& text) {
  SlotPtr dropped;  // goes after the locks
  const SlotPtr slot = FindSlot(text, dropped);
  const std::lock_guard lock(slot->opening);
  if (slot->raster && slot->raster->IsUpToDate()) return slot->raster;
  slot->raster.reset();
  auto opened = std::make_shared<const NamedRaster>(text);
  if (!opened->Raster()) return nullptr;
  slot->raster = opened;
  return opened;
}

void RasterStore::Close(const std::string& text) {
  SlotPtr dropped;
  const std::lock_guard lock(mutex_);
  const auto at = slots_.find(text);
  if (at == slots_.end()) return;
  dropped = at->second;
  slots_.erase(at);
}

void RasterStore::CloseAll() {
  std::map<std::string, SlotPtr, std::less<>> dropped;
  const std::lock_guard lock(mutex_);
  dropped.swap(slots_);
}

}  // namespace lumo
