#include "viewer/job_door.h"

#include <memory>
#include <mutex>
#include <shared_mutex>

#include "c/vexg.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct FreeText {
  void operator()(char* text) const { vexg_free(text); }
};
using LentText = std::unique_ptr<char, FreeText>;

/// Held shared where a raster may be opened by its name, and alone where none may.
std::shared_mutex& Opening() {
  static std::shared_mutex mutex;
  return mutex;
}

[[noreturn]] void Throw(char* fault) {
  const LentText owned(fault);
  throw HostError(kExitFailed, fault != nullptr ? fault : "the library gave no reason");
}

}  // namespace

JobResults RunDraft(const JobDraft& draft, std::uint8_t* abort, double* progress) {
  char* fault = nullptr;
  const LentText text(vexg_run(draft.Write().ToUTF8().c_str(), abort, progress, &fault));
  if (!text) Throw(fault);
  JobResults results;
  JobResultParser(results).Parse(String(text.get()));
  for (const JobDraft::StepInfo& step : draft.GetSteps()) {
    const JobResult& result = results.Find(step.name);
    if (result.result == "Success") continue;
    const std::string reason = result.reason.ToUTF8();
    throw HostError(kExitFailed, reason.empty() ? step.id.ToUTF8() + " failed" : reason);
  }
  return results;
}

JobResults RunOpening(const JobDraft& draft) {
  const std::unique_lock alone(Opening());
  vexg_close(nullptr, nullptr);
  return RunDraft(draft);
}

Json DescribeNamed(const std::string& raster) {
  const std::shared_lock shared(Opening());
  char* fault = nullptr;
  const LentText text(vexg_describe(raster.c_str(), &fault));
  if (!text) Throw(fault);
  return Json::parse(text.get());
}

NamedBlock ReadNamed(const std::string& raster, const SubRect& rect,
                     const std::vector<std::uint32_t>& bands, unsigned code) {
  const std::size_t values = std::size_t{rect.Width()} * rect.Height() * bands.size();
  NamedBlock read;
  read.pixels.resize(values * DataTypeBytes(code));
  read.states.resize(values);
  vexg_block block{};
  block.rect = {rect.left, rect.top, rect.right, rect.bottom};
  block.bands = bands.data();
  block.band_count = static_cast<std::uint32_t>(bands.size());
  block.order = VEXG_BSQ;
  block.data_type = code;
  block.pixels = read.pixels.data();
  block.size = read.pixels.size();
  block.states = read.states.data();
  const std::shared_lock shared(Opening());
  char* fault = nullptr;
  if (vexg_read(raster.c_str(), &block, nullptr, &fault) == 0) Throw(fault);
  return read;
}

}  // namespace lumo::host
