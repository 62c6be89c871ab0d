#include <algorithm>

#include "fx/seamless_segmentation.h"

namespace lumo {

std::uint64_t MemoryOfMerging(std::uint64_t basins, unsigned bands, const SegmentRequest& request) {
  // No more than 3 pairs for each area of a plane; a table of up to 12 places for it.
  constexpr std::uint64_t kPairs = 3 * sizeof(LabelPair) + 48, kNumbers = 8;
  const std::uint64_t sums = std::uint64_t{bands} * sizeof(double);
  constexpr std::uint64_t kScheduled = 3 * 40 + 16 + 8 + 16, kRigorous = 4 + 3 * 4 + 12;
  const std::uint64_t tree = request.tree.empty() ? 0 : sizeof(std::uint32_t) + sizeof(double);
  return basins * (kPairs + kNumbers + sums + tree + (request.isRigorous ? kRigorous : kScheduled));
}

String MemoryFault(std::uint64_t basins, std::uint64_t needed, std::uint64_t allowed) {
  return String("merging " + std::to_string(basins) + " segments needs up to " +
                std::to_string(needed) + " bytes of memory, and may take " +
                std::to_string(allowed) + "; a higher SegmentValue makes fewer");
}

unsigned SeamlessStripBytes(const BasicRaster& raster, std::size_t elementBytes) {
  constexpr std::uint64_t kLeastLines = 32, kMost = 1U << 28U;
  const std::uint64_t lineBytes =
      std::uint64_t{raster.Samples()} * std::max(raster.Bands(), 1U) * elementBytes;
  return static_cast<unsigned>(
      std::clamp<std::uint64_t>(kLeastLines * lineBytes, kTileBudget, kMost));
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
