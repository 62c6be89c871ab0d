#include "warp/projected_raster_body.h"

namespace lumo {

std::span<const EnumWord<ProjectedGrid>> WordsOf(ProjectedGrid) {
  using enum ProjectedGrid;
  static constexpr EnumWord<ProjectedGrid> kWords[] = {
      {"Told", kComputed}, {"Exact", kExact}, {"Computed", kComputed}};
  return kWords;
}

VEXG_INSTANCES(EIGHT, ProjectedRaster);

}  // namespace lumo
