#include "georef/carry_points.h"

#include <algorithm>
#include <cmath>

namespace lumo {

bool CarryPoints(Array<double>& points, const CoordSys& from, const CoordSys& to,
                 const std::function<Array<double>()>& extent) {
  from.Unproject(points);
  if (!from.SameDatum(to) && !from.IsEmpty() && !to.IsEmpty()) {
    Array<double> area = extent();
    from.Unproject(area);
    from.GeoTransform(to, points, area);
  }
  to.Project(points);
  return std::all_of(points.begin(), points.end(), [](double v) { return std::isfinite(v); });
}

}  // namespace lumo
