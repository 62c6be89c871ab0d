#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "foundation/run_controls.h"
#include "platform/export.h"

namespace lumo {

/// Labels the catchment basins of a gradient image: the result of flooding it from its minima with
/// connectivity 4 (Vincent and Soille, Watersheds in digital spaces, 1991), pixels of equal
/// distance from two basins going to the neighbour that comes last in the order up, left, right,
/// down. No pixel is left between basins.
///
/// Every pixel drains to one neighbour: to the last one that is lower, or where there is none, to
/// the last one of its plateau that is one step nearer to lower ground. Plateaus without a way down
/// are the minima. So the labels follow from a forest of drains, without sorting pixels.
///
/// (A pixel that is flooded has a labelled neighbour one step nearer to where the water came from;
/// so none is ever left as a watershed between two basins, and nothing has to be removed.)
///
/// Cost: linear in the pixels; a byte a pixel, and 4 for the longest front on plateaus.
/// Threads: one at a time; the work arrays are kept from image to image.
///
///     Watershed watershed;
///     std::vector<std::int32_t> labels(width * height);
///     const unsigned basins = watershed.Label(gradient, nullptr, width, height, labels.data());
class VEXG_EXPORT Watershed {
 public:
  /// Labels an image.
  /// @param gradient  width * height values, row by row. Those of excluded pixels don't matter.
  /// @param excluded  not 0 for each pixel that takes no part; null when all do.
  /// @param labels    [out] 1, 2, ... in the order of the minima's gradients, and of their first
  ///                  pixels in the rows where these are equal; 0 for excluded pixels.
  /// @param abort     looked at now and then; null for none. Once it is set the labels mean
  /// nothing.
  /// @return the number of labels.
  std::uint32_t Label(const std::int32_t* gradient, const std::uint8_t* excluded,
                      std::uint32_t width, std::uint32_t height, std::int32_t* labels,
                      const AbortFlag* abort = nullptr);

 private:
  bool IsAborted() const;
  void DrainToLower(const std::int32_t* gradient, const std::uint8_t* excluded);
  void DrainPlateaus(const std::int32_t* gradient);
  std::uint32_t NumberMinima(const std::int32_t* gradient, std::int32_t* labels);
  void FollowDrains(std::int32_t* labels);

  /// Calls `visit(neighbour, direction)` for the neighbours of a pixel in the image.
  template <typename Visit>
  void ForEachNeighbour(std::uint32_t pixel, Visit&& visit) const;

  const AbortFlag* abort_ = nullptr;
  std::uint32_t width_ = 0;
  std::uint32_t height_ = 0;
  std::vector<std::uint8_t> drains_;  // of each pixel
  std::vector<std::uint32_t> front_;
  std::vector<std::uint32_t> next_;
};

}  // namespace lumo
