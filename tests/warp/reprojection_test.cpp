#include "warp/reprojection.h"

#include <cmath>
#include <numbers>
#include <numeric>

#include "commands/catalog.h"
#include "georef/rpc_georef.h"
#include "support/placed_raster.h"
#include "support/run_command.h"
#include "warp/projected_raster.h"

namespace lumo {
namespace {

constexpr auto kPolynomial = ReprojectionMethod::kPolynomial;
constexpr auto kRigorous = ReprojectionMethod::kRigorous;
constexpr auto kNearest = PyramidResamplingMethod::kNearest;
constexpr auto kLinear = PyramidResamplingMethod::kLinear;
constexpr auto kCubic = PyramidResamplingMethod::kCubic;

template <typename T>
struct Block {
  Array<T> pixels;
  Array<unsigned char> state;
  bool whole = false;
};

template <typename T>
Block<T> Reproject(const Reprojection<T>& reprojection, Raster<T>& raster, const SubRect& rect,
                   const std::vector<unsigned>& bands = {0},
                   Interleave interleave = Interleave::BIP) {
  Block<T> block;
  block.whole =
      reprojection.Reproject(raster, rect, MakeArray(bands), interleave, block.pixels, block.state);
  return block;
}

template <typename T>
Block<T> Read(Raster<T>& raster, const SubRect& rect, const std::vector<unsigned>& bands = {0}) {
  Block<T> block;
  block.whole =
      raster.GetSubRect(rect, MakeArray(bands), Interleave::BIP, block.pixels, block.state);
  return block;
}

template <typename T>
SubRect AllOf(const Raster<T>& raster) {
  return {0, 0, raster.Samples() - 1, raster.Lines() - 1};
}

template <typename T>
std::vector<T> Values(const Array<T>& array) {
  return {array.begin(), array.end()};
}

/// A line of pixels, twice, seen through a grid whose first pixel begins `shift` pixels to the
/// right, and two pixels of it.
template <typename T>
std::vector<T> SeenShifted(const std::vector<T>& line, double shift, ReprojectionMethod method,
                           PyramidResamplingMethod resampling, WarpSampling sampling) {
  const auto samples = static_cast<unsigned>(line.size());
  const auto raster = MakePlaced<T>(MakeGrid(0, 0, 1, samples, 12), 1,
                                    [&](unsigned x, unsigned, unsigned) { return line[x]; });
  Reprojection<T> reprojection(MakeGrid(shift, 0, 1, samples, 12), method, resampling);
  reprojection.SetSampling(sampling);
  return Values(Reproject(reprojection, *raster, {0, 5, 1, 5}).pixels);
}

TEST(Reprojection, WeighsNeighboursAsTheSamplingSays) {
  using Bytes = std::vector<std::uint8_t>;
  const Bytes line{10, 20, 31, 50, 90, 255, 0, 255, 255, 255, 255, 255};
  const struct {
    const char* name;
    double shift;
    PyramidResamplingMethod resampling;
    WarpSampling sampling;
    Bytes want;
  } cases[] = {
      {"the pixel it falls into", 1.25, kNearest, WarpSampling::kCorner, {20, 31}},
      // The position of a pixel's centre is half a pixel on, and counts from a pixel's corner:
      // 20 + 11 * 0.75 = 28.25, 31 + 19 * 0.75 = 45.25
      {"linear from the corner", 1.25, kLinear, WarpSampling::kCorner, {28, 45}},
      // 20 + 11 * 0.25 = 22.75, 31 + 19 * 0.25 = 35.75
      {"linear from the centre, rounded", 1.25, kLinear, WarpSampling::kCentred, {23, 36}},
      // Weights at a half are -1/8, 5/8, 5/8, -1/8: (-20 + 5 * 31 + 5 * 50 - 90) / 8 = 36.875, and
      // (-31 + 5 * 50 + 5 * 90 - 255) / 8 = 51.75
      {"cubic from the corner", 2, kCubic, WarpSampling::kCorner, {36, 51}},
      {"cubic from the centre, rounded", 2.5, kCubic, WarpSampling::kCentred, {37, 52}},
      // (-90 + 5 * 255 + 0 - 255) / 8 = 116.25; (-255 + 5 * 0 + 5 * 255 - 255) / 8 = 95.6
      {"cubic over an edge", 5, kCubic, WarpSampling::kCorner, {116, 95}},
      // (-0 + 5 * 255 + 5 * 255 - 255) / 8 = 286.9 is more than a byte holds
      {"cubic beyond the type", 7, kCubic, WarpSampling::kCorner, {255, 255}},
  };
  for (const auto& c : cases) {
    for (const ReprojectionMethod method : {kPolynomial, kRigorous}) {
      SCOPED_TRACE(testing::Message() << c.name << ", method " << static_cast<unsigned>(method));
      EXPECT_EQ(SeenShifted(line, c.shift, method, c.resampling, c.sampling), c.want);
    }
  }
  const auto below = SeenShifted<float>({0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 0, 0}, 0.5, kRigorous,
                                        kCubic, WarpSampling::kCentred);
  EXPECT_EQ(below, (std::vector<float>{-0.125f, 0.625f}));  // floats may overshoot
}

TEST(Reprojection, GivesTheSamePixelsInEveryOrder) {
  const auto raster = MakePlaced<std::int16_t>(
      MakeGrid(0, 0, 1, 300, 40), 3, [](unsigned x, unsigned y, unsigned band) {
        return static_cast<std::int16_t>(x * 7 + y * 31 + band * 1000);
      });
  raster->states[raster->At(20, 20, 1)] = PixelValueState::Masked;
  const SubRect rect{3, 2, 280, 30};
  for (const PyramidResamplingMethod resampling : {kNearest, kLinear, kCubic}) {
    Reprojection<std::int16_t> reprojection(MakeGrid(0.7, -0.4, 1, 300, 40), kRigorous, resampling);
    const auto bip = Reproject(reprojection, *raster, rect, {2, 0, 1});
    ASSERT_TRUE(bip.whole);
    EXPECT_EQ(std::count_if(bip.state.begin(), bip.state.end(), [](auto s) { return s != 0; }), 1);
    for (const Interleave order : {Interleave::BIL, Interleave::BSQ}) {
      const auto other = Reproject(reprojection, *raster, rect, {2, 0, 1}, order);
      std::vector<std::int16_t> turned(other.pixels.GetCount());
      std::vector<unsigned char> turnedState(turned.size());
      ASSERT_TRUE(ConvertInterleave(other.pixels.GetData(), order, turned.data(), Interleave::BIP,
                                    rect.Width(), rect.Height(), 3, 2));
      ASSERT_TRUE(ConvertInterleave(other.state.GetData(), order, turnedState.data(),
                                    Interleave::BIP, rect.Width(), rect.Height(), 3, 1));
      EXPECT_EQ(turned, Values(bip.pixels));
      EXPECT_EQ(turnedState, Values(bip.state));
    }
  }
}

TEST(Reprojection, MarksWhatLiesOutside) {
  const auto raster = MakePlaced<int>(
      MakeGrid(0, 0, 1, 20, 20), 1,
      [](unsigned x, unsigned y, unsigned) { return static_cast<int>(100 * y + x); });
  raster->noData = -5;
  const GeoRefPtr grid = MakeGrid(-2, 1, 1, 24, 22);  // two columns before, one line above
  for (const auto method : {kPolynomial, kRigorous}) {
    const Reprojection<int> reprojection(grid, method, kNearest);
    const auto block = Reproject(reprojection, *raster, {0, 0, 23, 21});
    ASSERT_TRUE(block.whole);
    // The rigorous method leaves out the last column and line.
    const unsigned side = method == kRigorous ? 19 : 20;
    for (unsigned y = 0; y < 22; ++y)
      for (unsigned x = 0; x < 24; ++x) {
        const bool inside = x >= 2 && x < 2 + side && y >= 1 && y < 1 + side;
        EXPECT_EQ(block.pixels[y * 24 + x], inside ? static_cast<int>(100 * (y - 1) + x - 2) : -5);
        EXPECT_EQ(block.state[y * 24 + x], inside ? 0 : PixelValueState::NoData);
      }
  }

  const Reprojection<int> away(MakeGrid(1000, 1000, 1, 50, 50), kPolynomial, kLinear);
  const auto missed = Reproject(away, *raster, {0, 0, 9, 9});
  EXPECT_FALSE(missed.whole);
  EXPECT_EQ(Values(missed.pixels), std::vector<int>(100, -5));
  EXPECT_EQ(Values(missed.state), std::vector<unsigned char>(100, 1));

  raster->fails = true;
  const auto failed =
      Reproject(Reprojection<int>(grid, kPolynomial, kLinear), *raster, {4, 4, 13, 13});
  EXPECT_FALSE(failed.whole);
  EXPECT_EQ(Values(failed.pixels), std::vector<int>(100, -5));
  EXPECT_EQ(Values(failed.state), std::vector<unsigned char>(100, 1));
}

TEST(Reprojection, LeavesOutNeighboursThatAreNotValid) {
  const auto raster =
      MakePlaced<float>(MakeGrid(0, 0, 1, 12, 12), 1,
                        [](unsigned x, unsigned, unsigned) { return static_cast<float>(x); });
  for (unsigned y = 0; y < 12; ++y) {
    raster->states[raster->At(5, y, 0)] = PixelValueState::NoData;
    raster->pixels[raster->At(5, y, 0)] = 1e30f;
    raster->states[raster->At(8, y, 0)] = PixelValueState::Masked;
    raster->states[raster->At(9, y, 0)] = PixelValueState::Masked;
  }
  for (const auto resampling : {kLinear, kCubic}) {
    Reprojection<float> reprojection(MakeGrid(0.25, 0, 1, 11, 12), kRigorous, resampling);
    reprojection.SetSampling(WarpSampling::kCentred);
    reprojection.SetBackground(-1);
    const auto block = Reproject(reprojection, *raster, {4, 6, 8, 6});
    // Between 4 and the pixel left out: 4. Between that and 6: 6. 6.25 is plain for linear, and
    // has neighbours that are left out for cubic. The last one has none that is valid.
    EXPECT_EQ(block.pixels[0], 4.0f);
    EXPECT_EQ(block.pixels[1], 6.0f);
    EXPECT_EQ(block.pixels[2], 6.25f);
    EXPECT_EQ(block.pixels[4], -1.0f);
    EXPECT_EQ(Values(block.state),
              (std::vector<unsigned char>{0, 0, 0, 0, PixelValueState::Masked}));
  }
}

template <typename T>
std::shared_ptr<WarpMap> MapOf(const GeoRefPtr& grid, const PlacedRaster<T>& raster,
                               double tolerance) {
  return std::make_shared<WarpMap>(grid, raster.geoRef, raster.Samples(), raster.Lines(),
                                   tolerance);
}

/// A raster whose two bands are the position of each pixel's centre.
Pointer<PlacedRaster<double>> MakePositions(const GeoRefPtr& grid) {
  return MakePlaced<double>(
      grid, 2, [](unsigned x, unsigned y, unsigned band) { return (band == 0 ? x : y) + 0.5; });
}

TEST(Reprojection, FindsPositionsAcrossCoordinateSystems) {
  const auto raster = MakePositions(MakeGrid(600000, 5000000, 30, 700, 500, "EPSG:32633"));
  const GeoRefPtr grid = MakeGrid(16.3, 45.14, 0.00035, 560, 300, "EPSG:4326");
  Reprojection<double> rigorous(grid, kRigorous, kLinear);
  rigorous.SetSampling(WarpSampling::kCentred);
  const SubRect rect{0, 0, 559, 299};
  const auto exact = Reproject(rigorous, *raster, rect, {0, 1});
  ASSERT_TRUE(exact.whole);

  // Linear interpolation of positions gives the position, so the pixels are compared with the
  // transform itself.
  unsigned checked = 0;
  for (unsigned y = 3; y < 300; y += 37)
    for (unsigned x = 5; x < 560; x += 41) {
      Array<double> point{ArrayDims(1, 2)};
      point[0] = x + 0.5;
      point[1] = y + 0.5;
      ASSERT_TRUE(grid->PixelToPixel(point, *raster->geoRef));
      const std::size_t at = 2 * (y * std::size_t{560} + x);
      if (exact.state[at] != 0) continue;
      if (point[0] < 1 || point[1] < 1 || point[0] > 699 || point[1] > 499) continue;
      EXPECT_NEAR(exact.pixels[at], point[0], 1e-6);
      EXPECT_NEAR(exact.pixels[at + 1], point[1], 1e-6);
      ++checked;
    }
  EXPECT_GT(checked, 50u);

  Reprojection<double> fitted(grid, kPolynomial, kLinear);
  fitted.SetSampling(WarpSampling::kCentred);
  const auto near = Reproject(fitted, *raster, rect, {0, 1});
  Reprojection<double> bounded(grid, kPolynomial, kLinear);
  bounded.SetSampling(WarpSampling::kCentred);
  bounded.SetMap(MapOf(grid, *raster, 0.001));  // cuts the squares
  const auto nearer = Reproject(bounded, *raster, rect, {0, 1});
  double worst = 0, worstNearer = 0;
  for (unsigned i = 0; i < exact.pixels.GetCount(); ++i) {
    if ((exact.state[i] | near.state[i] | nearer.state[i]) != 0) continue;
    worst = std::max(worst, std::abs(exact.pixels[i] - near.pixels[i]));
    worstNearer = std::max(worstNearer, std::abs(exact.pixels[i] - nearer.pixels[i]));
  }
  EXPECT_GT(worst, 0.0);
  EXPECT_LT(worst, 0.5);
  EXPECT_LT(worstNearer, 0.003);

  // No seams: pieces have the same pixels as the whole.
  for (const SubRect& piece : {SubRect{0, 0, 99, 77}, SubRect{100, 50, 400, 299}}) {
    const auto part = Reproject(rigorous, *raster, piece, {0, 1});
    ASSERT_TRUE(part.whole);
    for (unsigned y = 0; y < piece.Height(); ++y)
      for (unsigned i = 0; i < 2 * piece.Width(); ++i) {
        const std::size_t at = 2 * ((piece.top + y) * std::size_t{560} + piece.left) + i;
        ASSERT_EQ(part.pixels[2 * (y * piece.Width()) + i], exact.pixels[at]);
        ASSERT_EQ(part.state[2 * (y * piece.Width()) + i], exact.state[at]);
      }
  }
}

TEST(Reprojection, ShowsAGlobeWithoutWhatIsBehindIt) {
  // Points beyond the horizon can't be carried, and no polynomial goes through them.
  const auto raster = MakePositions(MakeGrid(-180, 90, 1, 360, 180, "EPSG:4326"));
  const GeoRefPtr grid =
      MakeGrid(-7e6, 7e6, 100000, 140, 140, "+proj=ortho +lat_0=40 +lon_0=10 +R=6371000 +type=crs");
  for (const auto method : {kRigorous, kPolynomial}) {
    Reprojection<double> reprojection(grid, method, kLinear);
    reprojection.SetSampling(WarpSampling::kCentred);
    reprojection.SetMap(MapOf(grid, *raster, method == kRigorous ? 0.0 : 0.125));
    reprojection.SetBackground(-1);
    const auto block = Reproject(reprojection, *raster, {0, 0, 139, 139}, {0, 1});
    ASSERT_TRUE(block.whole);
    const auto at = [&](unsigned x, unsigned y) { return &block.pixels[2 * (y * 140 + x)]; };
    EXPECT_EQ(at(2, 2)[0], -1);
    EXPECT_EQ(at(137, 130)[0], -1);
    // The middle of the globe is at 10 degrees east, 40 north.
    EXPECT_NEAR((at(69, 69)[0] + at(70, 70)[0]) / 2, 190, 0.2);
    EXPECT_NEAR((at(69, 69)[1] + at(70, 70)[1]) / 2, 50, 0.2);
    unsigned inside = 0;
    for (unsigned i = 0; i < block.state.GetCount(); i += 2) inside += block.state[i] == 0;
    EXPECT_NEAR(inside, std::numbers::pi * 63.71 * 63.71, 150);  // a disc
  }
}

/// One large band of bytes that notes how much of it is read at once.
class WideRaster final : public TestRaster<std::uint8_t> {
 public:
  explicit WideRaster(unsigned side) : TestRaster(side, side, 1) {}
  RasterDef GetRasterDef() const override {
    RasterDef def = TestRaster::GetRasterDef();
    def.geoRef = MakeGrid(0, 0, 1, Samples(), Lines());
    return def;
  }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>&, Interleave,
                  Array<std::uint8_t>& pixels, Array<unsigned char>& state) override {
    const ArrayDims dims(rect.Height(), rect.Width(), 1);
    if (!pixels.Resize(dims) || !state.Resize(dims)) return false;
    std::fill(state.begin(), state.end(), static_cast<unsigned char>(0));
    for (unsigned y = 0; y < rect.Height(); ++y) {
      std::fill_n(pixels.begin() + std::size_t{y} * rect.Width(), rect.Width(),
                  static_cast<std::uint8_t>((rect.top + y) / 100));
    }
    most = std::max(most, dims.count);
    return true;
  }
  unsigned most = 0;
};

TEST(Reprojection, ReadsMuchOfTheSourceInParts) {
  WideRaster raster(12000);
  const Reprojection<std::uint8_t> reprojection(MakeGrid(0, 0, 200, 60, 60), kRigorous, kNearest);
  const auto block = Reproject(reprojection, raster, {0, 0, 58, 58});
  ASSERT_TRUE(block.whole);
  for (unsigned y = 0; y < 59; ++y) EXPECT_EQ(block.pixels[y * 59 + 7], 2 * y + 1);
  EXPECT_LT(raster.most, 60'000'000u);
}

TEST(ProjectedRaster, SizesItsGridFromTheSource) {
  const RasterPtr<float> raster(
      MakePlaced<float>(MakeGrid(1000, 5000, 10, 100, 50), 1, [](auto...) { return 1.0f; }));
  ProjectedRaster<float> view(raster, MakeGrid(0, 0, 1, 0, 0), kPolynomial, kNearest);
  ASSERT_TRUE(view.IsValid());
  // The grid reaches from the first pixel to the last one: 99 and 49 steps.
  EXPECT_EQ(view.Samples(), 99u);
  EXPECT_EQ(view.Lines(), 49u);
  const RasterDef def = view.GetRasterDef();
  EXPECT_EQ(def.geoRef->TieMapX(), 1000);
  EXPECT_EQ(def.geoRef->TieMapY(), 5000);
  EXPECT_EQ(def.geoRef->PixelSizeX(), 10);
  EXPECT_EQ(def.geoRef->Samples(), 99u);
  EXPECT_FALSE(view.CanWrite());

  // A pixel of 30 m is 30 / 111.1 km high in degrees at 45 north, and wider.
  const RasterPtr<float> utm(MakePlaced<float>(
      MakeGrid(500000, 5000000, 30, 200, 100, "EPSG:32633"), 1, [](auto...) { return 1.0f; }));
  ProjectedRaster<float> degrees(utm, MakeGrid(0, 0, 1, 0, 0, "EPSG:4326"), kPolynomial, kNearest);
  EXPECT_NEAR(degrees.GetRasterDef().geoRef->PixelSizeY(), 30 / 111140.0, 2e-7);
  EXPECT_NEAR(degrees.GetRasterDef().geoRef->PixelSizeX(), 30 / 78850.0, 1e-6);
  EXPECT_NEAR(degrees.Samples(), 200, 4);
  EXPECT_NEAR(degrees.Lines(), 100, 4);
}

TEST(ProjectedRaster, IsEmptyWithoutAGrid) {
  const RasterPtr<float> placed(
      MakePlaced<float>(MakeGrid(0, 0, 1, 20, 20), 1, [](auto...) { return 1.0f; }));
  const RasterPtr<float> unplaced(MakeRamp<float>(20, 20, 1));
  const GeoRefPtr grid = MakeGrid(0, 0, 1, 20, 20);
  ProjectedRaster<float> empties[] = {
      {placed, GeoRefPtr(new RpcGeoRef), kPolynomial, kNearest},
      {unplaced, grid, kPolynomial, kNearest},
      {RasterPtr<float>(), grid, kPolynomial, kNearest},
      {placed, MakeGrid(0, 0, 1, 0, 0), kRigorous, kNearest, {ProjectedGrid::kExact, {}, {}}},
  };
  for (ProjectedRaster<float>& view : empties) {
    EXPECT_FALSE(view.IsValid());
    EXPECT_EQ(view.Samples(), 0u);
    EXPECT_FALSE(Read(view, {0, 0, 3, 3}).whole);
    EXPECT_TRUE(view.PyramidLevel(1).IsNull());
  }
}

TEST(ProjectedRaster, ExactGridsNeverFailOutside) {
  const RasterPtr<float> raster(
      MakePlaced<float>(MakeGrid(0, 0, 1, 20, 20), 2, [](auto...) { return 1.0f; }));
  const GeoRefPtr grid = MakeGrid(-50, 50, 1, 200, 200);
  ProjectedRaster<float> exact(raster, grid, kPolynomial, kLinear,
                               {ProjectedGrid::kExact, WarpSampling::kCentred, -9.0});
  EXPECT_EQ(exact.Samples(), 200u);
  EXPECT_TRUE(exact.HasNoDataValue(1));
  EXPECT_EQ(exact.NoDataValue(1), -9.0f);
  const auto outside = Read(exact, {0, 0, 9, 9}, {1});
  EXPECT_TRUE(outside.whole);
  EXPECT_EQ(Values(outside.pixels), std::vector<float>(100, -9.0f));
  const auto whole = Read(exact, AllOf(exact));
  ASSERT_TRUE(whole.whole);
  EXPECT_EQ(std::count(whole.pixels.begin(), whole.pixels.end(), 1.0f), 400);

  ProjectedRaster<float> computed(raster, grid, kPolynomial, kLinear);
  EXPECT_FALSE(Read(computed, {100, 100, 109, 109}).whole);
}

TEST(ProjectedRaster, GivesStatisticsOfItsOwnPixelsOnAnExactGrid) {
  class Source final : public ComputedRaster<float> {
   public:
    using ComputedRaster::ComputedRaster;
    ~Source() override { StopComputing(); }
  };
  const RasterPtr<float> source(new Source(RasterPtr<float>(
      MakePlaced<float>(MakeGrid(0, 0, 1, 20, 20), 1,
                        [](unsigned x, unsigned y, unsigned) { return 100.0F * y + x; }))));
  const GeoRefPtr grid = MakeGrid(5, -3, 1, 4, 2);  // samples 5 to 8 of lines 3 and 4
  ProjectedRaster<float> exact(source, grid, kPolynomial, kNearest,
                               {ProjectedGrid::kExact, WarpSampling::kCentred, {}});
  const auto all = Read(exact, AllOf(exact));
  ASSERT_TRUE(all.whole);
  const double mean = std::accumulate(all.pixels.begin(), all.pixels.end(), 0.0) / 8;
  EXPECT_EQ(mean, 356.5);  // 350 + (5 + 6 + 7 + 8) / 4
  EXPECT_EQ(exact.Mean(0, IPC()), mean);
  EXPECT_EQ(exact.BandStats(0).pixelCount, 8U);
  exact.HistogramAllBands(0, 1000, 2, HistogramSign::kBoth, IPC())->WaitFinished();
  EXPECT_EQ(exact.BandHistogram(0)[0].counts[0], 8U);
  EXPECT_FALSE(source->StatsExist(0, StatsMask::Mean));
  EXPECT_FALSE(exact.WriteStats());

  ProjectedRaster<float> told(source, grid, kPolynomial, kNearest);
  EXPECT_EQ(told.Mean(0, IPC()), 959.5);  // of all of the source
  EXPECT_TRUE(source->StatsExist(0, StatsMask::Mean));
  told.HistogramAllBands(0, 1000, 2, HistogramSign::kBoth, IPC())->WaitFinished();
  EXPECT_EQ(source->BandHistogram(0).GetCount(), 1U);
}

TEST(CreateProjectedRasterCommand, TakesItsWords) {
  const RasterPtr<std::uint8_t> raster(MakePlaced<std::uint8_t>(
      MakeGrid(600000, 5000000, 30, 400, 300, "EPSG:32633"), 1,
      [](unsigned x, unsigned y, unsigned) { return static_cast<std::uint8_t>(x * 3 + y * y); }));
  catalog::Add(raster);
  const std::string uri = FormatValue(raster->GetURI()).ToUTF8();
  const std::string grid = FormatValue(MakeGrid(0, 0, 1, 0, 0, "EPSG:4326")).ToUTF8();
  const auto make = [&](const char* method, const char* resampling) {
    const auto made =
        test::RunCommand("CreateProjectedRasterCommand", {{"SrcURI", uri},
                                                          {"GeoRef", grid},
                                                          {"ReprojectionMethod", method},
                                                          {"ResamplingMethod", resampling}});
    EXPECT_TRUE(made.Succeeded()) << made.reason;
    const URI of = ParseValue<URI>(String(made.outputs.at("URI")));
    const RasterPtr<std::uint8_t> view(catalog::Find(of));
    Block<std::uint8_t> block = Read(*view, {50, 50, 249, 149});
    EXPECT_TRUE(block.whole);
    catalog::Release(of);
    return Values(block.pixels);
  };
  const auto polynomial = make("Polynomial", "Nearest");
  EXPECT_EQ(make("Triangulation", "Nearest"), polynomial);
  EXPECT_EQ(make("Somehow", "Majority"), polynomial);
  EXPECT_NE(make("Polynomial", "Linear"), polynomial);
  EXPECT_NE(make("Rigorous", "Nearest"), polynomial);
  const auto refused =
      test::RunCommand("CreateProjectedRasterCommand", {{"SrcURI", uri},
                                                        {"GeoRef", "Std 1 2"},
                                                        {"ReprojectionMethod", "Rigorous"},
                                                        {"ResamplingMethod", "Cubic"}});
  EXPECT_FALSE(refused.Succeeded());
  EXPECT_EQ(refused.reason, "GeoRef: the text isn't a geo-reference");
  catalog::Remove(raster);
}

}  // namespace
}  // namespace lumo
