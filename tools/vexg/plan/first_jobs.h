#pragma once

#include "plan/job_cut.h"
#include "plan/job_slices.h"

namespace lumo::host {

/// Adds the jobs of what has to be there before the parts of a job begin: one, or where something
/// of it is done in shares of the scenes of a mosaic three kinds, those of the shares in the
/// middle.
/// @param parts   into how many shares it is divided.
/// @param memory  bytes that a worker should have for each of them.
void AddFirstJobs(const JobCommands& job, const JobSlices& slices, const CutRequest& request,
                  unsigned parts, std::uint64_t memory, CutJobs& made);

}  // namespace lumo::host
