#include "plan/job_measure.h"

#include <filesystem>
#include <map>
#include <set>
#include <vector>

#include "jobs/raster_job.h"
#include "platform/temporary_file.h"

namespace lumo::host {
namespace {

/// Files in a folder of their own in the place of those that a job makes, while it is measured.
class Scratch {
 public:
  explicit Scratch(const std::vector<std::string>& files) {
    namespace fs = std::filesystem;
    if (files.empty()) return;
    folder_ = platform::TemporaryFolderBeside((fs::temp_directory_path() / "vexg-plan").string());
    fs::create_directory(folder_);
    for (const std::string& file : files) {
      names_[file] = (fs::path(folder_) / fs::path(file).filename()).string();
    }
  }
  ~Scratch() {
    std::error_code ignored;
    if (!folder_.empty()) std::filesystem::remove_all(folder_, ignored);
  }
  Scratch(const Scratch&) = delete;
  Scratch& operator=(const Scratch&) = delete;

  void Rename(JobCommand& command) const { RenameFiles(names_, command); }

 private:
  std::string folder_;
  std::map<std::string, std::string> names_;
};

void AddTo(JobDraft& draft, const JobCommand& command) {
  JobWriterCommand& step = draft.Step(command.name, command.id.c_str());
  for (const JobInput& input : command.inputs) {
    if (input.isExpanded) {
      step.AddExpandedInput(String(input.name), String(input.value));
    } else {
      step.AddInput(String(input.name), String(input.value));
    }
  }
  for (const JobOutput& output : command.outputs) {
    step.AddOutput(String(output.name), String(output.variable));
  }
}

/// The files that a job makes first.
std::vector<std::string> FirstFiles(const JobCommands& job, std::size_t end) {
  const auto begin = job.commands.begin();
  return FindFiles({begin, begin + static_cast<std::ptrdiff_t>(end)}).inPlace;
}

}  // namespace

bool NamesRaster(const JobOutput& output) {
  return output.name.ends_with("URI");
}

RasterInfo MeasureRaster(const JobCommands& job, const JobSlices& slices,
                         const std::string& variable, std::size_t end) {
  RasterJobOptions options;
  JobSession session(options);
  JobDraft draft;
  std::vector<std::string> opened;
  // The commands that come first have not run yet: those that make the files which are opened run
  // aside.
  const Scratch scratch(FirstFiles(job, slices.GetFirstEnd()));
  std::set<std::size_t> steps;
  for (std::size_t at = 0; at < slices.GetFirstEnd(); ++at) {
    if (!FindFiles({job.commands[at]}).inPlace.empty()) steps.insert(at);
  }
  for (const std::size_t at : slices.SliceFor({variable}, {}, end)) {
    if (!slices.IsFirst(at)) steps.insert(at);
  }
  for (const std::size_t at : steps) {
    JobCommand command = job.commands[at];
    scratch.Rename(command);
    AddTo(draft, command);
    for (const JobOutput& output : command.outputs) {
      if (NamesRaster(output)) opened.push_back(output.variable);
    }
  }
  AddQuery(draft, "measured", String(variable));
  for (auto raster = opened.rbegin(); raster != opened.rend(); ++raster) {
    draft.Close("close." + raster->substr(1), String(*raster));
  }
  return ReadInfo(session.Run(draft), "measured");
}

}  // namespace lumo::host
