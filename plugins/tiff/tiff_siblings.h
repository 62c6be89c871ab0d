#pragma once

#include <string>

namespace lumo::tiff {

/// Tells which files beside a TIFF file may describe it.
enum class Company {
  kNone,
  kSideFile,  ///< nothing but `NAME.aux.xml`, where GDAL stores values
  kOthers     ///< what lies there is GDAL's to judge
};

/// Looks for files whose names begin like that of a TIFF file, and for the headers that vendors put
/// beside their scenes.
///
/// The names in a folder are kept until the folder changes, so that thousands of files in one
/// folder don't cost as many looks at each of them. Threads: any number.
Company CompanyOf(const std::string& path);

}  // namespace lumo::tiff
