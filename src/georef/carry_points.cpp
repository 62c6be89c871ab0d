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

void MarkUncarried(Array<double>& points) {
  for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
    if (std::isfinite(points[i]) && std::isfinite(points[i + 1])) continue;
    points[i] = HUGE_VAL;
    points[i + 1] = HUGE_VAL;
  }
}

}  // namespace lumo
