#include "fx/lambda_tasks_body.h"

namespace lumo {

void CountLambdas(const std::vector<double>& lambdas, Array<unsigned>& histogram, double& binSize) {
  const auto largest = std::max_element(lambdas.begin(), lambdas.end());
  const unsigned bins = histogram.GetCount();
  if (largest == lambdas.end() || !(*largest > 0) || bins < 2) return;
  binSize = *largest / (bins - 1);
  std::fill(histogram.begin(), histogram.end(), 0U);
  for (const double lambda : lambdas) {
    if (!(lambda >= 0 && lambda <= *largest)) continue;
    ++histogram[std::min(bins - 1, static_cast<unsigned>(lambda / binSize))];
  }
  std::partial_sum(histogram.begin(), histogram.end(), histogram.begin());
}

#define INSTANCES(T)                                                    \
  template class RasterFullLambdaScheduleTask<T, std::int32_t>;         \
  template class RasterFullLambdaScheduleEstimateTask<T, std::int32_t>; \
  template class RasterTileRigorousLambdaMergeTask<T>;
VEXG_FOR(EIGHT, INSTANCES);

}  // namespace lumo
