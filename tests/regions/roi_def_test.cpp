#include <filesystem>
#include <fstream>

#include "commands/catalog.h"
#include "regions/pixel_address_roi_def.h"
#include "regions/region_support.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::CommandOutcome;
using test::RunCommand;

Array<Point2D<unsigned>> Addresses(std::initializer_list<Point2D<unsigned>> list) {
  Array<Point2D<unsigned>> points{ArrayDims(static_cast<unsigned>(list.size()))};
  std::copy(list.begin(), list.end(), points.begin());
  return points;
}

std::uint64_t CountIn(const PixelAddressROIDef& region, const SubRect& rect) {
  Array<unsigned char> mask;
  std::uint64_t count = 99;
  EXPECT_TRUE(region.Mask(rect, mask, count));
  EXPECT_EQ(mask.GetDims(), ArrayDims(rect.Height(), rect.Width()));
  return count;
}

TEST(PixelAddressROIDef, GrowsInTilesWithItsAddresses) {
  PixelAddressROIDef region;
  EXPECT_EQ(region.Samples(), 0U);
  EXPECT_EQ(region.Lines(), 0U);
  EXPECT_FALSE(region.Contains({0, 0}));
  EXPECT_EQ(CountIn(region, {0, 0, 9, 9}), 0U);

  ASSERT_TRUE(region.SetAddresses(Addresses({{300, 10}, {300, 10}})));
  EXPECT_EQ(region.Samples(), 512U);
  EXPECT_EQ(region.Lines(), 256U);
  EXPECT_EQ(region.TileColumns(), 2U);
  EXPECT_EQ(region.TileRows(), 1U);
  EXPECT_EQ(region.GridRevision(), 1U);
  SubRect bounds;
  ASSERT_TRUE(region.Bounds(bounds));
  EXPECT_EQ(bounds, SubRect(300, 10, 300, 10));
  EXPECT_TRUE(region.Contains({300, 10}));
  EXPECT_EQ(CountIn(region, {290, 0, 600, 300}), 1U);
  EXPECT_EQ(region.Tile(0, 1)->Revision(), 1U);
  const PixelAddressTilePtr kept = region.Tile(0, 1);

  // Other addresses, further down: the grid grows, the tile stays, the earlier ones are gone.
  ASSERT_TRUE(region.SetAddresses(Addresses({{3, 700}, {511, 255}})));
  EXPECT_EQ(region.TileColumns(), 2U);
  EXPECT_EQ(region.TileRows(), 3U);
  EXPECT_EQ(region.GridRevision(), 2U);
  EXPECT_TRUE(region.Tile(0, 1) == kept);
  EXPECT_EQ(kept->Revision(), 2U);
  EXPECT_FALSE(region.Contains({300, 10}));
  EXPECT_EQ(CountIn(region, {0, 0, 599, 799}), 2U);
  EXPECT_EQ(CountIn(region, {0, 0, 510, 699}), 0U);

  ASSERT_TRUE(region.SetAddresses({}));
  EXPECT_FALSE(region.Contains({3, 700}));
  EXPECT_EQ(CountIn(region, {0, 0, 599, 799}), 0U);
  EXPECT_EQ(region.Samples(), 512U);
}

TEST(PixelAddressROIDef, KeepsAFixedGrid) {
  PixelAddressROIDef region(300, 257);
  EXPECT_EQ(region.TileColumns(), 2U);
  EXPECT_EQ(region.TileRows(), 2U);
  EXPECT_EQ(region.Tile(1, 1)->Rect(), SubRect(256, 256, 299, 256));
  ASSERT_TRUE(region.SetAddresses(Addresses({{299, 256}, {300, 256}, {2, 9999}})));
  EXPECT_EQ(region.Samples(), 300U);
  EXPECT_TRUE(region.Contains({299, 256}));
  EXPECT_FALSE(region.Contains({300, 256}));
  EXPECT_EQ(CountIn(region, {0, 0, 400, 400}), 1U);
}

