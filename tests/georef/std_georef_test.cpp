#include "georef/std_georef.h"

#include <cmath>

#include "commands/value_text.h"
#include "georef/std_rpc_georef.h"
#include "support/coordsys_support.h"

namespace lumo {
namespace {

using test::MakeCoordSys;

StdGeoRef Grid(double size, double mapX, double mapY) {
  StdGeoRef grid;
  grid.SetPixelSize(size, size);
  grid.SetTieMap(mapX, mapY);
  return grid;
}

TEST(StdGeoRef, ConvertsByTheAffineFormula) {
  const double angle = 30 * 0.0174532923847437;
  const double c = std::cos(angle), s = std::sin(angle);
  const struct {
    const char* name;
    double rotation, tiePixelX, tiePixelY, x, y, mapX, mapY;
  } cases[] = {
      {"plain", 0, 0, 0, 10, 20, 1000 + 10 * 2, 5000 - 20 * 2},
      {"tie pixel", 0, 3, -4, 10, 20, 1000 + 7 * 2, 5000 - 24 * 2},
      {"rotated 30", 30, 0, 0, 10, 20, 10 * c * 2 + 1000 + 20 * s * 2,
       10 * s * 2 + 5000 - 20 * c * 2},
      {"rotated 30, tie pixel", 30, 1, 2, 10, 20, 9 * c * 2 + 1000 + 18 * s * 2,
       9 * s * 2 + 5000 - 18 * c * 2},
      {"rotated 90", 90, 0, 0, 1, 0, 1000, 5002},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    StdGeoRef grid = Grid(2, 1000, 5000);
    grid.SetRotation(test.rotation);
    grid.SetTiePixel(test.tiePixelX, test.tiePixelY);
    double mapX = 0, mapY = 0, x = 0, y = 0;
    EXPECT_TRUE(grid.PixelToMap(test.x, test.y, mapX, mapY));
    EXPECT_NEAR(mapX, test.mapX, 1e-6);
    EXPECT_NEAR(mapY, test.mapY, 1e-6);
    EXPECT_TRUE(grid.MapToPixel(mapX, mapY, x, y));
    EXPECT_NEAR(x, test.x, 1e-9);
    EXPECT_NEAR(y, test.y, 1e-9);
  }
}

TEST(StdGeoRef, ArraysOfAnyLengthConvertAsSinglePoints) {
  for (const double rotation : {0.0, 17.0}) {
    StdGeoRef grid = Grid(0.3, 500000, 4e6);
    grid.SetRotation(rotation);
    for (unsigned count = 1; count < 20; ++count) {
      Array<double> points{ArrayDims(count, 2)};
      for (unsigned i = 0; i < points.GetCount(); ++i) points[i] = i * 7.3;
      Array<double> back;
      ASSERT_TRUE(grid.PixelToMap(points));
      for (unsigned i = 0; i < count; ++i) {
        double x = 0, y = 0;
        grid.PixelToMap(2 * i * 7.3, (2 * i + 1) * 7.3, x, y);
        EXPECT_EQ(points[2 * i], x);
        EXPECT_EQ(points[2 * i + 1], y);
      }
      ASSERT_TRUE(grid.MapToPixel(points));
      EXPECT_NEAR(points[points.GetCount() - 1], (points.GetCount() - 1) * 7.3, 1e-6);
    }
  }
}

TEST(StdGeoRef, RefusesOtherShapesAndZeroPixelSizesWithZeros) {
  const struct {
    const char* name;
    ArrayDims dims;
    double sizeX, sizeY;
  } cases[] = {{"three columns", ArrayDims(2, 3), 1, 1},
               {"rank 1", ArrayDims(6), 1, 1},
               {"rank 3", ArrayDims(1, 3, 2), 1, 1},
               {"size x 0", ArrayDims(3, 2), 0, 1},
               {"size y 0", ArrayDims(3, 2), 1, 0}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    StdGeoRef grid = Grid(1, 10, 10);
    grid.SetPixelSize(c.sizeX, c.sizeY);
    for (const bool toMap : {true, false}) {
      double values[] = {1, 2, 3, 4, 5, 6};
      Array<double> points(values, c.dims);
      EXPECT_FALSE(toMap ? grid.PixelToMap(points) : grid.MapToPixel(points));
      for (const double value : values) EXPECT_EQ(value, 0);
    }
  }
  Array<double> empty;
  EXPECT_FALSE(Grid(1, 0, 0).PixelToMap(empty));
}

TEST(StdGeoRef, ClampsTheEdgesOfAGeographicGrid) {
  StdGeoRef world = Grid(36.00000001, -180, 90);
  double x = 0, y = 0;
  world.PixelToMap(10, 6, x, y);
  EXPECT_GT(x, 180);  // no coordinate system: no clamp
  world.SetCoordinateSystem(MakeCoordSys("EPSG:4326"));
  world.PixelToMap(10, 6, x, y);
  EXPECT_EQ(x, 180);
  EXPECT_EQ(y, -90);
}

TEST(StdGeoRef, RectanglesStayNormalised) {
  const StdGeoRef grid = Grid(2, 100, 200);
  MapRect rect{10, 20, 30, 40};
  EXPECT_TRUE(grid.PixelToMap(rect));
  EXPECT_EQ(rect.minX, 120);
  EXPECT_EQ(rect.minY, 120);
  EXPECT_EQ(rect.maxX, 160);
  EXPECT_EQ(rect.maxY, 160);
}

TEST(StdGeoRef, ExtentAndCenterLatitudeFollowTheFields) {
  StdGeoRef grid = Grid(30, 500000, 4500000);
  EXPECT_EQ(grid.CenterLatitude(), 40.0);
  EXPECT_EQ(grid.MapExtent()[2], 0);
  grid.SetDimensions(100, 50);
  Array<double> extent = grid.MapExtent();
  EXPECT_EQ(extent[0], 500000);
  EXPECT_EQ(extent[1], 4500000 - 1500);
  EXPECT_EQ(extent[2], 503000);
  EXPECT_EQ(extent[3], 4500000);
  EXPECT_EQ(grid.CenterLatitude(), 0.0);  // no coordinate system
  grid.SetCoordinateSystem(MakeCoordSys("EPSG:32618"));
  EXPECT_NEAR(grid.CenterLatitude(), 40.6435, 1e-3);
  grid.SetPixelSize(60, 60);
  EXPECT_EQ(grid.MapExtent()[2], 506000);
  grid.SetDimensions(1, 1);
  EXPECT_EQ(grid.MapExtent()[2], 500060);
}

TEST(StdGeoRef, PartsAndResamplingsKeepTheGround) {
  StdGeoRef grid = Grid(2, 100, 200);
  grid.SetDimensions(50, 40);
  const GeoRefPtr part = grid.SubRectGeoRef(SubRect(10, 5, 19, 9));
  EXPECT_EQ(part->Samples(), 10U);
  EXPECT_EQ(part->Lines(), 5U);
  EXPECT_EQ(part->TieMapX(), 120);
  EXPECT_EQ(part->TieMapY(), 190);
  grid.SetTiePixel(1, 1);
  const GeoRefPtr coarse = grid.ResampledGeoRef(4, 8);
  EXPECT_EQ(coarse->TieMapX(), 98);
  EXPECT_EQ(coarse->TiePixelX(), 0);
  EXPECT_EQ(coarse->PixelSizeY(), 8);
  EXPECT_EQ(coarse->Samples(), 50U);
}

TEST(StdGeoRef, EqualityHonoursFlagsAndTolerance) {
  const GeoRefPtr a(Grid(1, 10, 10).Clone());
  StdGeoRef other = Grid(1 + 1e-7, 10, 10);
  EXPECT_TRUE(other.IsEqual(a));
  other.SetPixelSize(1.1, 1);
  EXPECT_FALSE(other.IsEqual(a));
  EXPECT_TRUE(other.IsEqual(a, GeoRef::kSkipPixelSize));
  other.SetTieMap(NAN, 10);
  EXPECT_FALSE(other.IsEqual(a, GeoRef::kSkipPixelSize));
  EXPECT_TRUE(other.IsEqual(a, GeoRef::kSkipPixelSize | GeoRef::kSkipTiePoint));
  other.SetRotation(1);
  EXPECT_FALSE(other.IsEqual(a, 3));
  EXPECT_FALSE(other.IsEqual(GeoRefPtr(), 3));
  EXPECT_FALSE(StdRpcGeoRef().IsEqual(a, 3));
}

TEST(StdGeoRef, CarriesPixelsBetweenCoordinateSystems) {
  StdGeoRef utm = Grid(30, 500000, 4500000);
  StdGeoRef geographic = Grid(0.001, -76, 42);
  utm.SetCoordinateSystem(MakeCoordSys("EPSG:32618"));
  geographic.SetCoordinateSystem(MakeCoordSys("EPSG:4326"));
  utm.SetDimensions(10, 10);
  geographic.SetDimensions(10, 10);
  double xy[] = {0, 0};
  Array<double> points(xy, ArrayDims(1, 2));
  EXPECT_TRUE(utm.PixelToPixel(points, geographic));
  EXPECT_NEAR(xy[0], 1000, 1e-6);  // the central meridian, -75
  EXPECT_TRUE(geographic.PixelToPixel(points, utm));
  EXPECT_NEAR(xy[0], 0, 1e-6);
  EXPECT_NEAR(xy[1], 0, 1e-6);
  Array<double> triples{ArrayDims(1, 3)};
  EXPECT_FALSE(utm.PixelToPixel(triples, geographic));
}

TEST(GeoRefText, HasTheFormAndReadsBackBitForBit) {
  StdGeoRef grid = Grid(0.1, 1.0 / 3, -2e300);
  grid.SetTiePixel(5e-324, std::nextafter(1, 2));
  grid.SetRotation(-0.0);
  grid.SetDimensions(3, 4000000000U);
  EXPECT_EQ(FormatValue(GeoRefPtr(Grid(2, 100, 200).Clone())).ToUTF8(),
            "Std -9.9990000000000000e+03 0.0000000000000000e+00 0.0000000000000000e+00 "
            "0.0000000000000000e+00 0.0000000000000000e+00 2.0000000000000000e+00 "
            "2.0000000000000000e+00 1.0000000000000000e+02 2.0000000000000000e+02 "
            "0.0000000000000000e+00 0.0000000000000000e+00 0 0 0.0000000000000000e+00 | ");
  for (const char* system : {"", "EPSG:4326", "EPSG:32618", "+proj=utm +zone=3 +ellps=intl"}) {
    SCOPED_TRACE(system);
    if (*system != 0) grid.SetCoordinateSystem(MakeCoordSys(system));
    const String text = FormatValue(GeoRefPtr(grid.Clone()));
    const auto back = ParseValue<GeoRefPtr>(text);
    ASSERT_FALSE(back.IsNull());
    EXPECT_EQ(FormatValue(back).ToUTF8(), text.ToUTF8());
    EXPECT_TRUE(back->IsEqual(GeoRefPtr(grid.Clone())));
    EXPECT_EQ(std::signbit(back->Rotation()), true);
  }
}

TEST(GeoRefText, CutAnywhereIsNoModel) {
  StdRpcGeoRef model;
  model.SetCoordinateSystem(MakeCoordSys("EPSG:32618"));
  const std::string whole = FormatValue(GeoRefPtr(model.Clone())).ToUTF8();
  ASSERT_FALSE(ParseValue<GeoRefPtr>(whole).IsNull());
  // The last bar ends the form.
  for (std::size_t length = 0; length < whole.rfind('|'); ++length) {
    EXPECT_TRUE(ParseValue<GeoRefPtr>(whole.substr(0, length)).IsNull()) << length;
  }
  for (const char* text : {"", "Unknown", "Unknown 1 2", "std 1", "Std", "Std x", "Rpc 1 |"}) {
    EXPECT_TRUE(ParseValue<GeoRefPtr>(text).IsNull()) << text;
  }
}

TEST(GeoRefPtr, ConvertsToWhatTheModelIs) {
  const GeoRefPtr std(new StdGeoRef), both(new StdRpcGeoRef), rpc(new RpcGeoRef);
  EXPECT_FALSE(StdGeoRefPtr(std).IsNull());
  EXPECT_TRUE(StdRpcGeoRefPtr(std).IsNull());
  EXPECT_FALSE(StdGeoRefPtr(both).IsNull());
  EXPECT_FALSE(StdRpcGeoRefPtr(both).IsNull());
  EXPECT_TRUE(RpcGeoRefPtr(both).IsNull());
  EXPECT_FALSE(RpcGeoRefPtr(rpc).IsNull());
}

}  // namespace
}  // namespace lumo
