#include <cmath>

#include "georef/coordsys.h"

namespace lumo {
namespace {

constexpr std::int32_t kMeterCode = 9001;
constexpr std::int32_t kDegreeCode = 9102;
constexpr std::int32_t kLinear = 0;
constexpr std::int32_t kAngular = 1;
constexpr double kRadiansPerDegree = 0.0174532923847437;  // as single precision has it

struct DegreeLengths {
  double longitude;  ///< metres for a degree of longitude
  double latitude;   ///< metres for a degree of latitude
};

/// Lengths of a degree on WGS 84 at a latitude in degrees.
DegreeLengths LengthsAt(double latitude) {
  constexpr double kSemiMajor = 6378137.0;
  constexpr double kEccentricitySquared = 0.00669438444204266;
  constexpr double kMeridianRadius = 6335439.2988979835;  // of curvature, at the equator
  const double phi = latitude * kRadiansPerDegree;
  const double sine = std::sin(phi);
  const double d = 1.0 - kEccentricitySquared * sine * sine;
  return {std::cos(phi) * kSemiMajor / std::sqrt(d) * kRadiansPerDegree,
          kMeridianRadius / std::pow(d, 1.5) * kRadiansPerDegree};
}

}  // namespace

const MapUnit kMapUnits[] = {
    {"METER", "Meters", 1.0, kLinear, kMeterCode},
    {"DEGREE", "Degrees", 1.0, kAngular, kDegreeCode},
    {"FOOT", "Feet", 0.3048, kLinear, 9002},
    {"FOOT (INTERNATIONAL)", "Feet", 0.3048, kLinear, 9002},
    {"FOOT_US", "US Survey Feet", 0.3048006096012192, kLinear, 9003},
    {"KILOMETER", "Km", 1000.0, kLinear, 9036},
    {"YARD", "Yards", 0.9144, kLinear, 109001},
    {"YARD_US", "Yards", 0.9144018288036576, kLinear, 109002},
    {"STATUTE_MILE", "Miles", 1609.344, kLinear, 9093},
    {"MILE_US", "Miles", 1609.347218694438, kLinear, 9035},
    {"NAUTICAL_MILE", "Nautical Miles", 1852.0, kLinear, 9030},
    {"NAUTICAL_MILE_US", "Nautical Miles", 1853.248, kLinear, 109012},
    {"NAUTICAL_MILE_UK", "Nautical Miles", 1853.184, kLinear, 109013},
    {"MINUTE", "Minutes", 0.0166666666666667, kAngular, 9103},
    {"SECOND", "Seconds", 0.0027777777777778, kAngular, 9104},
    {"RADIAN", "Radians", 57.29577951308232, kAngular, 9101},
    {"THE_END", "", 0.0, kAngular, -1},
};

const MapUnit* FindMapUnit(std::int32_t code) {
  for (const MapUnit* unit = kMapUnits; unit->code != -1; ++unit) {
    if (unit->code == code) return unit;
  }
  return nullptr;
}

void CoordSys::ConvertUnits(double x, double y, std::int32_t fromCode, std::int32_t toCode,
                            double& outX, double& outY, double latitude) {
  outX = x;
  outY = y;
  const MapUnit* const from = FindMapUnit(fromCode);
  const MapUnit* const to = FindMapUnit(toCode);
  if (from == nullptr || to == nullptr) return;
  if (from->kind == to->kind) {
    outX = x * from->factor / to->factor;
    outY = y * from->factor / to->factor;
    return;
  }
  const DegreeLengths degree = LengthsAt(latitude);
  const double baseX = x * from->factor;  // degrees or metres
  const double baseY = y * from->factor;
  if (from->kind == kAngular) {
    outX = baseX * degree.longitude / to->factor;
    outY = baseY * degree.latitude / to->factor;
  } else {
    outX = baseX / degree.longitude / to->factor;
    outY = baseY / degree.latitude / to->factor;
  }
}

}  // namespace lumo
