#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "options/option_values.h"
#include "rasters/map_points.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct TransformOptions {
  std::string from;
  std::string to;
  SourceOptions source;
  RasterJobOptions job;
  bool inverse = false;
};

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

/// Carries points from one place to another: an array of (points, 2), or of (points, 3) with
/// heights where `UsesHeights`.
class Carrier {
 public:
  virtual ~Carrier() = default;
  virtual bool UsesHeights() const = 0;
  virtual void Carry(Array<double>& points) const = 0;
};

/// From one coordinate system to another.
class SystemCarrier final : public Carrier {
 public:
  SystemCarrier(const CoordSys& from, const CoordSys& to) : from_(from), to_(to) {}
  bool UsesHeights() const override { return false; }
  void Carry(Array<double>& points) const override { MapToMap(from_, to_, points); }

 private:
  CoordSys from_;
  CoordSys to_;
};

/// From pixels of a raster to its map, or to another one. Pixels count from the corner of the first
/// one, whatever the model.
class PixelCarrier final : public Carrier {
 public:
  /// @param to  the system of the map; an empty one for the raster's own.
  PixelCarrier(const GeoRefPtr& geoRef, const CoordSys& to) : geoRef_(geoRef), to_(to) {}

  bool UsesHeights() const override { return geoRef_->GetType() == GeoRef::kRpc; }
  void Carry(Array<double>& points) const override {
    ShiftPixels(points, FirstPixel(*geoRef_));
    geoRef_->PixelToMap(points);
    if (!to_.IsEmpty()) MapToMap(geoRef_->CoordinateSystem(), to_, points);
  }

 private:
  GeoRefPtr geoRef_;
  CoordSys to_;
};

/// From the map of a raster, or another one, to its pixels.
class MapCarrier final : public Carrier {
 public:
  MapCarrier(const GeoRefPtr& geoRef, const CoordSys& from) : geoRef_(geoRef), from_(from) {}

  bool UsesHeights() const override { return geoRef_->GetType() == GeoRef::kRpc; }
  void Carry(Array<double>& points) const override { MapToPixels(*geoRef_, from_, points); }

 private:
  GeoRefPtr geoRef_;
  CoordSys from_;
};

/// Lines that are carried together; small enough that a user at a terminal sees each answer.
class Batch {
 public:
  explicit Batch(const Carrier& carrier) : carrier_(carrier) {}

  void Add(const Line& line) {
    // Points with heights and points without are arrays of different shapes.
    if (!lines_.empty() && HasHeight(line) != HasHeight(lines_.front())) Flush();
    lines_.push_back(line);
  }
  std::size_t Size() const { return lines_.size(); }

  /// Carries the lines that were added and writes them.
  void Flush() {
    if (lines_.empty()) return;
    const unsigned width = HasHeight(lines_.front()) ? 3 : 2;
    Array<double> points{ArrayDims(static_cast<unsigned>(lines_.size()), width)};
    double* next = points.begin();
    for (const Line& line : lines_) {
      *next++ = line.x;
      *next++ = line.y;
      if (width == 3) *next++ = std::strtod(line.height.c_str(), nullptr);
    }
    carrier_.Carry(points);
    std::string text;
    for (std::size_t i = 0; i < lines_.size(); ++i) {
      const double x = points[width * i];
      const double y = points[width * i + 1];
      text += std::isfinite(x) && std::isfinite(y) ? fmt::format("{} {}", x, y) : "nan nan";
      if (!lines_[i].height.empty()) text.append(" ").append(lines_[i].height);
      text += '\n';
    }
    std::fwrite(text.data(), 1, text.size(), stdout);
    std::fflush(stdout);
    lines_.clear();
  }

 private:
  bool HasHeight(const Line& line) const { return carrier_.UsesHeights() && !line.height.empty(); }

  const Carrier& carrier_;
  std::vector<Line> lines_;
};

JobDraft GeoRefDraft(const SourceOptions& source) {
  JobDraft draft;
  AddOpen(draft, "raster", source);
  AddQuery(draft, "raster", "$raster");
  draft.Close("close", "$raster");
  return draft;
}

