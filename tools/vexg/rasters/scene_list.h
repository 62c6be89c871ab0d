#pragma once

#include <string>
#include <vector>

namespace lumo::host {

/// Names the scenes of a mosaic as the command line does: each word is a raster, a list of them, a
/// pattern, or a STAC item or item collection (https://stacspec.org, version 1).
///
/// A pattern has *, ? or [...] in its last part, and gives the files of its folder by their names.
/// A list is a file named *.txt or *.lst, or any file behind an @, with a name a line; empty lines
/// and those that begin with # are left out. Names in lists and collections are relative to the
/// file.
/// @param words  of the command line.
/// @param asset  key of the asset of a STAC item that is meant; empty for the only one that is a
///               raster.
/// @return the names in their order. Throws HostError.
std::vector<std::string> ExpandScenes(const std::vector<std::string>& words,
                                      const std::string& asset);

}  // namespace lumo::host
