#pragma once

#include <string>

#include "plan/job_commands.h"
#include "plan/job_slices.h"
#include "rasters/raster_source.h"

namespace lumo::host {

/// True for an output that gives the URI of a raster.
bool NamesRaster(const JobOutput& output);

/// Asks a raster that a job opens or makes views on for its description, and reads no pixel. Files
/// that the job makes first are made aside for that.
/// @param variable  that has its URI.
/// @param end       the place in the job before which that is given.
/// Throws HostError for one that can't be opened.
RasterInfo MeasureRaster(const JobCommands& job, const JobSlices& slices,
                         const std::string& variable, std::size_t end);

}  // namespace lumo::host
