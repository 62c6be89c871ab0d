#pragma once

#include <string>

namespace lumo::gdal {

/// Judges the further files that an HDF5 file names: external storage, sources of virtual datasets
/// and external links, which the HDF5 library opens by itself. False, with the fault set, when the
/// access policy keeps one of them out. True for a file that isn't HDF5.
bool MayReachHdf5Files(const std::string& path);

/// Keeps the HDF5 library from writing its own lines to the standard error stream on this thread.
void SilenceHdf5();

}  // namespace lumo::gdal
