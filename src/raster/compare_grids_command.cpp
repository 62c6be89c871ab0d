#include <algorithm>
#include <cmath>

#include "georef/affine_link.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

const CommandDeclaration kCompare{
    "CompareRasterGridsCommand",
    "Rasters",
    "Tells how the grid of a raster lies in that of another one. A command of this library's own.",
    {RasterURIInput(), {"OtherURI", Presence::kRequired, ValueKind::kURI, "the other one"}},
    {{"SameSize", ValueKind::kBoolean, "both have as many samples and lines"},
     {"SameSystem", ValueKind::kBoolean, "both have one coordinate system, or none"},
     {"ShiftX", ValueKind::kNumber,
      "sample of the other raster where the upper left corner of this one lies; absent, as all "
      "that "
      "follow, where one has no place or can't be carried"},
     {"ShiftY", ValueKind::kNumber, "the line there"},
     {"ScaleX", ValueKind::kNumber,
      "pixels of the other raster along the upper edge, for each pixel"},
     {"ScaleY", ValueKind::kNumber, "the same along the left edge"},
     {"Rotation", ValueKind::kNumber, "degrees, clockwise, by which the upper edge is turned"},
     {"LargestOffset", ValueKind::kNumber,
      "pixels of the other raster by which a place in the raster is off at most, when pixels are "
      "taken by their sample and line"}}};

class CompareRasterGridsCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster("URI"), other = FindRaster("OtherURI");
    if (!raster || !other) return Fail();
    Write("SameSize", raster->Samples() == other->Samples() && raster->Lines() == other->Lines());
    const GeoRefPtr grid = raster->GetRasterDef().geoRef, otherGrid = other->GetRasterDef().geoRef;
    const CoordSys none;
    const CoordSys& system = grid ? grid->CoordinateSystem() : none;
    const CoordSys& otherSystem = otherGrid ? otherGrid->CoordinateSystem() : none;
    Write("SameSystem", system.IsEmpty() == otherSystem.IsEmpty() &&
                            (system.IsEmpty() || system.IsEqual(otherSystem)));
    if (grid && otherGrid) WritePlace(*grid, *otherGrid, raster->Samples(), raster->Lines());
    return Succeed();
  }

  /// Carries a net of places, corners and edges included.
  void WritePlace(const GeoRef& grid, const GeoRef& other, unsigned samples, unsigned lines) {
    constexpr unsigned kSide = 9;
    Array<double> points{ArrayDims(kSide * kSide, 2)};
    const auto at = [](unsigned i, unsigned size) { return double(size) * i / (kSide - 1); };
    for (unsigned i = 0; i < kSide * kSide; ++i) {
      points[2 * i] = at(i % kSide, samples);
      points[2 * i + 1] = at(i / kSide, lines);
    }
    Array<double> carried = points;
    if (!CarryPixels(grid, other, carried)) return;
    double offset = 0;
    for (unsigned i = 0; i < kSide * kSide; ++i) {
      const double x = carried[2 * i] - points[2 * i], y = carried[2 * i + 1] - points[2 * i + 1];
      if (!std::isfinite(x) || !std::isfinite(y)) return;
      offset = std::max(offset, std::hypot(x, y));
    }
    constexpr unsigned kRight = kSide - 1, kBottom = kSide * kRight;
    const double acrossX = carried[2 * kRight] - carried[0];
    const double acrossY = carried[2 * kRight + 1] - carried[1];
    const double downX = carried[2 * kBottom] - carried[0];
    const double downY = carried[2 * kBottom + 1] - carried[1];
    Write("ShiftX", carried[0]);
    Write("ShiftY", carried[1]);
    Write("ScaleX", std::hypot(acrossX, acrossY) / samples);
    Write("ScaleY", std::hypot(downX, downY) / lines);
    constexpr double kDegrees = 180 / 3.14159265358979323846;
    Write("Rotation", std::atan2(acrossY, acrossX) * kDegrees);
    Write("LargestOffset", offset);
  }
};

const CommandFactoryT<CompareRasterGridsCommand> compareRasterGridsFactory(kCompare);

}  // namespace
}  // namespace lumo