TEST(PixelAddressROIDef, MovesRectangles) {
  PixelAddressROIDef region;
  ASSERT_TRUE(region.SetAddresses(Addresses({{0, 0}, {5, 6}})));
  Array<unsigned char> mask;
  std::uint64_t count = 0;
  ASSERT_TRUE(region.Mask({0, 0, 3, 3}, 4, 5, mask, count));
  EXPECT_EQ(count, 1U);
  EXPECT_EQ(mask[1 * 4 + 1], 1);
  ASSERT_TRUE(region.Mask({0, 0, 3, 3}, -2, -1, mask, count));
  EXPECT_EQ(count, 1U);
  EXPECT_EQ(mask[1 * 4 + 2], 1);
}

TEST(PixelAddressROIDef, RefusesAddressesTooFarApart) {
  PixelAddressROIDef region;
  ASSERT_TRUE(region.SetAddresses(Addresses({{7, 7}})));
  for (const Point2D<unsigned> far : {Point2D<unsigned>{0xFFFFFFFF, 0xFFFFFFFF},
                                      Point2D<unsigned>{0xFFFFFFFF, 0},
                                      {1U << 20, 1U << 20}}) {
    EXPECT_FALSE(region.SetAddresses(Addresses({{1, 1}, far})));
    region.ClearErrorState();
    EXPECT_TRUE(region.Contains({7, 7}));
    EXPECT_EQ(region.Samples(), 256U);
  }
}

TEST(GroupROIDef, TellsChangesOfItsChildren) {
  GroupROIDef group({});
  EXPECT_EQ(group.Revision(), 0U);
  Array<ROIDefPtr> children{ArrayDims(1)};
  children[0].Reset(new PixelAddressROIDef);
  group.SetChildren(children);
  EXPECT_EQ(group.Revision(), 1U);
  EXPECT_TRUE(group.Children()[0] == children[0]);
}

TEST(RegionCommands, SetPixelsOfARegion) {
  const CommandOutcome made = RunCommand("CreatePixelAddressROIDefCommand", {});
  ASSERT_TRUE(made.Succeeded());
  const std::string uri = made.outputs.at("URI");
  const URI key = ParseValue<URI>(String(uri));
  EXPECT_EQ(GetGlobalDataMap().Find(key).count, 1U);
  ASSERT_TRUE(RunCommand("SetPixelAddressCommand",
                         {{"SrcURI", uri}, {"Addrs", "1:7 [1 2 3 4 4294967301 6 7] "}})
                  .Succeeded());
  const PixelAddressROIDefPtr region(catalog::Find(key));
  ASSERT_TRUE(region);
  EXPECT_EQ(CountIn(*region, {0, 0, 255, 255}), 3U);
  EXPECT_TRUE(region->Contains({5, 6}));

  for (const std::string addresses : {"1:4 [1 2", "xx", "1:2 [4294967295 4294967295] "}) {
    EXPECT_FALSE(
        RunCommand("SetPixelAddressCommand", {{"SrcURI", uri}, {"Addrs", addresses}}).Succeeded())
        << addresses;
  }
  EXPECT_EQ(CountIn(*region, {0, 0, 255, 255}), 3U);
  EXPECT_FALSE(RunCommand("SetPixelAddressCommand", {{"SrcURI", "[none] "}, {"Addrs", "1:0 [] "}})
                   .Succeeded());
  catalog::Release(key);
}

constexpr const char* kTwoFields = R"({"type":"FeatureCollection","features":[
{"type":"Feature","properties":{"name":"a","n":1},"geometry":{"type":"Polygon",
"coordinates":[[[0,0],[4,0],[4,4],[0,4],[0,0]],[[1,1],[1,3],[3,3],[3,1],[1,1]]]}},
{"type":"Feature","properties":{"name":"b","n":2},"geometry":{"type":"MultiPoint",
"coordinates":[[8.5,8.5],[9.5,9.5]]}},
{"type":"Feature","properties":{"name":"c","n":3},"geometry":null}]})";

