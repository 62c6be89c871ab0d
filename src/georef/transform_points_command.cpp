#include <cmath>
#include <limits>

#include "commands/command.h"
#include "foundation/fault.h"
#include "georef/std_georef.h"

namespace lumo {
namespace {

const CommandDeclaration kTransform{
    "TransformPointsCommand",
    "Coordinates",
    "Carries points from one coordinate system to another. A command of this library's own.",
    {{"Points", Presence::kRequired, ValueKind::kNumberArray,
      "x and y of each point: easting and northing, or longitude and latitude"},
     {"From", Presence::kRequired, ValueKind::kText,
      "their coordinate system: EPSG:n, WKT or PROJ text"},
     {"To", Presence::kRequired, ValueKind::kText, "that of the result"}},
    {{"Points", ValueKind::kNumberArray,
      "the same points in the other system; nan for one that can't be carried"}}};

class TransformPointsCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    StdGeoRef from, to;
    if (!ReadSystem("From", from) || !ReadSystem("To", to)) return Fail();
    const auto given = Read<Array<double>>("Points");
    if (given.GetCount() == 0 || given.GetCount() % 2 != 0) {
      return Fail("Points: there are two numbers for each point");
    }
    Array<double> points{ArrayDims(given.GetCount() / 2, 2)};
    if (points.GetCount() != given.GetCount()) return Fail("out of memory");
    std::copy(given.begin(), given.end(), points.begin());
    from.MapToMap(points, to);
    for (double& value : points) {
      if (!std::isfinite(value)) value = std::numeric_limits<double>::quiet_NaN();
    }
    Write("Points", points);
    return Succeed();
  }

  bool ReadSystem(const char* input, StdGeoRef& model) {
    CoordSys system;
    TakeFault();
    if (!system.SetFromString(Read<String>(input)) || system.Type() == 0) {
      const String why = TakeFault();
      SetFault(why.GetLength() != 0
                   ? why
                   : std::string(input) +
                         ": there is no such coordinate system with a place on Earth");
      return false;
    }
    model.SetCoordinateSystem(system);
    return true;
  }
};

const CommandFactoryT<TransformPointsCommand> transformPointsFactory(kTransform);

}  // namespace
}  // namespace lumo
