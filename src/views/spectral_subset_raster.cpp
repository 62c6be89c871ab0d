#include "views/spectral_subset_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, SpectralSubsetRaster);

}  // namespace lumo
