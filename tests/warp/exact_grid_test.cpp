#include <cmath>
#include <random>

#include "georef/std_rpc_georef.h"
#include "support/placed_raster.h"
#include "tasks/thread_limit.h"
#include "warp/projected_raster.h"

// Warps to a grid that is given: a pixel depends on nothing but the pixel.

namespace lumo {
namespace {

constexpr auto kPolynomial = ReprojectionMethod::kPolynomial;
constexpr auto kRigorous = ReprojectionMethod::kRigorous;
constexpr auto kNearest = PyramidResamplingMethod::kNearest;
constexpr auto kLinear = PyramidResamplingMethod::kLinear;
constexpr auto kCubic = PyramidResamplingMethod::kCubic;
constexpr const char* kMollweide = "+proj=moll +lon_0=100 +R=6371000 +type=crs";

template <typename T>
struct Block {
  Array<T> pixels;
  Array<unsigned char> state;
};

template <typename T>
Block<T> Read(Raster<T>& raster, const SubRect& rect, const std::vector<unsigned>& bands,
              Interleave interleave = Interleave::BIP) {
  Block<T> block;
  EXPECT_TRUE(raster.GetSubRect(rect, MakeArray(bands), interleave, block.pixels, block.state));
  return block;
}

template <typename T>
SubRect AllOf(const Raster<T>& raster) {
  return {0, 0, raster.Samples() - 1, raster.Lines() - 1};
}

template <typename T>
ProjectedRaster<T> View(const RasterPtr<T>& raster, const GeoRefPtr& grid,
                        ReprojectionMethod method, PyramidResamplingMethod resampling,
                        WarpSampling sampling = WarpSampling::kCentred) {
  return {raster, grid, method, resampling, {ProjectedGrid::kExact, sampling, 0.0}};
}

/// Noise, some of it not valid, on a grid.
RasterPtr<float> MakeNoise(const GeoRefPtr& grid, unsigned bands) {
  std::mt19937 random(7);
  const auto raster = MakePlaced<float>(
      grid, bands, [&](auto...) { return static_cast<float>(random() % 100000) / 7.0f; });
  for (std::size_t i = 0; i < raster->states.size(); i += 1 + random() % 40) {
    raster->states[i] = PixelValueState::Masked;
  }
  return RasterPtr<float>(raster);
}

GeoRefPtr Turned(const GeoRefPtr& grid, double degrees) {
  const GeoRefPtr turned = CloneOf(grid);
  turned->SetRotation(degrees);
  return turned;
}

TEST(ExactGrid, GivesAPixelTheSameBitsInEveryRequest) {
  const GeoRefPtr utm = MakeGrid(600000, 5000000, 30, 300, 200, "EPSG:32633");
  const GeoRefPtr globe = MakeGrid(-180, 90, 1, 360, 180, "EPSG:4326");
  const struct {
    const char* name;
    GeoRefPtr source, grid;
  } cases[] = {
      {"to degrees", utm, MakeGrid(16.26, 45.16, 0.0003, 400, 280, "EPSG:4326")},
      {"moved by half a pixel", utm, MakeGrid(600015, 5000015, 30, 310, 210, "EPSG:32633")},
      {"turned", Turned(utm, 12), MakeGrid(599000, 5003000, 30, 400, 300, "EPSG:32633")},
      {"around the pole", globe, MakeGrid(-4e6, 4e6, 26000, 300, 300, "EPSG:3995")},
      {"around the date line", globe, MakeGrid(-1.8e7, 9e6, 65000, 550, 280, kMollweide)},
      {"smaller", utm, MakeGrid(16.26, 45.16, 0.002, 60, 42, "EPSG:4326")},
  };
  std::mt19937 random(11);
  const auto below = [&](unsigned n) { return static_cast<unsigned>(random() % n); };
  struct Way {
    PyramidResamplingMethod resampling;
    WarpSampling sampling;
    WarpKernel kernel = WarpKernel::kTold;
  };
  std::vector<Way> ways;
  for (const auto resampling : {kNearest, kLinear, kCubic}) {
    ways.push_back({resampling, WarpSampling::kCentred});
    ways.push_back({resampling, WarpSampling::kCorner});
  }
  for (const auto kernel : {WarpKernel::kCubic, WarpKernel::kAverage, WarpKernel::kMedian}) {
    ways.push_back({kNearest, WarpSampling::kCentred, kernel});
  }
  for (const auto& c : cases) {
    const RasterPtr<float> source = MakeNoise(c.source, 3);
    for (const auto method : {kPolynomial, kRigorous}) {
      for (const Way& way : ways) {
        SCOPED_TRACE(testing::Message()
                     << c.name << ", method " << unsigned(method) << ", resampling "
                     << unsigned(way.resampling) << ", sampling " << unsigned(way.sampling)
                     << ", kernel " << unsigned(way.kernel));
        const auto open = [&] {
          return ProjectedRaster<float>(source, c.grid, method, way.resampling,
                                        {ProjectedGrid::kExact, way.sampling, 0.0, way.kernel});
        };
        auto view = open();
        const auto whole = Read(view, AllOf(view), {0, 1, 2});
        for (int i = 0; i < 6; ++i) {
          const SubRect rect(below(view.Samples()), below(view.Lines()), below(view.Samples()),
                             below(view.Lines()));
          std::vector<unsigned> bands(1 + below(3));
          for (unsigned& band : bands) band = below(3);
          const ThreadLimit threads(1 + below(4));
          auto fresh = open();
          const auto part = Read(i % 2 == 0 ? view : fresh, rect, bands);
          std::size_t at = 0;
          for (unsigned y = rect.top; y <= rect.bottom; ++y)
            for (unsigned x = rect.left; x <= rect.right; ++x)
              for (const unsigned band : bands) {
                const std::size_t in = (y * std::size_t{view.Samples()} + x) * 3 + band;
                ASSERT_EQ(part.pixels[at], whole.pixels[in]) << x << " " << y;
                ASSERT_EQ(part.state[at], whole.state[in]) << x << " " << y;
                ++at;
              }
        }
      }
    }
  }
}

TEST(ExactGrid, IsPlainArithmeticWithinOneSystem) {
  const unsigned side = 300;
  const auto value = [](unsigned x, unsigned y, unsigned) {
    return static_cast<int>(1000 * y + x);
  };
  for (const double pixel : {30.0, 0.1, 1.0 / 3}) {
    const RasterPtr<int> source(
        MakePlaced<int>(MakeGrid(600000, 5000000, pixel, side, side, "EPSG:32633"), 1, value));
    for (const double shift : {0.0, 0.5, 1.0, -7.5, 0.25}) {
      for (const auto method : {kPolynomial, kRigorous}) {
        SCOPED_TRACE(testing::Message() << pixel << " m, moved by " << shift);
        const GeoRefPtr grid = MakeGrid(600000 + shift * pixel, 5000000 - shift * pixel, pixel,
                                        side, side, "EPSG:32633");
        ProjectedRaster<int> view(source, grid, method, kNearest,
                                  {ProjectedGrid::kExact, WarpSampling::kCentred, -1.0});
        const auto block = Read(view, AllOf(view), {0});
        for (unsigned y = 0; y < side; ++y)
          for (unsigned x = 0; x < side; ++x) {
            // An edge belongs to the pixel that begins with it.
            const int column = static_cast<int>(std::floor(x + 0.5 + shift));
            const int line = static_cast<int>(std::floor(y + 0.5 + shift));
            const bool inside = column >= 0 && column < 300 && line >= 0 && line < 300;
            ASSERT_EQ(block.pixels[y * side + x], inside ? 1000 * line + column : -1)
                << x << " " << y;
          }
      }
    }
  }
  // The told grid and reads in parts: a grid with pixels as large as the source's, half a pixel on.
  const RasterPtr<int> source(
      MakePlaced<int>(MakeGrid(0, 0, 30, side, side, "EPSG:32633"), 1, value));
  Reprojection<int> told(MakeGrid(15, -15, 30, side, side, "EPSG:32633"), kPolynomial, kNearest);
  for (const SubRect& rect : {SubRect{0, 0, 298, 298}, SubRect{17, 31, 60, 33}}) {
    Block<int> block;
    ASSERT_TRUE(told.Reproject(*source, rect, MakeArray<unsigned>({0}), Interleave::BIP,
                               block.pixels, block.state));
    std::size_t at = 0;
    for (unsigned y = rect.top; y <= rect.bottom; ++y)
      for (unsigned x = rect.left; x <= rect.right; ++x) {
        ASSERT_EQ(block.pixels[at++], static_cast<int>(1000 * (y + 1) + x + 1));
      }
  }
}

/// Where the centre of each pixel of a grid lies in a source: a transform of every pixel.
std::vector<double> Positions(const GeoRef& grid, const GeoRef& source) {
  Array<double> points{ArrayDims(grid.Samples() * grid.Lines(), 2)};
  double* at = points.begin();
  for (unsigned y = 0; y < grid.Lines(); ++y)
    for (unsigned x = 0; x < grid.Samples(); ++x) {
      *at++ = x + 0.5;
      *at++ = y + 0.5;
    }
  grid.PixelToPixel(points, source);
  return {points.begin(), points.end()};
}

TEST(ExactGrid, LosesNoPixelAndKeepsItsBound) {
  const struct {
    const char* name;
    double pixel;  // of the global source, in degrees
    GeoRefPtr grid;
  } cases[] = {
      {"north pole", 1, MakeGrid(-9e6, 9e6, 30000, 600, 600, "EPSG:3995")},
      {"south pole", 1, MakeGrid(-9e6, 9e6, 30000, 600, 600, "EPSG:3031")},
      {"north pole, near", 0.25, MakeGrid(-1.1e6, 1e6, 3000, 700, 700, "EPSG:3995")},
      {"Mercator", 1, MakeGrid(-20037508, 20037508, 66000, 607, 607, "EPSG:3857")},
      {"Mollweide, the date line inside", 1, MakeGrid(-1.82e7, 9.1e6, 40000, 910, 455, kMollweide)},
      {"Lambert, with the pole", 1, MakeGrid(-8e6, 9e6, 25000, 640, 640, "EPSG:3034")},
      {"globe", 1,
       MakeGrid(-7e6, 7e6, 20000, 700, 700,
                "+proj=ortho +lat_0=80 +lon_0=170 +R=6371000 +type=crs")},
  };
  for (const auto& c : cases) {
    const auto samples = static_cast<unsigned>(360 / c.pixel);
    const auto source = MakePlaced<float>(
        MakeGrid(-180, 90, c.pixel, samples, samples / 2, "EPSG:4326"), 2,
        [](unsigned x, unsigned y, unsigned band) { return (band == 0 ? x : y) + 0.5f; });
    const std::vector<double> positions = Positions(*c.grid, *source->geoRef);
    for (const auto method : {kPolynomial, kRigorous}) {
      SCOPED_TRACE(testing::Message() << c.name << ", method " << unsigned(method));
      ProjectedRaster<float> view(RasterPtr<float>(source), c.grid, method, kNearest,
                                  {ProjectedGrid::kExact, WarpSampling::kCentred, -1.0});
      const double bound = method == kPolynomial ? 0.125 : 1e-6;
      unsigned wrong = 0, inside = 0;
      for (const unsigned step : {910U, 100U}) {  // in one block, and in small ones
        for (unsigned top = 0; top < view.Lines(); top += step)
          for (unsigned left = 0; left < view.Samples(); left += step) {
            const SubRect rect(left, top, std::min(left + step, view.Samples()) - 1,
                               std::min(top + step, view.Lines()) - 1);
            const auto block = Read(view, rect, {0, 1});
            for (unsigned i = 0; i < rect.Width() * rect.Height(); ++i) {
              const std::size_t at = 2 * ((top + i / rect.Width()) * std::size_t{view.Samples()} +
                                          left + i % rect.Width());
              const double x = positions[at], y = positions[at + 1];
              // A pixel shown holds the position, or is not off by more than the bound.
              const bool isShown = block.state[2 * i] == 0;
              const bool hits = std::abs(block.pixels[2 * i] - x) <= 0.5 + bound &&
                                std::abs(block.pixels[2 * i + 1] - y) <= 0.5 + bound;
              const bool isOut =
                  !(x >= bound && x < samples - bound && y >= bound && y < samples / 2.0 - bound);
              if (isShown ? !hits : !isOut) ++wrong;
              inside += isShown ? 1 : 0;
            }
          }
      }
      EXPECT_EQ(wrong, 0u);
      EXPECT_GT(inside, 100000u);
    }
  }
}

TEST(ToldGrid, ReadsAllOfTheSourceThatABlockFallsOn) {
  const auto source = MakePlaced<float>(
      MakeGrid(-180, 90, 0.5, 720, 360, "EPSG:4326"), 2,
      [](unsigned x, unsigned y, unsigned band) { return (band == 0 ? x : y) + 0.5f; });
  const GeoRefPtr grids[] = {MakeGrid(-4e6, 4.3e6, 20000, 400, 400, "EPSG:3995"),
                             MakeGrid(-4.1e6, 4e6, 20000, 400, 400, "EPSG:3031"),
                             MakeGrid(-1.8e7, 9e6, 60000, 600, 300, kMollweide)};
  for (const GeoRefPtr& grid : grids) {
    const std::vector<double> positions = Positions(*grid, *source->geoRef);
    const Reprojection<float> reprojection(grid, kRigorous, kNearest);
    for (const unsigned step : {60U, 97U, 256U}) {
      unsigned lost = 0, wrong = 0;
      for (unsigned top = 0; top < grid->Lines(); top += step)
        for (unsigned left = 0; left < grid->Samples(); left += step) {
          const SubRect rect(left, top, std::min(left + step, grid->Samples()) - 1,
                             std::min(top + step, grid->Lines()) - 1);
          Block<float> block;
          reprojection.Reproject(*source, rect, MakeArray<unsigned>({0, 1}), Interleave::BIP,
                                 block.pixels, block.state);
          for (unsigned i = 0; i < rect.Width() * rect.Height(); ++i) {
            const std::size_t at = 2 * ((top + i / rect.Width()) * std::size_t{grid->Samples()} +
                                        left + i % rect.Width());
            const double x = positions[at], y = positions[at + 1];
            // This form leaves out the source's last column and line.
            const bool isIn = x >= 0 && x < 719 && y >= 0 && y < 359;
            if (block.state[2 * i] != 0) {
              lost += isIn ? 1 : 0;
            } else {
              wrong += std::abs(block.pixels[2 * i] - x) > 0.5 + 1e-6 ||
                       std::abs(block.pixels[2 * i + 1] - y) > 0.5 + 1e-6;
            }
          }
        }
      EXPECT_EQ(lost, 0u) << "blocks of " << step;
      EXPECT_EQ(wrong, 0u) << "blocks of " << step;
    }
  }
}

TEST(ExactGrid, CountsACamerasPixelsFromTheirMiddle) {
  RpcCoefficients rpc;  // a sample is a thousandth of a degree, and so is a line
  rpc.lineOffset = 100;
  rpc.sampleOffset = 100;
  rpc.latitudeOffset = 45;
  rpc.longitudeOffset = 10;
  rpc.lineScale = rpc.sampleScale = 100;
  rpc.latitudeScale = rpc.longitudeScale = 0.1;
  rpc.heightScale = 1;
  rpc.sampleNumerator[1] = 1;
  rpc.lineNumerator[2] = -1;
  rpc.sampleDenominator[0] = rpc.lineDenominator[0] = 1;
  auto* const camera = new RpcGeoRef;
  const GeoRefPtr model(camera);
  camera->SetCoefficients(rpc);
  camera->SetCoordinateSystem(test::MakeCoordSys("EPSG:4326"));
  camera->SetDimensions(200, 200);
  const RasterPtr<int> source(MakePlaced<int>(
      model, 1, [](unsigned x, unsigned y, unsigned) { return static_cast<int>(1000 * y + x); }));
  // Its pixel (0, 0) has its middle at 9.9 degrees east and 45.1 north.
  const GeoRefPtr grid = MakeGrid(9.9 - 0.0004, 45.1 + 0.0004, 0.001, 200, 200, "EPSG:4326");
  for (const auto method : {kPolynomial, kRigorous}) {
    auto view = View(source, grid, method, kNearest);
    const auto block = Read(view, AllOf(view), {0});
    for (unsigned y = 0; y < 199; ++y)
      for (unsigned x = 0; x < 199; ++x) {
        ASSERT_EQ(block.pixels[y * 200 + x], static_cast<int>(1000 * y + x));
      }
  }
}

}  // namespace
}  // namespace lumo
