#pragma once

#include "regions/shape_scan.h"

namespace lumo {

/// Computes the share of each pixel of a block that lies inside a polygon: exact areas, summed up
/// from the part that each edge cuts off, as font renderers do (R. Levien, font-rs, "accumulation
/// buffer").
///
/// Rings that cross themselves count by their turns; where parts overlap a pixel counts once.
/// Cost: 8 bytes a pixel of the block.
/// Threads: one at a time.
///
///     CoverageBlock block(WindowOf(rect));
///     block.AddRing(outer, false);
///     block.AddRing(hole, true);
///     std::vector<double> shares;
///     for (unsigned line = 0; line < rect.Height(); ++line) block.GetLine(line, shares);
class VEXG_EXPORT CoverageBlock {
 public:
  /// @param window  at full resolution.
  explicit CoverageBlock(const RegionWindow& window);

  /// Adds a ring, in pixels of the grid. It closes by itself; its direction doesn't matter for a
  /// ring that doesn't cross itself.
  void AddRing(const ScanVertices& ring, bool isHole);
  /// The shares of a line of the block, 0 to 1, `width` of them.
  void GetLine(unsigned line, std::vector<double>& shares) const;

 private:
  void AddEdge(const Point2D<double>& a, const Point2D<double>& b, double sign);
  void AddPiece(std::size_t row, double fromX, double toX, double area);

  RegionWindow window_;
  std::vector<double> edges_;  // for each line, width + 2 changes from pixel to pixel
};

}  // namespace lumo
