#include "plan/first_jobs.h"

#include <filesystem>
#include <map>
#include <set>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "plan/job_measure.h"

namespace lumo::host {
namespace {

class FirstJobs {
 public:
  FirstJobs(const JobCommands& job, const JobSlices& slices, const CutRequest& request,
            unsigned parts, std::uint64_t memory)
      : job_(job), slices_(slices), request_(request), parts_(parts), memory_(memory) {}

  void AddTo(CutJobs& made) const {
    std::vector<std::size_t> shared;
    for (std::size_t at = 0; at < slices_.GetFirstEnd() && parts_ > 1; ++at) {
      if (slices_.IsFirstInShares(at)) shared.push_back(at);
    }
    if (shared.empty()) return AddFirst("prepare", 0, slices_.GetFirstEnd(), {}, made);
    AddFirst("prepare", 0, shared.front(), {}, made);
    const std::vector<std::size_t> before(made.jobs.size(), 0);
    FilesOfShares files;
    for (unsigned part = 0; part < parts_; ++part) {
      made.jobs.push_back(ShareOf(shared, part, before, files));
    }
    AddFirst("gather", shared.front(), slices_.GetFirstEnd(), files, made);
  }

 private:
  using FilesOfShares = std::map<std::size_t, std::vector<std::string>>;  // by command

  const JobCommand& At(std::size_t at) const { return job_.commands[at]; }

  CutJob ShareOf(const std::vector<std::size_t>& shared, unsigned part,
                 const std::vector<std::size_t>& before, FilesOfShares& files) const {
    CutJob made{fmt::format("scenes-{:04}", part), before, job_.WithoutCommands()};
    std::set<std::size_t> steps;
    for (const std::size_t at : shared) {
      for (const std::size_t step : slices_.SliceOf(At(at), at)) {
        if (!slices_.IsFirst(step)) steps.insert(step);
      }
    }
    for (const std::size_t at : steps) made.job.commands.push_back(At(at));
    for (std::size_t i = 0; i < shared.size(); ++i) {
      const std::string name = fmt::format("{}-{}.share", made.name, i + 1);
      const std::string file = (std::filesystem::path(request_.folder) / name).string();
      JobCommand share = At(shared[i]);
      share.outputs.clear();
      share.Set(kShareInput, NumberArray({part, parts_}));
      share.Set(kShareFileInput, file);
      made.job.commands.push_back(share);
      files[shared[i]].push_back(file);
    }
    made.job.AddCloses(OpenedBy(steps));
    made.memory = memory_;
    made.threads = request_.threads;
    return made;
  }

  std::vector<std::string> OpenedBy(const std::set<std::size_t>& steps) const {
    std::vector<std::string> opened;
    for (const std::size_t at : steps) {
      for (const JobOutput& output : At(at).outputs) {
        if (NamesRaster(output)) opened.push_back(output.variable);
      }
    }
    return opened;
  }

  /// Adds a job of the commands that come first, from one to before another, with what they need.
  void AddFirst(const char* name, std::size_t begin, std::size_t end, const FilesOfShares& shares,
                CutJobs& made) const {
    CutJob first{name, {}, job_.WithoutCommands()};
    std::set<std::size_t> steps;
    bool hasWork = false;
    for (std::size_t at = 0; at < end; ++at) {
      const bool isFirst = slices_.IsFirst(at);
      if (At(at).id == "CreateRasterCommand" || (isFirst && at < begin)) continue;
      hasWork = hasWork || isFirst;
      steps.insert(at);
    }
    if (!hasWork) return;
    for (const std::size_t at : steps) {
      JobCommand command = At(at);
      const auto files = shares.find(at);
      if (files != shares.end()) command.Set(kShareFilesInput, JoinedByBars(files->second));
      first.job.commands.push_back(command);
    }
    first.job.AddCloses(OpenedBy(steps));
    first.memory = memory_;
    first.threads = request_.threads;
    for (std::size_t job = 0; job < made.jobs.size(); ++job) first.dependsOn.push_back(job);
    made.jobs.push_back(std::move(first));
  }

  const JobCommands& job_;
  const JobSlices& slices_;
  const CutRequest& request_;
  const unsigned parts_;
  const std::uint64_t memory_;
};

}  // namespace

void AddFirstJobs(const JobCommands& job, const JobSlices& slices, const CutRequest& request,
                  unsigned parts, std::uint64_t memory, CutJobs& made) {
  FirstJobs(job, slices, request, parts, memory).AddTo(made);
}

}  // namespace lumo::host
