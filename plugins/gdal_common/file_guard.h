#pragma once

#include <string>

#include "gdal_common/source.h"

namespace lumo::gdal {

/// Has GDAL ask the access policy before it opens, makes, renames or removes any file, whoever
/// named it: a user, a link, or the content of another file. Once for the process, before GDAL
/// opens anything.
void InstallFileGuard();

/// Forgets the refusals on this thread so far.
void ForgetRefusals();

/// False, with the fault set, when GDAL was refused a file that is there since ForgetRefusals on
/// this thread: what it has opened without that file is not what its name stands for.
bool WasRefusedNothing();

/// Judges all files that a dataset is made of, as GDAL lists them. False, with the fault set, when
/// one may not be reached. Opens the side files that GDAL had not needed so far.
bool MayReachAllFiles(GDALDatasetH dataset);

}  // namespace lumo::gdal
