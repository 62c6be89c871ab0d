#include "output/saved_values.h"

#include "rasters/raster_target.h"
#include "stats/turn.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kSaveStep = "save";
constexpr const char* kCloseStep = "close.raster";

}  // namespace

void AddSave(JobDraft& draft, const char* command, const String& raster) {
  JobWriterCommand& save = draft.Step(kSaveStep, command);
  save.AddInput("URI", raster);
  save.AddInput("Wait", Waiting::kAlways);
}

void SaveValues(JobSession& session, const SourceOptions& source, const char* command,
                const String& raster, const char* what) {
  JobDraft draft;
  AddSave(draft, command, raster);
  draft.Close(kCloseStep, raster);
  const JobResults results = session.Run(draft, Interrupts::kWait);
  CheckClosed(results, kCloseStep);
  CheckReturn(results, kSaveStep, source.file + ": the " + what + " could not be saved");
}

}  // namespace lumo::host
