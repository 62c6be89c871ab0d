#include "georef/rpc_georef.h"

#include <atomic>
#include <cmath>
#include <random>
#include <thread>

#include "commands/value_text.h"
#include "georef/std_georef.h"
#include "support/peer_program.h"
#include "support/rpc_file.h"
#include "support/sample_data.h"

namespace lumo {
namespace {

using Points = std::vector<std::array<double, 3>>;

/// The model of the sample scene; null when there is no sample data.
RpcGeoRefPtr SampleModel() {
  const std::string path = test::SampleData("rpc_scene.RPB");
  if (path.empty()) return {};
  const RpcGeoRefPtr model(new RpcGeoRef);
  model->SetCoefficients(test::LoadRpb(path));
  return model;
}

Array<double> ToArray(const Points& points, unsigned width) {
  Array<double> array{ArrayDims(static_cast<unsigned>(points.size()), width)};
  for (unsigned i = 0; i < points.size(); ++i) {
    for (unsigned j = 0; j < width; ++j) array[i * width + j] = points[i][j];
  }
  return array;
}

/// A slope of which the height at (x, y) is a + b x + c y, with a void at its first pixel.
class Slope final : public ElevationModel {
 public:
  Slope(const StdGeoRef& grid, double a, double b, double c) : grid_(grid), a_(a), b_(b), c_(c) {}
  unsigned Samples() const override { return grid_.Samples(); }
  unsigned Lines() const override { return grid_.Lines(); }
  const GeoRef* Reference() const override { return &grid_; }
  bool ReadHeights(const SubRect& rect, Array<double>& heights) const override {
    if (!heights.Resize(ArrayDims(rect.Height(), rect.Width()))) return false;
    double* next = heights.begin();
    for (unsigned y = rect.top; y <= rect.bottom; ++y) {
      for (unsigned x = rect.left; x <= rect.right; ++x) {
        *next++ = x == 0 && y == 0 ? NAN : At(x, y);
      }
    }
    return true;
  }
  URI GetURI() const override { return URI("slope of the test"); }
  double At(double x, double y) const { return a_ + b_ * x + c_ * y; }

 private:
  const StdGeoRef grid_;
  const double a_, b_, c_;
};

StdGeoRef SlopeGrid() {
  StdGeoRef grid;
  CoordSys wgs84;
  wgs84.SetFromString("EPSG:4326");
  grid.SetCoordinateSystem(wgs84);
  grid.SetPixelSize(0.0005, 0.0005);
  grid.SetTieMap(12.55, 41.9);
  grid.SetDimensions(150, 100);
  return grid;
}

TEST(RpcGeoRef, GivesThePublishedPositions) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull()) GTEST_SKIP() << "no sample data";
  // GDAL's pixels have their centres at .5, the model's at whole numbers. These figures were made
  // with its usual tolerance of 0.1 pixel, a pixel being 2e-5 degrees.
  const Points pixels = {{10, 10, 95}, {100, 200, 95}, {300, 50, 300}, {0, 351, 0}};
  const Points want = {{12.5632241647, 41.8902222008, 95},
                       {12.5650623058, 41.8875234010, 95},
                       {12.5685707832, 41.8893033567, 300},
                       {12.5633410274, 41.8855235095, 0}};
  Array<double> points = ToArray(pixels, 3);
  ASSERT_TRUE(model->PixelToMap(points));
  for (unsigned i = 0; i < want.size(); ++i) {
    for (unsigned j = 0; j < 3; ++j) EXPECT_NEAR(points[3 * i + j], want[i][j], 2e-6) << i;
  }
  ASSERT_TRUE(model->MapToPixel(points));
  for (unsigned i = 0; i < want.size(); ++i) {
    for (unsigned j = 0; j < 3; ++j) EXPECT_NEAR(points[3 * i + j], pixels[i][j], 1e-3) << i;
  }
}

