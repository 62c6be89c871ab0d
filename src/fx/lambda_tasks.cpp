#include "fx/lambda_tasks_body.h"

namespace lumo {

#define INSTANCES(T)                                                    \
  template class RasterFullLambdaScheduleTask<T, std::int32_t>;         \
  template class RasterFullLambdaScheduleEstimateTask<T, std::int32_t>; \
  template class RasterTileRigorousLambdaMergeTask<T>;
VEXG_FOR(EIGHT, INSTANCES);

}  // namespace lumo
