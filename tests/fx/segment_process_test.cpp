#include "fx/segment_process.h"

#include <random>

#include "fx/gradient_kernels.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

template <typename T>
using MemoryPtr = Pointer<MemoryTestRaster<T>>;

template <typename T>
MemoryPtr<T> MakeScene(unsigned samples, unsigned lines, unsigned bands) {
  const MemoryPtr<T> scene(new MemoryTestRaster<T>(samples, lines, bands));
  std::mt19937 random(5);
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
    scene->pixels[i] = static_cast<T>(random() % 100);
    scene->states[i] = random() % 400 == 0 ? 1U << random() % 3 : 0;
  }
  return scene;
}

SegmentRequest MakeRequest(double mergeValue) {
  SegmentRequest request;
  request.stretch = {0, 800, 0, 800};
  request.limits = ClipLimits::Of(0, 800, 20, 800);
  request.mergeValue = mergeValue;
  request.tileBytes = 30 * 30 * 3;
  request.tileBorder = 4;
  return request;
}

template <template <typename> class Process>
std::vector<std::int32_t> Segment(const MemoryPtr<std::uint8_t>& scene,
                                  const MemoryPtr<std::uint8_t>& merge, double mergeValue,
                                  unsigned threads) {
  const ThreadLimit limit(threads);
  const MemoryPtr<std::int32_t> labels(
      new MemoryTestRaster<std::int32_t>(scene->Samples(), scene->Lines(), 1));
  Process<std::uint8_t> process(scene, merge, labels, MakeRequest(mergeValue));
  EXPECT_TRUE(process.RunProcess(process.kHere));
  return labels->pixels;
}

/// Tiles that are worked on at once, and a raster for merging that shares the tiles of gradients or
/// has its own, change no label.
TEST(SegmentProcess, GivesTheSameLabelsOnAllThreads) {
  const auto scene = MakeScene<std::uint8_t>(211, 170, 3);
  const auto copy = MakeScene<std::uint8_t>(211, 170, 3);
  for (const double mergeValue : {0.0, 300.0}) {
    const auto schedule =
        Segment<RasterTileWatershedSegmentFLSMergeProcess>(scene, scene, mergeValue, 1);
    const auto rigorous =
        Segment<RasterTileWatershedSegmentLambdaMergeProcess>(scene, scene, mergeValue, 1);
    EXPECT_GT(*std::max_element(schedule.begin(), schedule.end()), 10);
    EXPECT_EQ(mergeValue == 0, schedule == rigorous);
    for (const auto& merge : {scene, copy}) {
      EXPECT_EQ(schedule,
                Segment<RasterTileWatershedSegmentFLSMergeProcess>(scene, merge, mergeValue, 4));
      EXPECT_EQ(rigorous,
                Segment<RasterTileWatershedSegmentLambdaMergeProcess>(scene, merge, mergeValue, 4));
    }
  }
}

TEST(SegmentProcess, EndsAtOnceWhenAborted) {
  const auto scene = MakeScene<std::uint8_t>(211, 170, 3);
  const MemoryPtr<std::int32_t> labels(new MemoryTestRaster<std::int32_t>(211, 170, 1));
  const IPC ipc;
  ipc.abort->Set(true);
  RasterTileWatershedSegmentFLSMergeProcess<std::uint8_t> process(scene, scene, labels,
                                                                  MakeRequest(100), ipc);
  EXPECT_TRUE(process.RunProcess(process.kHere));
  EXPECT_EQ(*std::max_element(labels->pixels.begin(), labels->pixels.end()), 0);
}

/// Gradients of integers need more bits than the pixels; bands by the thousand need no block.
template <typename T>
void CheckLargestGradient(double wanted) {
  for (const std::size_t bands : {1U, 5000U}) {
    std::vector<T> rows[3];
    for (int y = 0; y < 3; ++y) {
      rows[y].assign(3 * bands, std::numeric_limits<T>::lowest());
      for (int x = 0; x < 3; ++x) {  // high above the diagonal
        if (x > y) rows[y][(x + 1) * bands - 1] = std::numeric_limits<T>::max();
      }
    }
    double gradient = 0;
    ComputeSobelRow(&rows[0][bands], &rows[1][bands], &rows[2][bands], bands, 1, &gradient);
    EXPECT_EQ(gradient, wanted) << bands;
  }
}

TEST(SobelRow, HoldsTheLargestGradients) {
  CheckLargestGradient<std::uint8_t>(6.0 * 255);
  CheckLargestGradient<std::int8_t>(6.0 * 255);
  CheckLargestGradient<std::uint16_t>(6.0 * 65535);
  CheckLargestGradient<std::int16_t>(6.0 * 65535);
  CheckLargestGradient<std::uint32_t>(6.0 * 4294967295.0);
  CheckLargestGradient<std::int32_t>(6.0 * 4294967295.0);
}

TEST(LinearStretch, SaturatesAndDefaults) {
  const double inf = std::numeric_limits<double>::infinity();
  const double values[] = {-inf, -1e300, 0, 5, 10, 1e300, inf, std::nan("")};
  std::int32_t levels[8];
  LinearStretch{0, 10, 0, 100}.Apply(values, 8, levels);
  constexpr std::int32_t kLeast = std::numeric_limits<std::int32_t>::min(), kMost = 2147483647;
  EXPECT_EQ(std::vector<std::int32_t>(levels, levels + 8),
            (std::vector<std::int32_t>{kLeast, kLeast, 0, 50, 100, kMost, kMost, kLeast}));
  LinearStretch{0, 10, -1, -1}.Apply(values + 4, 1, levels);
  EXPECT_EQ(levels[0], kMost);
  LinearStretch{0, 10, 7, 3}.Apply(values + 2, 1, levels);
  EXPECT_EQ(levels[0], 0);
}

}  // namespace
}  // namespace lumo