TEST(RpcGeoRef, AgreesWithPeerProgram) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull() || !test::HasProgram("gdaltransform")) GTEST_SKIP() << "no peer or no data";
  std::mt19937 random(7);
  std::uniform_real_distribution<double> pixel(-200, 1800), height(0, 600);
  Points pixels(2000);
  for (auto& p : pixels) p = {pixel(random), pixel(random), height(random)};
  Points theirs = pixels;
  for (auto& p : theirs) p = {p[0] + 0.5, p[1] + 0.5, p[2]};
  const std::string tool = "gdaltransform -rpc -to RPC_PIXEL_ERROR_THRESHOLD=0.000001 ";
  const std::string scene = test::SampleData("rpc_scene.tif");
  const Points ground = test::RunOnPoints(tool + scene, theirs, 3);
  ASSERT_EQ(ground.size(), pixels.size());

  Array<double> points = ToArray(ground, 3);
  for (unsigned i = 0; i < pixels.size(); ++i) points[3 * i + 2] = pixels[i][2];
  ASSERT_TRUE(model->MapToPixel(points));
  for (unsigned i = 0; i < pixels.size(); ++i) {
    ASSERT_NEAR(points[3 * i], pixels[i][0], 1e-3);
    ASSERT_NEAR(points[3 * i + 1], pixels[i][1], 1e-3);
  }
  // And from our positions back by the peer.
  points = ToArray(pixels, 3);
  ASSERT_TRUE(model->PixelToMap(points));
  Points located(pixels.size());
  for (unsigned i = 0; i < pixels.size(); ++i) {
    located[i] = {points[3 * i], points[3 * i + 1], pixels[i][2]};
  }
  const Points back = test::RunOnPoints(tool + "-i " + scene, located, 3);
  ASSERT_EQ(back.size(), pixels.size());
  for (unsigned i = 0; i < pixels.size(); ++i) {
    ASSERT_NEAR(back[i][0] - 0.5, pixels[i][0], 1e-3);
    ASSERT_NEAR(back[i][1] - 0.5, pixels[i][1], 1e-3);
  }
}

TEST(RpcGeoRef, FollowsTheTerrain) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull()) GTEST_SKIP() << "no sample data";
  const StdGeoRef grid = SlopeGrid();
  auto* const slope = new Slope(grid, 100, 1.5, 0.5);
  model->SetDem(ElevationModelPtr(slope), 10);
  Points pixels;
  for (int i = 0; i < 150; ++i) pixels.push_back({i * 5.0, 700 - i * 4.0, 0});
  Array<double> points = ToArray(pixels, 2);
  ASSERT_TRUE(model->PixelToMap(points));
  RpcGeoRef flat(*model);
  flat.SetDem(ElevationModelPtr());
  Points triples;
  for (unsigned i = 0; i < pixels.size(); ++i) {
    double x = 0, y = 0;
    grid.MapToPixel(points[2 * i], points[2 * i + 1], x, y);
    triples.push_back({points[2 * i], points[2 * i + 1], slope->At(x, y) + 10});
  }
  // At the height of the terrain there, the bare model gives the pixel again. The rounds stop when
  // the height changes by a metre or less, which is under a pixel here.
  Array<double> back = ToArray(triples, 3);
  ASSERT_TRUE(flat.MapToPixel(back));
  for (unsigned i = 0; i < pixels.size(); ++i) {
    EXPECT_NEAR(back[3 * i], pixels[i][0], 0.5) << i;
    EXPECT_NEAR(back[3 * i + 1], pixels[i][1], 0.5) << i;
  }
  // Forward: the height of the nearest pixel, left in the third column; outside it stays.
  Array<double> forward = ToArray({{12.55 + 0.0005 * 20.4, 41.9 - 0.0005 * 30.6, 0},
                                   {12.55 + 0.0005 * 500, 41.9, 33},
                                   {12.55, 41.9, 44}},
                                  3);
  ASSERT_TRUE(model->MapToPixel(forward));
  EXPECT_DOUBLE_EQ(forward[2], slope->At(20, 31) + 10);
  EXPECT_EQ(forward[5], 33);
  EXPECT_EQ(forward[8], 44);
}

TEST(RpcGeoRef, PartsAndResamplingsMoveThePixels) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull()) GTEST_SKIP() << "no sample data";
  model->SetDimensions(349, 352);
  double x = 0, y = 0, mapX = 0, mapY = 0;
  ASSERT_TRUE(model->PixelToMap(100, 120, mapX, mapY));
  const GeoRefPtr part = model->SubRectGeoRef(SubRect(30, 40, 129, 139));
  EXPECT_TRUE(part->MapToPixel(mapX, mapY, x, y));
  EXPECT_NEAR(x, 70, 1e-3);
  EXPECT_NEAR(y, 80, 1e-3);
  EXPECT_EQ(part->Samples(), 100U);
  const GeoRefPtr half = part->ResampledGeoRef(part->PixelSizeX() * 2, part->PixelSizeY() * 2);
  EXPECT_TRUE(half->MapToPixel(mapX, mapY, x, y));
  EXPECT_NEAR(x, 35, 1e-3);
  EXPECT_NEAR(y, 40, 1e-3);
  EXPECT_EQ(half->Samples(), 50U);
  EXPECT_TRUE(half->PixelToMap(35, 40, x, y));
  EXPECT_NEAR(x, mapX, 1e-8);
  EXPECT_NEAR(y, mapY, 1e-8);
}

