#pragma once

#include <cstdlib>
#include <filesystem>
#include <string>

#include "support/source_dir.h"

namespace lumo::test {

/// Path of a file of the sample data: below $VEXG_DATA, else beside the source tree. Empty when it
/// is not there.
inline std::string SampleData(const std::string& name) {
  const char* const set = std::getenv("VEXG_DATA");
  const std::filesystem::path root = set != nullptr
                                         ? std::filesystem::path(set)
                                         : std::filesystem::path(SourceDir()) / "../shared/data";
  std::error_code ignored;
  return std::filesystem::exists(root / name, ignored) ? (root / name).string() : std::string();
}

}  // namespace lumo::test
