#pragma once

#include <string>

namespace lumo::gdal {

/// Judges the sources that a virtual raster names, which GDAL opens as pixels are read. True for a
/// process that may open everything.
///
/// In a server a source is a file that the policy lets it reach, of a format whose files name no
/// further ones; of another virtual raster its own sources are judged in turn. Addresses, memory
/// and names inside other files are none.
///
/// @param name  the file of the virtual raster.
/// @return false, with the fault set, where a source is not allowed, or the file can't be read.
bool MayUseVrtSources(const std::string& name);

}  // namespace lumo::gdal
