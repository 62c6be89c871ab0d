#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "foundation/sub_rect.h"
#include "jobs/raster_job.h"
#include "output/json_number.h"

namespace lumo::host {

// The library as the viewer uses it: by the door for C, whose functions run on any thread, with
// rasters that are named by the job that opens them and stay open between calls.
//
// Failure: HostError, with the library's own line.

/// Runs a job and gives the results of its commands by name. What it opened and did not close stays
/// open.
/// @param abort     a byte that any thread may set to 1 to abort the job; null for none.
/// @param progress  gets the fraction done; null for none.
JobResults RunDraft(const JobDraft& draft, std::uint8_t* abort = nullptr,
                    double* progress = nullptr);

/// The same for a job that opens a source anew in another way, as with a pyramid to be built: what
/// the viewer holds open is closed before, and opened again when it is asked for.
JobResults RunOpening(const JobDraft& draft);

/// Tells what a raster is; docs/c-door.md has the members.
/// @param raster  a job that opens it.
Json DescribeNamed(const std::string& raster);

/// A block of pixels, band after band, and a state byte for each value.
struct NamedBlock {
  std::vector<unsigned char> pixels;
  std::vector<unsigned char> states;
};

/// Reads a block of some bands.
/// @param code  of the pixel type.
NamedBlock ReadNamed(const std::string& raster, const SubRect& rect,
                     const std::vector<std::uint32_t>& bands, unsigned code);

}  // namespace lumo::host
