#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "plan/job_commands.h"
#include "plan/row_parts.h"

namespace lumo::host {

/// Says into what a job is cut.
struct CutRequest {
  std::uint64_t parts = 0;       ///< how many; 0: as many as partMemory asks for
  std::uint64_t partMemory = 0;  ///< bytes of the pixels of a part
  unsigned threads = 1;          ///< of each worker
  std::string folder;            ///< of the plan, absolute; what parts make goes there
  Join join = Join::kFile;       ///< of the lines of rasters
};

/// One job of several into which one was cut.
struct CutJob {
  std::string name;                    ///< of its document, without the ending
  std::vector<std::size_t> dependsOn;  ///< jobs before it that have to be done
  JobCommands job;
  std::uint64_t memory = 0;  ///< bytes that a worker should have
  unsigned threads = 1;
};

/// The jobs of which one was cut, in an order in which they may run.
struct CutJobs {
  std::vector<CutJob> jobs;
  std::vector<std::string> notes;  ///< a line for each command that isn't divided
};

/// Cuts a job by what its commands declare, see commands/division.h:
///
/// - first what has to be there before anything is divided, as a job of its own;
/// - then the parts, with what each needs of the job: open sources, views;
/// - last the job itself, where what the parts have done takes the place of the work.
///
/// A command that works on what another divided one gives has its parts behind those of that one.
/// A job in which nothing can be divided is one part.
///
/// Opens sources to learn their size, and reads no pixel. Throws HostError where one can't be
/// opened.
CutJobs CutIntoJobs(const JobCommands& job, const CutRequest& request);

}  // namespace lumo::host
