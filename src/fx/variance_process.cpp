#include "fx/variance_process_body.h"

namespace lumo {

bool TileVariances::Resize(unsigned columns, unsigned rows) {
  if (!variances.Resize(ArrayDims(columns, rows)) ||
      !pixelCounts.Resize(ArrayDims(columns, rows)) ||
      !subrects.Resize(ArrayDims(columns, rows, 4))) {
    return false;
  }
  std::fill(variances.begin(), variances.end(), 0.0);
  std::fill(pixelCounts.begin(), pixelCounts.end(), 0U);
  std::fill(subrects.begin(), subrects.end(), 0U);
  return true;
}

VEXG_INSTANCES(EIGHT, RasterVarianceSubrectTask);
VEXG_INSTANCES(EIGHT, RasterVarianceSubrectProcess);

}  // namespace lumo
