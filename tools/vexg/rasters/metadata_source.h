#pragma once

#include <string>

#include "foundation/array.h"

namespace lumo::host {

/// Metadata as the command line names them.
struct MetadataSource {
  std::string format;  ///< word of the metadata format
  std::string file;
};

/// Takes "FORMAT:FILE" apart, or finds the format of "FILE" by its ending and, of XML files, by
/// what stands in it. The header beside an ORVA raster stands for the raster. Throws HostError when
/// the format can't be found.
MetadataSource ParseMetadataSource(const std::string& text);

/// The connection strings of a source. Throws HostError for a name that a job can't carry.
Array<String> ConnStringsOf(const MetadataSource& source);

}  // namespace lumo::host
