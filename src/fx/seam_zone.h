#pragma once

#include <cstdint>
#include <vector>

#include "fx/strip_drains.h"

namespace lumo {

/// Holds the pixels of a strip that may be nearer to lower ground beyond its edges than to its own:
/// those of plateaus that reach an edge and go on there, as far as no lower ground of the strip is
/// as near as the edge. No other pixel of the strip counts for how far lower ground is from the
/// pixels of another strip.
///
/// Pixels have numbers from 0, in raster order.
struct VEXG_EXPORT SeamZone {
  /// Stands for no pixel.
  static constexpr std::uint32_t kNone = 0xFFFFFFFF;

  std::vector<std::uint32_t> up;  ///< by pixel: the one above it on its plateau, or kNone
  std::vector<std::uint8_t>
      hasLeft;                       ///< by pixel: the one before it is on its left, on its plateau
  std::vector<std::uint32_t> first;  ///< columns of those in the first line of the strip
  std::vector<std::uint32_t> last;   ///< columns of those in the last line

  std::size_t Count() const { return up.size(); }

  /// Finds the zone of a strip.
  /// @param cells  as StripDrains::MarkLine made them.
  static SeamZone Find(const std::vector<StripDrains::Cell>& cells, std::uint32_t width);
  /// True for a zone that can be: read from a file, it may be anything.
  bool IsSound(std::uint32_t width) const;
};

/// Holds what a strip shows of its edges.
struct SeamStrip {
  /// How far the pixels of these lines are from lower ground; of StripDrains::DrainPlateaus.
  std::vector<std::uint32_t> first, last;
  std::vector<std::uint8_t> isSameAbove;  ///< of the first line: not 0 on one level with that above
  SeamZone zone;
};

/// Finds how far the pixels along the edges of strips are from lower ground anywhere in the image.
/// One wave from all lower ground goes through the zones of all strips, however often plateaus
/// wind through them.
///
/// Memory: 13 bytes for each pixel of the zones. Cost: a step for each of these.
/// @param strips  [in, out] of the whole image, from above. Their `first` and `last` come as each
///                strip has them alone, and leave as the image has them.
VEXG_EXPORT void SettleSeams(std::vector<SeamStrip>& strips, std::uint32_t width);

}  // namespace lumo
