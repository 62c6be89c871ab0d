#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "georef/std_georef.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct TransformOptions {
  std::string from;
  std::string to;
};

CoordSys ReadSystem(const std::string& option, const std::string& text) {
  CoordSys system;
  if (!system.SetFromString(String(text)) || system.Type() == 0) {
    throw HostError(kExitUsage, option + ": \"" + text +
                                    "\" is no coordinate system that can be used here; give WKT, "
                                    "\"EPSG:n\" or a PROJ string");
  }
  return system;
}

/// One line of input: two numbers, and a third that is passed on as it stands.
struct Line {
  double x = NAN;
  double y = NAN;
  std::string height;
};

/// False for a blank line; throws for one that does not hold two or three numbers.
bool ReadLine(const std::string& text, std::size_t number, Line& line) {
  std::istringstream in(text);
  std::string words[4];
  int count = 0;
  while (count < 4 && in >> words[count]) ++count;
  if (count == 0) return false;
  std::array<double, 3> values{};
  bool isGood = count == 2 || count == 3;
  for (int i = 0; i < count && isGood; ++i) {
    char* end = nullptr;
    values[static_cast<std::size_t>(i)] = std::strtod(words[i].c_str(), &end);
    isGood = *end == '\0';
  }
  if (!isGood) {
    throw HostError(kExitUsage,
                    fmt::format("line {} of the input is not \"x y [z]\": {}", number, text));
  }
  line = {values[0], values[1], words[2]};
  return true;
}

/// Lines that are carried together; small enough that a user at a terminal sees each answer.
class Batch {
 public:
  Batch(const CoordSys& from, const CoordSys& to) {
    from_.SetCoordinateSystem(from);
    to_.SetCoordinateSystem(to);
  }

  void Add(const Line& line) { lines_.push_back(line); }
  std::size_t Size() const { return lines_.size(); }

  /// Carries the lines that were added and writes them.
  void Flush() {
    if (lines_.empty()) return;
    Array<double> points{ArrayDims(static_cast<unsigned>(lines_.size()), 2)};
    double* next = points.begin();
    for (const Line& line : lines_) {
      *next++ = line.x;
      *next++ = line.y;
    }
    from_.MapToMap(points, to_);
    std::string text;
    for (std::size_t i = 0; i < lines_.size(); ++i) {
      const double x = points[2 * i];
      const double y = points[2 * i + 1];
      text += std::isfinite(x) && std::isfinite(y) ? fmt::format("{} {}", x, y) : "nan nan";
      if (!lines_[i].height.empty()) text.append(" ").append(lines_[i].height);
      text += '\n';
    }
    std::fwrite(text.data(), 1, text.size(), stdout);
    std::fflush(stdout);
    lines_.clear();
  }

 private:
  StdGeoRef from_;
  StdGeoRef to_;
  std::vector<Line> lines_;
};

int Transform(const TransformOptions& options) {
  constexpr std::size_t kBatch = 4096;
  Batch batch(ReadSystem("--from", options.from), ReadSystem("--to", options.to));
  std::ios::sync_with_stdio(false);  // so that the stream can tell what has arrived
  std::size_t number = 0;
  for (std::string text; std::getline(std::cin, text);) {
    Line line;
    ++number;
    try {
      if (!ReadLine(text, number, line)) continue;
    } catch (const HostError&) {
      batch.Flush();
      throw;
    }
    batch.Add(line);
    const bool waits = std::cin.rdbuf()->in_avail() <= 0;  // for more input: give what there is
    if (waits || batch.Size() == kBatch) batch.Flush();
  }
  batch.Flush();
  if (std::ferror(stdout) != 0) throw HostError(kExitFailed, "standard output can't be written");
  return kExitSuccess;
}

const VerbRegistration registration(
    "transform", "Carries points from one coordinate system to another", [](CLI::App& app) {
      const auto options = std::make_shared<TransformOptions>();
      app.footer(
          "Reads lines \"x y [z]\" from standard input: longitude or easting first, then latitude "
          "or northing. Writes x y in the other system with all digits; z is passed on. A point "
          "that can't be carried is \"nan nan\".");
      app.add_option("--from", options->from, "The system of the input: WKT, EPSG:n or PROJ")
          ->required();
      app.add_option("--to", options->to, "The system of the output")->required();
      return VerbRegistration::Work([options] { return Transform(*options); });
    });

}  // namespace
}  // namespace lumo::host