TEST(RpcGeoRef, ProjectsIntoItsCoordinateSystem) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull()) GTEST_SKIP() << "no sample data";
  double longitude = 0, latitude = 0, x = 0, y = 0;
  model->PixelToMap(100, 120, longitude, latitude);
  CoordSys utm;
  ASSERT_TRUE(utm.SetFromString("EPSG:32633"));
  model->SetCoordinateSystem(utm);
  double mapX = 0, mapY = 0, backX = 0, backY = 0;
  EXPECT_TRUE(model->PixelToMap(100, 120, mapX, mapY));
  utm.MapToGeo(mapX, mapY, x, y);
  EXPECT_NEAR(x, longitude, 1e-9);
  EXPECT_NEAR(y, latitude, 1e-9);
  EXPECT_TRUE(model->MapToPixel(mapX, mapY, backX, backY));
  EXPECT_NEAR(backX, 100, 1e-3);
  EXPECT_NEAR(backY, 120, 1e-3);
  double values[] = {mapX, mapY, 1e30, 1e30};
  Array<double> points(values, ArrayDims(2, 2));
  EXPECT_FALSE(model->MapToPixel(points));
  EXPECT_NEAR(values[0], 100, 1e-3);
  EXPECT_EQ(values[2], HUGE_VAL);
  EXPECT_EQ(values[3], HUGE_VAL);
}

TEST(RpcGeoRef, BadInputEndsAndShows) {
  RpcGeoRef never;
  double x = 0, y = 0;
  EXPECT_TRUE(never.PixelToMap(1, 2, x, y));
  EXPECT_TRUE(std::isnan(x));
  never.SetDimensions(10, 10);
  EXPECT_EQ(never.MapExtent()[2], 0);
  double values[] = {1, 2, 3, 4};
  Array<double> wide(values, ArrayDims(1, 4));
  EXPECT_FALSE(never.PixelToMap(wide));
  EXPECT_EQ(values[3], 0);

  RpcCoefficients singular;  // sample and line are the same quantity
  singular.lineOffset = singular.sampleOffset = 0;
  singular.lineScale = singular.sampleScale = 100;
  singular.latitudeScale = singular.longitudeScale = singular.heightScale = 1;
  singular.lineNumerator[1] = singular.sampleNumerator[1] = 1;
  singular.lineDenominator[0] = singular.sampleDenominator[0] = 1;
  RpcGeoRef model;
  model.SetCoefficients(singular);
  model.PixelToMap(50, 60, x, y);
  EXPECT_FALSE(std::isfinite(x));
  singular.lineNumerator = {0, 0, 1};
  model.SetCoefficients(singular);
  ASSERT_TRUE(model.PixelToMap(50, 60, x, y));
  EXPECT_NEAR(x, 0.5, 1e-9);
  EXPECT_NEAR(y, 0.6, 1e-9);
  model.PixelToMap(NAN, 60, x, y);
  EXPECT_TRUE(std::isnan(x) && std::isnan(y));
  model.PixelToMap(HUGE_VAL, 60, x, y);
  EXPECT_FALSE(std::isfinite(x));
}

TEST(RpcGeoRef, TextReadsBackBitForBit) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull()) GTEST_SKIP() << "no sample data";
  static const ElevationModelPtr known(new Slope(SlopeGrid(), 1, 2, 3));
  ElevationModel::SetFinder(
      [](const URI& uri) { return uri == known->GetURI() ? known : ElevationModelPtr(); });
  model->SetDem(known, 3.7);
  model->SetDimensions(349, 352);
  const String text = FormatValue(GeoRefPtr(model));
  const RpcGeoRefPtr back(ParseValue<GeoRefPtr>(text));
  ASSERT_FALSE(back.IsNull());
  EXPECT_EQ(FormatValue(GeoRefPtr(back)).ToUTF8(), text.ToUTF8());
  EXPECT_TRUE(back->Dem() == known);
  EXPECT_EQ(back->Coefficients().sampleDenominator, model->Coefficients().sampleDenominator);
  ElevationModel::SetFinder(nullptr);
  EXPECT_TRUE(RpcGeoRefPtr(ParseValue<GeoRefPtr>(text))->Dem().IsNull());
}

TEST(RpcGeoRef, ServesManyThreadsOnceItHasItsSize) {
  const RpcGeoRefPtr model = SampleModel();
  if (model.IsNull()) GTEST_SKIP() << "no sample data";
  CoordSys utm;
  utm.SetFromString("EPSG:32633");
  model->SetCoordinateSystem(utm);
  model->SetDimensions(349, 352);
  const double latitude = model->CenterLatitude();
  std::vector<std::thread> threads;
  std::atomic<int> wrong{0};
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 20; ++i) {
        double x = 0, y = 0, mapX = 0, mapY = 0;
        model->PixelToMap(i, i, mapX, mapY);
        model->MapToPixel(mapX, mapY, x, y);
        if (std::abs(x - i) > 1e-3 || model->CenterLatitude() != latitude) ++wrong;
        if (model->MapExtent()[0] == 0) ++wrong;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(wrong, 0);
}

}  // namespace
}  // namespace lumo