/// The geo-reference of the file. Throws HostError when it has none.
GeoRefPtr ReadGeoRef(const TransformOptions& options) {
  JobSession session(options.job);
  const RasterInfo info = ReadInfo(session.Run(GeoRefDraft(options.source)), "raster");
  if (info.geoRef) return info.geoRef;
  throw HostError(kExitFailed, options.source.file + ": has no geo-reference");
}

std::unique_ptr<Carrier> MakeCarrier(const TransformOptions& options) {
  if (options.source.file.empty()) {
    return std::make_unique<SystemCarrier>(ReadSystem("--from", options.from),
                                           ReadSystem("--to", options.to));
  }
  const std::string& named = options.inverse ? options.from : options.to;
  const char* const option = options.inverse ? "--from" : "--to";
  const CoordSys system = named.empty() ? CoordSys() : ReadSystem(option, named);
  const GeoRefPtr geoRef = ReadGeoRef(options);
  if (options.inverse) {
    CheckMapToPixels(*geoRef, system, options.source.file, "--inverse");
    return std::make_unique<MapCarrier>(geoRef, system);
  }
  if (!named.empty() && geoRef->CoordinateSystem().IsEmpty()) {
    throw HostError(kExitFailed,
                    options.source.file + ": --to: the raster has no coordinate system");
  }
  return std::make_unique<PixelCarrier>(geoRef, system);
}

/// Throws for options that don't go together.
void CheckOptions(const TransformOptions& options) {
  const bool hasFile = !options.source.file.empty();
  if (hasFile && !(options.inverse ? options.to : options.from).empty()) {
    throw HostError(kExitUsage, options.inverse
                                    ? "--to: with --inverse the output is pixels of the file"
                                    : "--from: without --inverse the input is pixels of the file");
  }
  if (hasFile) return;
  if (options.from.empty()) throw HostError(kExitUsage, "--from is required without a file");
  if (options.to.empty()) throw HostError(kExitUsage, "--to is required without a file");
  if (options.inverse || options.job.printJob || !options.job.server.name.empty()) {
    throw HostError(kExitUsage, "--inverse, --server and --print-job are for a file");
  }
}

void CarryInput(const Carrier& carrier) {
  constexpr std::size_t kBatch = 4096;
  Batch batch(carrier);
  std::ios::sync_with_stdio(false);  // so that the stream knows what has arrived
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
}

int Transform(const TransformOptions& options) {
  CheckOptions(options);
  if (options.job.printJob) {
    std::cout << GeoRefDraft(options.source).Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  CarryInput(*MakeCarrier(options));
  return kExitSuccess;
}

const VerbRegistration transformRegistration(
    "transform",
    "Carries points from one coordinate system to another, or from a file's pixels to its map",
    [](OptionSet& line) {
      const auto options = std::make_shared<TransformOptions>();
      line.AddNote(
          "Reads lines \"x y [z]\" from standard input: longitude or easting first, then latitude "
          "or northing. Writes x y in the other system with all digits; z is passed on. A point "
          "that can't be carried is \"nan nan\".");
      line.AddNote(
          "With a file, x y are pixels: 0 0 is the corner of the first pixel, 0.5 0.5 its middle. "
          "z is a height in metres, for files with a camera model.");
      line.AddExample("echo \"-75 40\" | vexg transform --from EPSG:4326 --to EPSG:32618");
      line.AddExample("echo \"0.5 0.5\" | vexg transform scene.tif");
      line.AddExample("echo \"-34.9 -8.0\" | vexg transform scene.tif --inverse --from EPSG:4326");
      line.Add("file", options->source.file, "A raster: from its pixels to its map").IsFile();
      line.Add("--inverse", options->inverse, "From the map of the file to its pixels");
      line.Add("--from", options->from,
               "The system of the input: WKT, EPSG:n or PROJ; with --inverse the file's own by "
               "default")
          .Takes(CoordSysName());
      line.Add("--to", options->to, "The system of the output; the file's own by default")
          .Takes(CoordSysName());
      options->source.AddFormatTo(line);
      options->job.AddTo(line);
      return VerbRegistration::Work([options] { return Transform(*options); });
    });

}  // namespace
}  // namespace lumo::host
