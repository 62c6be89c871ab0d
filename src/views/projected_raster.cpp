#include "views/projected_raster_impl.h"

namespace lumo {

std::span<const EnumWord<ProjectedGrid>> WordsOf(ProjectedGrid) {
  using enum ProjectedGrid;
  static constexpr EnumWord<ProjectedGrid> kWords[] = {
      {"Told", kComputed}, {"Exact", kExact}, {"Computed", kComputed}};
  return kWords;
}

template class ProjectedRaster<std::uint8_t>;
template class ProjectedRaster<std::int8_t>;
template class ProjectedRaster<std::uint16_t>;
template class ProjectedRaster<std::int16_t>;
template class ProjectedRaster<std::uint32_t>;
template class ProjectedRaster<std::int32_t>;
template class ProjectedRaster<float>;
template class ProjectedRaster<double>;

}  // namespace lumo
