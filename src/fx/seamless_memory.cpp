#include <algorithm>

#include "fx/seamless_segmentation.h"

namespace lumo {

std::uint64_t MemoryOfMerging(std::uint64_t basins, unsigned bands, const SegmentRequest& request) {
  constexpr std::uint64_t kPairs = 3;                       // no more for each area of a plane
  constexpr std::uint64_t kNumber = sizeof(std::uint32_t);  // what it has become
  const std::uint64_t tree = request.tree.empty() ? 0 : sizeof(std::uint32_t) + sizeof(double);
  if (!request.isRigorous) {
    return basins * (kNumber + tree + kPairs * LambdaSchedule::BytesOfPair() +
                     LambdaSchedule::BytesOfSegment(bands) + LambdaSchedule::BytesInQueue());
  }
  constexpr std::uint64_t kGroups = 6 * sizeof(std::uint32_t);  // pixels, groups, orders
  const std::uint64_t sums = std::uint64_t{bands} * sizeof(double);
  return basins * (2 * kNumber + kPairs * sizeof(LabelPair) + sums + kGroups);
}

String MemoryFault(std::uint64_t basins, std::uint64_t needed, std::uint64_t allowed) {
  return String("merging " + std::to_string(basins) + " segments needs up to " +
                std::to_string(needed) + " bytes of memory, and may take " +
                std::to_string(allowed) +
                "; a higher SegmentValue makes fewer, and Order Local keeps but a part of "
                "them in memory");
}

unsigned SeamlessStripBytes(const BasicRaster& raster, std::size_t elementBytes) {
  constexpr std::uint64_t kLeastLines = 32, kLeast = 1U << 22U, kMost = 1U << 28U;
  const std::uint64_t lineBytes =
      std::uint64_t{raster.Samples()} * std::max(raster.Bands(), 1U) * elementBytes;
  return static_cast<unsigned>(std::clamp(kLeastLines * lineBytes, kLeast, kMost));
}

unsigned SeamlessStripLines(const BasicRaster& raster, std::size_t elementBytes,
                            unsigned stripBytes) {
  constexpr std::uint64_t kMostPixels = 1U << 28U;
  const std::uint64_t samples = std::max(raster.Samples(), 1U);
  const std::uint64_t lineBytes = samples * std::max(raster.Bands(), 1U) * elementBytes;
  const std::uint64_t lines = std::min(
      {stripBytes / lineBytes, kMostPixels / samples, std::uint64_t{std::max(raster.Lines(), 1U)}});
  return static_cast<unsigned>(std::max<std::uint64_t>(lines, 1));
}

}  // namespace lumo
