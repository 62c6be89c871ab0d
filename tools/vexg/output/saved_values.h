#pragma once

#include "rasters/raster_source.h"

namespace lumo::host {

/// Adds the command, of those that save with a raster what was computed of it.
/// @param raster  a variable or URI.
void AddSave(JobDraft& draft, const char* command, const String& raster);

/// Runs that command on an open raster, and closes the raster, which an interrupt does not end.
/// Throws HostError when something could not be saved.
/// @param what  is saved, for the message.
void SaveValues(JobSession& session, const SourceOptions& source, const char* command,
                const String& raster, const char* what);

}  // namespace lumo::host
