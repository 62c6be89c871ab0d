#pragma once

namespace lumo::gdal {

/// Has GDAL read and write plain files through this library, in the whole process, from the first
/// call on. The drivers notice nothing, but
///
/// - an interrupted or short call is carried on, and every failure is noted (FileFaults), also of
///   calls whose result a driver does not look at;
/// - a side file (".aux.xml") that is written anew is made beside the old one, which it replaces
///   when it is whole.
void InstallFileSystem();

}  // namespace lumo::gdal
