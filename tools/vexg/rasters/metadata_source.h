#pragma once

#include <string>

#include "foundation/array.h"
#include "metadata/metadata_source.h"

namespace lumo::host {

/// FindMetadataSource for a word of the command line. Throws HostError when the format can't be
/// found.
MetadataSource ParseMetadataSource(const std::string& text);

/// The connection strings of a source. Throws HostError for a name that a job can't carry.
Array<String> ConnStringsOf(const MetadataSource& source);

}  // namespace lumo::host
