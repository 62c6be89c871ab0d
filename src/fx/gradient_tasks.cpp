#include "fx/gradient_tasks_body.h"

namespace lumo {

#define INSTANCES(T)                                         \
  template class ParallelBorderedRasterIntensity<T, double>; \
  template class RasterIntensityTask<T, double>;             \
  template class RasterSobelBandMaxTask<T, double>;
VEXG_FOR(EIGHT, INSTANCES);

}  // namespace lumo
