#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "foundation/sub_rect.h"
#include "jobs/raster_job.h"
#include "output/json_number.h"

namespace lumo::host {

/// A block of pixels, band after band, and a state byte for each value.
struct NamedBlock {
  std::vector<unsigned char> pixels;
  std::vector<unsigned char> states;
};

/// The library as the viewer uses it, in this process or in a server: jobs that open, ask and
/// close, and rasters that are named by the job that opens them and stay open between calls.
///
/// Threads: any, several at once. Failure: HostError, with the library's own line.
class JobDoor {
 public:
  JobDoor() = default;
  virtual ~JobDoor() = default;
  JobDoor(const JobDoor&) = delete;
  JobDoor& operator=(const JobDoor&) = delete;

  /// Runs a job and gives the results of its commands by name. What it opened and did not close
  /// stays open.
  /// @param abort     a byte that any thread may set to 1 to abort the job; null for none.
  /// @param progress  gets the fraction done; null for none.
  virtual JobResults Run(const JobDraft& draft, std::uint8_t* abort = nullptr,
                         double* progress = nullptr) = 0;

  /// The same for a job that opens a source anew in another way, as with a pyramid to be built:
  /// what the viewer holds open is closed before, and opened again when it is asked for.
  virtual JobResults RunOpening(const JobDraft& draft) = 0;

  /// Tells what a raster is; docs/c-door.md has the members.
  /// @param raster  a job that opens it.
  virtual Json Describe(const JobDraft& raster) = 0;

  /// Reads a block of some bands.
  /// @param code  of the pixel type.
  virtual NamedBlock Read(const JobDraft& raster, const SubRect& rect,
                          const std::vector<std::uint32_t>& bands, unsigned code) = 0;

  /// Throws HostError when jobs can't be run any more.
  virtual void Check() {}
};

/// Makes the door to the library in this process.
std::unique_ptr<JobDoor> MakeOwnDoor();

/// Reads the results of a job. Throws HostError with the reason of the first command that failed.
JobResults ReadResults(const JobDraft& draft, const String& text);

}  // namespace lumo::host
