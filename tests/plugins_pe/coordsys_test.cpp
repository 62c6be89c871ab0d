#include "georef/coordsys.h"

#include <atomic>
#include <cmath>
#include <random>
#include <thread>

#include "georef/coordsys_factory.h"
#include "georef/std_georef.h"
#include "support/coordsys_support.h"
#include "support/peer_program.h"

namespace lumo {
namespace {

using test::MakeCoordSys;

std::vector<std::array<double, 3>> RandomPoints(double west, double south, double east,
                                                double north) {
  std::mt19937 random(20240607);
  std::uniform_real_distribution<double> x(west, east), y(south, north);
  std::vector<std::array<double, 3>> points(10000);
  for (auto& point : points) point = {x(random), y(random), 0};
  return points;
}

/// One way between WGS 84 and another system, compared with PROJ's own program.
struct PeerCase {
  const char* system;
  bool northFirst;  // as the authority orders its axes
  double west, south, east, north;
};

const PeerCase kPeerCases[] = {
    {"EPSG:32618", false, -78, 1, -72, 70},     // UTM north
    {"EPSG:32725", false, -36, -70, -30, -1},   // UTM south
    {"EPSG:3031", false, -180, -89, 180, -61},  // polar stereographic
    {"EPSG:2154", false, -4, 42, 8, 51},        // Lambert conformal, RGF93
    {"EPSG:3857", false, -179, -80, 179, 80},   // Web Mercator
    {"EPSG:27700", false, -6, 50, 1, 58},       // British grid, OSGB36
    {"EPSG:31467", true, 7.6, 47.5, 10.4, 55},  // Gauss-Kruger zone 3, DHDN
    {"EPSG:2193", true, 167, -47, 178, -35},    // New Zealand, axes the other way round
};

void Compare(const PeerCase& c, bool forward) {
  SCOPED_TRACE(std::string(c.system) + (forward ? " forward" : " back"));
  auto geographic = RandomPoints(c.west, c.south, c.east, c.north);
  std::vector<std::array<double, 3>> input = geographic;
  for (auto& p : input) std::swap(p[0], p[1]);  // cs2cs takes EPSG:4326 latitude first
  const std::string tail = " -f %.12f ";
  auto want = test::RunOnPoints("cs2cs EPSG:4326 " + std::string(c.system) + tail, input);
  ASSERT_EQ(want.size(), geographic.size());
  if (!forward) {
    input = want;
    want = test::RunOnPoints("cs2cs " + std::string(c.system) + " EPSG:4326" + tail, input);
    ASSERT_EQ(want.size(), geographic.size());
    for (auto& p : want) std::swap(p[0], p[1]);
  }
  if (c.northFirst) {
    for (auto& p : forward ? want : input) std::swap(p[0], p[1]);
  }

  StdGeoRef here, there;
  here.SetCoordinateSystem(MakeCoordSys("EPSG:4326"));
  there.SetCoordinateSystem(MakeCoordSys(c.system));
  here.SetTieMap(c.west, c.north);
  here.SetPixelSize((c.east - c.west) / 100, (c.north - c.south) / 100);
  here.SetDimensions(100, 100);
  Array<double> points{ArrayDims(static_cast<unsigned>(want.size()), 2)};
  for (unsigned i = 0; i < want.size(); ++i) {
    points[2 * i] = forward ? geographic[i][0] : input[i][0];
    points[2 * i + 1] = forward ? geographic[i][1] : input[i][1];
  }
  ASSERT_TRUE(forward ? here.MapToMap(points, there) : there.MapToMap(points, here));
  double worst = 0;
  for (unsigned i = 0; i < want.size(); ++i) {
    worst = std::max(
        {worst, std::abs(points[2 * i] - want[i][0]), std::abs(points[2 * i + 1] - want[i][1])});
  }
  EXPECT_LT(worst, forward ? 1e-4 : 1e-9);
}

TEST(ProjectionPlugin, AgreesWithPeerProgramOnTenThousandPoints) {
  if (!test::HasProgram("cs2cs")) GTEST_SKIP() << "no cs2cs";
  for (const PeerCase& c : kPeerCases) {
    Compare(c, true);
    Compare(c, false);
  }
}

TEST(ProjectionPlugin, ReadsEveryDialectAsOneSystem) {
  const char* const esri =
      "PROJCS[\"WGS_1984_UTM_Zone_18N\",GEOGCS[\"GCS_WGS_1984\",DATUM[\"D_WGS_1984\","
      "SPHEROID[\"WGS_1984\",6378137.0,298.257223563]],PRIMEM[\"Greenwich\",0.0],"
      "UNIT[\"Degree\",0.0174532925199433]],PROJECTION[\"Transverse_Mercator\"],"
      "PARAMETER[\"False_Easting\",500000.0],PARAMETER[\"False_Northing\",0.0],"
      "PARAMETER[\"Central_Meridian\",-75.0],PARAMETER[\"Scale_Factor\",0.9996],"
      "PARAMETER[\"Latitude_Of_Origin\",0.0],UNIT[\"Meter\",1.0]]";
  const char* const wkt1 =
      "PROJCS[\"WGS 84 / UTM zone 18N\",GEOGCS[\"WGS 84\",DATUM[\"WGS_1984\","
      "SPHEROID[\"WGS 84\",6378137,298.257223563]],PRIMEM[\"Greenwich\",0],"
      "UNIT[\"degree\",0.0174532925199433]],PROJECTION[\"Transverse_Mercator\"],"
      "PARAMETER[\"latitude_of_origin\",0],PARAMETER[\"central_meridian\",-75],"
      "PARAMETER[\"scale_factor\",0.9996],PARAMETER[\"false_easting\",500000],"
      "PARAMETER[\"false_northing\",0],UNIT[\"metre\",1]]";
  const CoordSys code = MakeCoordSys("EPSG:32618");
  for (const char* text : {esri, wkt1, "+proj=utm +zone=18 +datum=WGS84", " epsg:32618\n"}) {
    SCOPED_TRACE(text);
    const CoordSys other = MakeCoordSys(text);
    EXPECT_TRUE(code.IsEqual(other));
    EXPECT_TRUE(code.SameDatum(other));
    EXPECT_EQ(other.Type(), 2);
    String written;
    other.ToString(written);
    const CoordSys again = MakeCoordSys(written.GetUTF8());
    String rewritten;
    again.ToString(rewritten);
    EXPECT_EQ(rewritten.ToUTF8(), written.ToUTF8());
  }
}

TEST(ProjectionPlugin, FillsTheDescription) {
  const CoordSys grid = MakeCoordSys("EPSG:27700");
  const CoordSysInfo& info = *grid.Info();
  EXPECT_EQ(info.name.ToUTF8(), "British_National_Grid");
  EXPECT_EQ(info.datumName.ToUTF8(), "D_OSGB_1936");
  EXPECT_EQ(info.spheroidName.ToUTF8(), "Airy_1830");
  EXPECT_EQ(info.projectionName.ToUTF8(), "Transverse_Mercator");
  EXPECT_EQ(info.semiMajor, 6377563.396);
  const double want[16] = {400000, -100000, -2, 49, 0, 0, 0.9996012717, 0,
                           0,      0,       0,  0,  0, 0, 9807,         0};
  for (int i = 0; i < 16; ++i) EXPECT_EQ(info.parameters[i], want[i]) << i;
  const struct {
    const char* text;
    const char* unit;
    int kind, code;
    double factor;
  } units[] = {{"EPSG:4326", "Degree", 1, 9102, 1.0},
               {"EPSG:32618", "Meter", 0, 9001, 1.0},
               {"EPSG:2225", "Foot_US", 0, 9003, 0.3048006096012192}};
  for (const auto& unit : units) {
    const CoordSys system = MakeCoordSys(unit.text);
    EXPECT_EQ(system.Info()->unitName.ToUTF8(), unit.unit);
    EXPECT_EQ(system.Info()->unitKind, unit.kind);
    EXPECT_EQ(system.Info()->unitCode, unit.code);
    EXPECT_EQ(system.Info()->unitFactor, unit.factor);
  }
}

TEST(ProjectionPlugin, TellsSystemsApart) {
  const struct {
    const char *a, *b;
    bool equal, sameDatum;
  } cases[] = {
      {"EPSG:32618", "EPSG:32718", false, true},
      {"EPSG:32618", "EPSG:4326", false, true},
      {"EPSG:4326", "EPSG:4258", false, false},
      {"+proj=merc +datum=WGS84", "+proj=eqc +datum=WGS84", false, true},
      {"+proj=longlat +ellps=bessel +towgs84=1,2,3", "+proj=longlat +ellps=bessel +towgs84=9,2,3",
       false, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.a) + " " + c.b);
    EXPECT_EQ(MakeCoordSys(c.a).IsEqual(MakeCoordSys(c.b)), c.equal);
    EXPECT_EQ(MakeCoordSys(c.a).SameDatum(MakeCoordSys(c.b)), c.sameDatum);
  }
}

TEST(ProjectionPlugin, RefusesWhatIsNoSystem) {
  for (const char* text : {"", "  ", "garbage", "EPSG:", "EPSG:999999", "WGS 84", "PROJCS[\"x\"",
                           "+proj=nosuch", "GEOGCS[]", "[", "::::", "EPSG:-1"}) {
    CoordSys system;
    EXPECT_FALSE(system.SetFromString(text)) << text;
    EXPECT_TRUE(system.IsEmpty());
    String written("old");
    system.ToString(written);
    EXPECT_TRUE(written == "");
  }
}

TEST(ProjectionPlugin, MarksPointsThatCanNotBeCarried) {
  StdGeoRef geographic, projected;
  geographic.SetCoordinateSystem(MakeCoordSys("EPSG:4326"));
  projected.SetCoordinateSystem(MakeCoordSys("EPSG:3857"));
  double xy[] = {10, 50, 10, 91, NAN, 50, 11, 51};
  Array<double> points(xy, ArrayDims(4, 2));
  EXPECT_FALSE(geographic.MapToMap(points, projected));
  EXPECT_NEAR(xy[0], 1113194.907932736, 1e-6);  // 10 degrees of 6378137 m
  for (int i = 2; i < 6; ++i) EXPECT_EQ(xy[i], HUGE_VAL) << i;
  EXPECT_TRUE(std::isfinite(xy[6]));
  // A local system has no place on Earth.
  StdGeoRef local;
  local.SetCoordinateSystem(MakeCoordSys("LOCAL_CS[\"here\",UNIT[\"m\",1]]"));
  double one[] = {10, 50};
  Array<double> point(one, ArrayDims(1, 2));
  EXPECT_FALSE(geographic.MapToMap(point, local));
  EXPECT_EQ(one[0], HUGE_VAL);
}

TEST(ProjectionPlugin, GeographicPositionsAreDegreesFromGreenwich) {
  const CoordSys paris = MakeCoordSys("EPSG:4807");  // grads from Paris
  double longitude = 0, latitude = 0;
  paris.MapToGeo(0, 50, longitude, latitude);
  EXPECT_NEAR(longitude, 2.5969213 * 0.9, 1e-9);
  EXPECT_NEAR(latitude, 45, 1e-12);
}

TEST(ProjectionPlugin, ServesManyThreads) {
  const CoordSys utm = MakeCoordSys("EPSG:32618");
  const CoordSys grid = MakeCoordSys("EPSG:27700");
  std::vector<std::thread> threads;
  std::atomic<int> wrong{0};
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 20; ++i) {
        const CoordSys copy(utm);
        double xy[] = {-75, 40, -74, 41};
        Array<double> points(xy, ArrayDims(2, 2));
        copy.Project(points);
        copy.GeoTransform(grid, points, {});
        CoordSys fresh;
        fresh.SetFromString("EPSG:3031");
        if (fresh.IsEmpty()) ++wrong;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(wrong, 0);
}

}  // namespace
}  // namespace lumo
