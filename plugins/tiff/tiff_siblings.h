#pragma once

#include <string>

namespace lumo::tiff {

/// True when nothing beside a TIFF file may describe it: no file whose name begins like its own,
/// and none of the headers that vendors put beside their scenes. What lies there is GDAL's to
/// judge.
///
/// The names in a folder are kept until the folder changes, so that thousands of files in one
/// folder don't cost as many looks at each of them. Threads: any number.
bool StandsAlone(const std::string& path);

}  // namespace lumo::tiff
