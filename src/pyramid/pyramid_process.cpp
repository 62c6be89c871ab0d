#include "pyramid/pyramid_process_body.h"

namespace lumo {

PyramidPath ChoosePyramidPath(const RasterDef& def) {
  if (TilingOf(def.bands, 1).bands != def.bands) return PyramidPath::kMorten;
  return def.tileHeight >= 2 ? PyramidPath::kRow : PyramidPath::kScanline;
}

VEXG_INSTANCES(TWELVE, RasterPyramidProcess);
VEXG_INSTANCES(TWELVE, RasterPyramidDecimateRasterProcess);
VEXG_INSTANCES(TEN, RasterPyramidDecimateRasterStatsProcess, RasterStats);

}  // namespace lumo
