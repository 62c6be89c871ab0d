#include "pyramid/pyramid_tasks_body.h"

namespace lumo {

ZPosition PositionAlongZ(std::uint64_t index, unsigned bits) {
  ZPosition at;
  for (unsigned bit = 0; bit < bits; ++bit) {
    at.x |= (index >> (2 * bit) & 1) << bit;
    at.y |= (index >> (2 * bit + 1) & 1) << bit;
  }
  return at;
}

VEXG_INSTANCES(TWELVE, RasterPyramidScanlineDecimateTask);
VEXG_INSTANCES(TWELVE, RasterPyramidRowDecimateTask);
VEXG_INSTANCES(TWELVE, RasterMortenReadTask);
VEXG_INSTANCES(TWELVE, RasterPyramidMortenDecimateTask);

}  // namespace lumo
