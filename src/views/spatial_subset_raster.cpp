#include "views/spatial_subset_raster_impl.h"

namespace lumo {

template class SpatialSubsetRaster<std::uint8_t>;
template class SpatialSubsetRaster<std::int8_t>;
template class SpatialSubsetRaster<std::uint16_t>;
template class SpatialSubsetRaster<std::int16_t>;
template class SpatialSubsetRaster<std::uint32_t>;
template class SpatialSubsetRaster<std::int32_t>;
template class SpatialSubsetRaster<float>;
template class SpatialSubsetRaster<double>;

}  // namespace lumo
