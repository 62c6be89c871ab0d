#pragma once

#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "support/temporary_directory.h"

namespace lumo::test {

/// True when `program` is on the PATH.
inline bool HasProgram(const std::string& program) {
  return std::system(("command -v " + program + " >/dev/null 2>&1").c_str()) == 0;
}

/// Runs `command` in a shell on one line of numbers for each point, and gives the numbers of the
/// lines that it writes; what is no number, such as "inf", as strtod has it.
inline std::vector<std::array<double, 3>> RunOnPoints(
    const std::string& command, const std::vector<std::array<double, 3>>& points, int columns = 2) {
  const TemporaryDirectory directory;
  const std::string in = (directory.Path() / "in").string();
  const std::string out = (directory.Path() / "out").string();
  {
    std::ofstream file(in);
    file.precision(17);
    for (const auto& point : points) {
      for (int i = 0; i < columns; ++i) file << point[static_cast<std::size_t>(i)] << ' ';
      file << '\n';
    }
  }
  std::vector<std::array<double, 3>> results;
  if (std::system((command + " <" + in + " >" + out + " 2>/dev/null").c_str()) != 0) return results;
  std::ifstream file(out);
  for (std::string line; std::getline(file, line);) {
    std::array<double, 3> values{};
    const char* at = line.c_str();
    for (double& value : values) {
      char* end = nullptr;
      value = std::strtod(at, &end);
      at = end;
    }
    results.push_back(values);
  }
  return results;
}

}  // namespace lumo::test