class ShapeCommands : public testing::Test {
 protected:
  std::string Write(const char* name, const std::string& text) {
    const std::string path = (directory_.Path() / name).string();
    std::ofstream(path) << text;
    return path;
  }

  test::TemporaryDirectory directory_;
};

TEST_F(ShapeCommands, MakeRegionsOfFiles) {
  const std::string path = Write("shapes.geojson", kTwoFields);
  const struct {
    std::map<std::string, std::string> inputs;
    const char* shapes;
    std::uint64_t pixels;
  } cases[] = {
      {{{"Vectors", path}}, "2", 14},
      {{{"Vectors", path}, {"Where", "n=1.0"}}, "1", 12},
      {{{"Vectors", path}, {"Where", "NAME=b"}, {"Layer", "0"}}, "1", 2},
      {{{"Vectors", path + "|" + path}, {"Where", "name=b"}, {"Layer", "shapes"}}, "2", 2},
  };
  for (const auto& c : cases) {
    auto inputs = c.inputs;
    inputs["Coordinates"] = "Pixel";
    const CommandOutcome made = RunCommand("CreateGeometryROIDefCommand", inputs);
    ASSERT_TRUE(made.Succeeded()) << made.reason;
    EXPECT_EQ(made.outputs.at("Shapes"), c.shapes);
    const ROIDefPtr region(catalog::Find(ParseValue<URI>(String(made.outputs.at("URI")))));
    ASSERT_TRUE(region);
    Array<unsigned char> mask;
    std::uint64_t count = 0;
    ASSERT_TRUE(RasterizeOn(region, 12, 12, {})->Mask({0, 0, 11, 11}, mask, count));
    EXPECT_EQ(count, c.pixels) << c.shapes;
  }
}

TEST_F(ShapeCommands, RefuseBadFiles) {
  const std::string path = Write("shapes.geojson", kTwoFields);
  const std::string empty = Write("empty.geojson", R"({"type":"FeatureCollection","features":[]})");
  const std::string mixed = Write(
      "mixed.geojson",
      R"({"type":"Feature","properties":{},"geometry":{"type":"GeometryCollection","geometries":
[{"type":"Point","coordinates":[1,1]},{"type":"LineString","coordinates":[[1,1],[2,2]]}]}})");
  const std::string numberless = Write("bad.csv", "id,WKT\n1,\"POLYGON((0 0,1e400 1,1 1,0 0))\"\n");
  const struct {
    std::map<std::string, std::string> inputs;
    const char* reason;
  } cases[] = {
      {{{"Vectors", path}, {"Where", "nam=b"}}, "no field \"nam\"; did you mean name?"},
      {{{"Vectors", path}, {"Where", "n=x"}}, "field \"n\" holds numbers, which \"x\" isn't"},
      {{{"Vectors", path}, {"Where", "name"}}, "isn't of the form FIELD=VALUE"},
      {{{"Vectors", path}, {"Where", "n=7"}}, "no shape has n=7"},
      {{{"Vectors", path}, {"Layer", "1"}}, "no layer \"1\""},
      {{{"Vectors", empty}}, "there is no shape in it"},
      {{{"Vectors", mixed}}, "isn't made of points, lines or polygons alone"},
      {{{"Vectors", numberless}}, "a coordinate is not a number"},
      {{{"Vectors", path + "no"}}, "no such file"},
  };
  for (const auto& c : cases) {
    const CommandOutcome made = RunCommand("CreateGeometryROIDefCommand", c.inputs);
    EXPECT_FALSE(made.Succeeded()) << c.reason;
    EXPECT_NE(made.reason.find(c.reason), std::string::npos) << made.reason;
  }
}

}  // namespace
}  // namespace lumo
