#include "viewer/job_door.h"

#include <memory>

#include "c/vexg.h"
#include "verb.h"
#include "viewer/opening_gate.h"

namespace lumo::host {
namespace {

struct FreeText {
  void operator()(char* text) const { vexg_free(text); }
};
using LentText = std::unique_ptr<char, FreeText>;

[[noreturn]] void Throw(char* fault) {
  const LentText owned(fault);
  throw HostError(kExitFailed, fault != nullptr ? fault : "the library gave no reason");
}

/// The door for C, whose functions run on any thread and keep rasters open by their jobs.
class OwnDoor final : public JobDoor {
 public:
  JobResults Run(const JobDraft& draft, std::uint8_t* abort, double* progress) override {
    char* fault = nullptr;
    const LentText text(vexg_run(draft.Write().ToUTF8().c_str(), abort, progress, &fault));
    if (!text) Throw(fault);
    return ReadResults(draft, String(text.get()));
  }

  JobResults RunOpening(const JobDraft& draft) override {
    const auto alone = opening_.EnterAlone();
    vexg_close(nullptr, nullptr);
    return Run(draft, nullptr, nullptr);
  }

  Json Describe(const JobDraft& raster) override {
    const auto shared = opening_.Enter();
    char* fault = nullptr;
    const LentText text(vexg_describe(raster.Write().ToUTF8().c_str(), &fault));
    if (!text) Throw(fault);
    return Json::parse(text.get());
  }

  NamedBlock Read(const JobDraft& raster, const SubRect& rect,
                  const std::vector<std::uint32_t>& bands, unsigned code) override {
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
    const auto shared = opening_.Enter();
    char* fault = nullptr;
    if (vexg_read(raster.Write().ToUTF8().c_str(), &block, nullptr, &fault) == 0) Throw(fault);
    return read;
  }

 private:
  OpeningGate opening_;
};

}  // namespace

std::unique_ptr<JobDoor> MakeOwnDoor() {
  return std::make_unique<OwnDoor>();
}

JobResults ReadResults(const JobDraft& draft, const String& text) {
  JobResults results;
  JobResultParser(results).Parse(text);
  for (const JobDraft::StepInfo& step : draft.GetSteps()) {
    const JobResult& result = results.Find(step.name);
    if (result.result == "Success") continue;
    const std::string reason = result.reason.ToUTF8();
    throw HostError(kExitFailed, reason.empty() ? step.id.ToUTF8() + " failed" : reason);
  }
  return results;
}

}  // namespace lumo::host
