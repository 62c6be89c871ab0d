#pragma once

#include "foundation/color.h"
#include "jobs/raster_job.h"

namespace lumo::host {

/// The colour table of a band of an open raster. Throws HostError.
Palette ReadPalette(JobSession& session, const String& raster, unsigned band);

}  // namespace lumo::host
