#pragma once

#include <fstream>
#include <initializer_list>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "geometry/geometry.h"
#include "regions/rasterized_roi.h"
#include "regions/roi_def.h"

namespace lumo::test {

using Ring = std::vector<Point2D<double>>;

inline Array<Point2D<double>> PointsOf(const Ring& ring) {
  Array<Point2D<double>> points{ArrayDims(static_cast<unsigned>(ring.size()))};
  std::copy(ring.begin(), ring.end(), points.begin());
  return points;
}

/// Adds a record with one part for each ring; the first is no hole, the others as `holes` says.
inline std::uint32_t AddShape(WritableGeometry& geometry, const std::vector<Ring>& rings,
                              bool holes = true, int kind = kPolygonRecord) {
  std::uint32_t record = 0, part = 0;
  EXPECT_TRUE(geometry.AddRecord(kind, record));
  for (std::size_t i = 0; i < rings.size(); ++i) {
    EXPECT_TRUE(geometry.AddPart(record, holes && i != 0, part, PointsOf(rings[i])));
  }
  return record;
}

/// A geometry in pixels with one record for each ring.
inline Pointer<MemoryGeometry> MakeShapes(const std::vector<Ring>& rings,
                                          int kind = kPolygonRecord) {
  Pointer<MemoryGeometry> geometry(new MemoryGeometry(CoordSys()));
  for (const Ring& ring : rings) AddShape(*geometry, {ring}, true, kind);
  return geometry;
}

/// A mask as lines of '#' and '.', with its count checked.
inline std::vector<std::string> RowsOf(RasterizedROI& region, const SubRect& rect) {
  Array<unsigned char> mask;
  std::uint64_t count = 0;
  EXPECT_TRUE(region.Mask(rect, mask, count));
  EXPECT_EQ(mask.GetDims(), ArrayDims(rect.Height(), rect.Width()));
  std::vector<std::string> rows;
  std::uint64_t inside = 0;
  for (unsigned y = 0; y < rect.Height(); ++y) {
    rows.emplace_back();
    for (unsigned x = 0; x < rect.Width(); ++x) {
      const bool isIn = mask[std::size_t{y} * rect.Width() + x] != 0;
      inside += isIn;
      rows.back() += isIn ? '#' : '.';
    }
  }
  EXPECT_EQ(count, inside);
  return rows;
}

}  // namespace lumo::test
