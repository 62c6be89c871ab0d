#include <thread>

#include <gtest/gtest.h>

#include "geometry/memory_geometry_writer.h"
#include "georef/std_georef.h"
#include "support/coordsys_support.h"

namespace lumo {
namespace {

Array<Point2D<double>> Points(std::initializer_list<Point2D<double>> list) {
  Array<Point2D<double>> points{ArrayDims(static_cast<unsigned>(list.size()))};
  std::copy(list.begin(), list.end(), points.begin());
  return points;
}

TEST(MemoryGeometry, IdsStayAndAreNeverUsedAgain) {
  MemoryGeometry geometry{CoordSys()};
  geometry.Clear();
  EXPECT_EQ(geometry.Revision(), 0U);
  std::uint32_t id = 0;
  for (unsigned i = 0; i < 6; ++i) {
    ASSERT_TRUE(geometry.AddRecord(kPolylineRecord, id));
    EXPECT_EQ(id, i);
  }
  for (unsigned i : {2U, 0U, 4U, 1U, 3U}) EXPECT_TRUE(geometry.RemoveRecord(i));
  EXPECT_FALSE(geometry.RemoveRecord(3));
  const Array<int> ids = geometry.RecordIds();
  ASSERT_EQ(ids.GetCount(), 1U);
  EXPECT_EQ(ids[0], 5);
  ASSERT_TRUE(geometry.AddRecord(kPointsRecord, id));
  EXPECT_EQ(id, 6U);
  EXPECT_EQ(geometry.RecordKind(6), kPointsRecord);
  EXPECT_EQ(geometry.Revision(), 12U);
  EXPECT_EQ(geometry.RecordRevision(77), 0U);
  geometry.Clear();
  ASSERT_TRUE(geometry.AddRecord(0, id));
  EXPECT_EQ(id, 7U);
}

TEST(MemoryGeometry, PartsChangeTheirRecordAlone) {
  MemoryGeometry geometry{CoordSys()};
  std::uint32_t record = 0, part = 99;
  EXPECT_FALSE(geometry.AddPart(0, false, part, Points({{1, 2}})));
  EXPECT_EQ(part, 99U);
  ASSERT_TRUE(geometry.AddRecord(0, record));
  ASSERT_TRUE(geometry.AddPart(record, false, part, Points({{1, 2}, {3, 4}})));
  ASSERT_TRUE(geometry.AddPart(record, true, part));
  EXPECT_EQ(geometry.RecordRevision(record), 2U);
  EXPECT_EQ(geometry.PartRevision(record, 0), 1U);
  EXPECT_EQ(geometry.PartRevision(record, 1), 0U);
  EXPECT_TRUE(geometry.IsHole(record, 1));
  EXPECT_EQ(geometry.VertexCount(record, 1), 0U);

  const GeometryPtr copy = geometry.Clone();
  ASSERT_TRUE(geometry.SetCoordinates(record, 0, Points({{5, 6}})));
  EXPECT_EQ(geometry.PartRevision(record, 0), 2U);
  EXPECT_EQ(geometry.Revision(), 1U);
  EXPECT_EQ(copy->VertexCount(record, 0), 2U);
  EXPECT_EQ(copy->Coordinates(record, 0)[1], (Point2D<double>{3, 4}));

  ASSERT_TRUE(geometry.RemovePart(record, 0));
  std::uint32_t recordIndex = 9, partIndex = 9;
  EXPECT_TRUE(geometry.FindPart(record, 1, recordIndex, partIndex));
  EXPECT_EQ(recordIndex, 0U);
  EXPECT_EQ(partIndex, 0U);
  EXPECT_FALSE(geometry.FindPart(record, 0, recordIndex, partIndex));
  EXPECT_EQ(geometry.PartIds(record)[0], 1);
}

TEST(MemoryGeometry, ThreadsMayAddAtOnce) {
  MemoryGeometry geometry{CoordSys()};
  const auto add = [&] {
    for (int i = 0; i < 500; ++i) {
      std::uint32_t record = 0, part = 0;
      geometry.AddRecord(0, record);
      geometry.AddPart(record, false, part, Points({{1.0 * i, 0}}));
      geometry.VertexCount(record, part);
    }
  };
  std::thread one(add), other(add);
  one.join();
  other.join();
  EXPECT_EQ(geometry.RecordCount(), 1000U);
}

TEST(MemoryGeometryPolygonWriter, PutsRingsOnTheMap) {
  const MemoryGeometryPtr geometry(new MemoryGeometry(CoordSys()));
  const GeoRefPtr grid(new StdGeoRef);
  grid->SetPixelSize(2, 3);
  grid->SetTieMap(100, 200);
  grid->SetTiePixel(0, 0);
  MemoryGeometryPolygonWriter<std::uint8_t> writer(geometry, 10, 20, grid, GeoRefPtr());
  Contour2DArray<std::uint32_t> rings{{{{0, 0}, {4, 0}, {4, 4}, {0, 4}, {0, 0}}, false},
                                      {{{1, 1}, {1, 2}, {2, 2}, {2, 1}, {1, 1}}, true}};
  ASSERT_TRUE(writer.Write(Polygon2D<std::uint32_t>(rings, 7)));
  ASSERT_EQ(geometry->RecordCount(), 1U);
  EXPECT_EQ(geometry->RecordKind(0), kPolygonRecord);
  ASSERT_EQ(geometry->PartCount(0), 2U);
  EXPECT_FALSE(geometry->IsHole(0, 0));
  EXPECT_TRUE(geometry->IsHole(0, 1));
  double x = 0, y = 0;
  ASSERT_TRUE(grid->PixelToMap(10 + 4, 20 + 0, x, y));
  EXPECT_EQ(geometry->Coordinates(0, 0)[1], (Point2D<double>{x, y}));
}

TEST(ProjectedGeometry, CarriesCoordinatesWhenAsked) {
  CoordSys utm, geographic;
  ASSERT_TRUE(utm.SetFromString("EPSG:32725"));
  ASSERT_TRUE(geographic.SetGeographic());
  const GeometryPtr inner(new MemoryGeometry(utm));
  auto& memory = static_cast<MemoryGeometry&>(*inner);
  std::uint32_t record = 0, part = 0;
  ASSERT_TRUE(memory.AddRecord(kPolylineRecord, record));
  ASSERT_TRUE(memory.AddPart(record, false, part, Points({{500000, 9100000}, {500100, 9100000}})));
  ASSERT_TRUE(memory.AddPart(record, false, part));
  const ProjectedGeometry shown(inner, geographic);
  const Array<Point2D<double>> points = shown.Coordinates(record, 0);
  ASSERT_EQ(points.GetCount(), 2U);
  EXPECT_NEAR(points[0].x, -33, 1e-9);  // on the central meridian
  EXPECT_NEAR(points[1].y, points[0].y, 1e-6);
  EXPECT_GT(points[1].x, points[0].x);
  EXPECT_EQ(shown.Coordinates(record, part).GetCount(), 0U);
  std::uint32_t index = 0;
  EXPECT_FALSE(shown.FindRecord(record, index));
  const GeometryPtr again = shown.Clone();
  EXPECT_EQ(again->Coordinates(record, 0)[1], points[1]);
}

}  // namespace
}  // namespace lumo
