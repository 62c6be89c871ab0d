#include "warp/warp_kernel.h"

#include <cmath>
#include <map>
#include <numbers>
#include <random>

#include "raster/block_strides.h"
#include "support/placed_raster.h"
#include "warp/projected_raster.h"

// Kernels that widen, beside sums over all pixels of a raster.

namespace lumo {
namespace {

double Weight(WarpKernel kernel, double x) {
  x = std::abs(x);
  const double pi = std::numbers::pi;
  const auto sinc = [&](double t) { return t == 0 ? 1.0 : std::sin(pi * t) / (pi * t); };
  if (kernel == WarpKernel::kLinear) return std::max(0.0, 1 - x);
  if (kernel == WarpKernel::kLanczos) return x < 3 ? sinc(x) * sinc(x / 3) : 0.0;
  if (x >= 2) return 0;
  return x < 1 ? 1.5 * x * x * x - 2.5 * x * x + 1 : -0.5 * x * x * x + 2.5 * x * x - 4 * x + 2;
}

/// Part of the pixel `at` between two places.
double Covered(unsigned at, double from, double end) {
  return std::max(0.0, std::min(at + 1.0, end) - std::max(double(at), from));
}

struct Expected {
  std::vector<double> values;  // one, or all that are right
  bool isValid = false;
};

/// One pixel by its definition.
Expected ByDefinition(const PlacedRaster<std::int16_t>& raster, unsigned band, WarpKernel kernel,
                      double x, double y, double width, double height) {
  const auto isValid = [&](unsigned column, unsigned line) {
    return raster.states[raster.At(column, line, band)] == 0;
  };
  const auto valueOf = [&](unsigned column, unsigned line) {
    return double(raster.pixels[raster.At(column, line, band)]);
  };
  const bool isBox = kernel != WarpKernel::kLinear && kernel != WarpKernel::kCubic &&
                     kernel != WarpKernel::kLanczos;
  const auto weigh = [&](WarpKernel by, unsigned column, unsigned line) {
    if (!isBox) {
      return Weight(by, (column + 0.5 - x) / std::max(width, 1.0)) *
             Weight(by, (line + 0.5 - y) / std::max(height, 1.0));
    }
    return Covered(column, x - width / 2, x + width / 2) *
           Covered(line, y - height / 2, y + height / 2);
  };
  bool isWhole = true;
  for (unsigned line = 0; line < raster.Lines(); ++line)
    for (unsigned column = 0; column < raster.Samples(); ++column)
      if (weigh(kernel, column, line) != 0) isWhole = isWhole && isValid(column, line);
  const WarpKernel by = isWhole || isBox ? kernel : WarpKernel::kLinear;
  double sum = 0, weights = 0;
  std::map<double, double> areas;
  std::vector<double> inside;
  for (unsigned line = 0; line < raster.Lines(); ++line) {
    for (unsigned column = 0; column < raster.Samples(); ++column) {
      if (!isValid(column, line)) continue;
      const double weight = weigh(by, column, line);
      const double value = valueOf(column, line);
      sum += weight * value;
      weights += weight;
      if (weight > 1e-6) areas[value] += weight;
      if (std::abs(column + 0.5 - x) < width / 2 && std::abs(line + 0.5 - y) < height / 2) {
        inside.push_back(value);
      }
    }
  }
  Expected expected;
  std::sort(inside.begin(), inside.end());
  switch (kernel) {
    case WarpKernel::kMin:
    case WarpKernel::kMax:
    case WarpKernel::kMedian:
      if (inside.empty()) return expected;
      expected.values = {kernel == WarpKernel::kMin   ? inside.front()
                         : kernel == WarpKernel::kMax ? inside.back()
                                                      : inside[(inside.size() - 1) / 2]};
      break;
    case WarpKernel::kMode: {
      double most = 0;
      for (const auto& [value, area] : areas) most = std::max(most, area);
      for (const auto& [value, area] : areas) {
        if (area > most - 1e-7) expected.values.push_back(value);
      }
      if (expected.values.empty()) return expected;
      break;
    }
    default:
      if (std::abs(weights) < 1e-5) return expected;
      expected.values = {sum / weights};
  }
  expected.isValid = true;
  return expected;
}

TEST(WarpKernel, MakesPixelsByItsDefinition) {
  constexpr unsigned kSamples = 41, kLines = 37, kBands = 2;
  std::mt19937 random(3);
  const GeoRefPtr place = MakeGrid(600000, 5000000, 10, kSamples, kLines, "EPSG:32633");
  for (const bool isHoled : {false, true}) {
    const auto made = MakePlaced<std::int16_t>(place, kBands, [&](auto...) {
      return static_cast<std::int16_t>(random() % 50 * 100 - 1000);
    });
    if (isHoled) {
      for (auto& state : made->states) {
        if (random() % 6 == 0) state = PixelValueState::Masked;
      }
    }
    const RasterPtr<std::int16_t> source(made);
    for (const double pixel : {4.0, 10.0, 17.3, 55.0}) {
      for (const double degrees : {0.0, 30.0}) {
        const GeoRefPtr grid = MakeGrid(600003, 4999996, pixel, unsigned(400 / pixel),
                                        unsigned(350 / pixel), "EPSG:32633");
        grid->SetRotation(degrees);
        const double size = pixel / 10;  // turned or not: a square
        using enum WarpKernel;
        for (const WarpKernel kernel :
             {kLinear, kCubic, kLanczos, kAverage, kMode, kMin, kMax, kMedian}) {
          // A square that holds no centre has the pixel at the position instead.
          const bool isOrder = kernel == kMin || kernel == kMax || kernel == kMedian;
          if (isOrder && size < 1.5) continue;
          SCOPED_TRACE(testing::Message() << "kernel " << unsigned(kernel) << ", pixel " << pixel
                                          << ", turned by " << degrees << ", holes " << isHoled);
          ProjectedRaster<std::int16_t> view(source, grid, ReprojectionMethod::kPolynomial,
                                             PyramidResamplingMethod::kNearest,
                                             {ProjectedGrid::kExact, {}, -9999.0, kernel});
          const Interleave interleave = degrees > 0 ? Interleave::BIP : Interleave::BSQ;
          const BlockStrides strides(interleave, view.Samples(), view.Lines(), kBands);
          Array<std::int16_t> pixels;
          Array<unsigned char> state;
          ASSERT_TRUE(view.GetSubRect({0, 0, view.Samples() - 1, view.Lines() - 1},
                                      MakeArray<unsigned>({0, 1}), interleave, pixels, state));
          unsigned compared = 0;
          for (unsigned line = 0; line < view.Lines(); ++line) {
            for (unsigned sample = 0; sample < view.Samples(); ++sample) {
              Array<double> at{ArrayDims(1, 2)};
              at[0] = sample + 0.5;
              at[1] = line + 0.5;
              grid->PixelToMap(at);
              const double x = (at[0] - 600000) / 10, y = (5000000 - at[1]) / 10;
              const bool isInside = x >= 0 && x < kSamples && y >= 0 && y < kLines;
              for (unsigned band = 0; band < kBands; ++band) {
                const std::size_t in =
                    sample * strides.pixel + line * strides.line + band * strides.band;
                Expected expected;
                if (isInside) {
                  expected = ByDefinition(*made, band, kernel, x, y, size, size);
                }
                ASSERT_EQ(state[in] == 0, expected.isValid) << sample << " " << line;
                if (!expected.isValid) {
                  ASSERT_EQ(pixels[in], -9999);
                  continue;
                }
                ++compared;
                double nearest = HUGE_VAL;
                for (const double value : expected.values) {
                  nearest = std::min(nearest, std::abs(pixels[in] - value));
                }
                ASSERT_LE(nearest, 0.5 + 1e-6) << sample << " " << line;
              }
            }
          }
          ASSERT_GT(compared, 20u);
        }
      }
    }
  }
}

/// Half a pixel on, a linear kernel gives the mean of four pixels.
template <typename T>
void ExpectMeansOfFour(unsigned bands) {
  SCOPED_TRACE(testing::Message() << "type " << kDataTypeOf<T> << ", bands " << bands);
  constexpr unsigned kSide = 9;
  std::mt19937_64 random(bands);
  const auto made =
      MakePlaced<T>(MakeGrid(0, 0, 10, kSide, kSide, "EPSG:32633"), bands, [&](auto...) -> T {
        if constexpr (std::is_floating_point_v<T>) return static_cast<T>(random() % 4096) / 8 - 99;
        const T ends[] = {std::numeric_limits<T>::min(), std::numeric_limits<T>::max()};
        return random() % 4 == 0 ? ends[random() % 2] : static_cast<T>(random());
      });
  ProjectedRaster<T> view(RasterPtr<T>(made),
                          MakeGrid(5, -5, 10, kSide - 1, kSide - 1, "EPSG:32633"),
                          ReprojectionMethod::kPolynomial, PyramidResamplingMethod::kNearest,
                          {ProjectedGrid::kExact, {}, {}, WarpKernel::kLinear});
  Array<unsigned> all{ArrayDims(bands)};
  for (unsigned band = 0; band < bands; ++band) all[band] = band;
  Array<T> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(view.GetSubRect({0, 0, kSide - 2, kSide - 2}, all, Interleave::BIP, pixels, state));
  std::size_t at = 0;
  for (unsigned y = 0; y + 1 < kSide; ++y) {
    for (unsigned x = 0; x + 1 < kSide; ++x) {
      for (unsigned band = 0; band < bands; ++band) {
        double sum = 0;
        for (const unsigned i : {0U, 1U, 2U, 3U}) {
          sum += static_cast<double>(made->pixels[made->At(x + i % 2, y + i / 2, band)]);
        }
        const double mean = std::is_integral_v<T> ? std::floor(sum / 4 + 0.5) : sum / 4;
        ASSERT_EQ(static_cast<double>(pixels[at++]), mean) << x << " " << y << " " << band;
      }
    }
  }
}

TEST(WarpKernel, MeansOfFourAreRightInTheWholeRangeOfEveryType) {
  for (const unsigned bands : {1U, 3U, 7U, 9U}) {
    [bands]<typename... Ts>(TypeList<Ts...>) { (ExpectMeansOfFour<Ts>(bands), ...); }(EightTypes{});
  }
}

TEST(WarpKernel, ReadsRastersOfOneColumnInEveryOrder) {
  // Bands lie next to one another there whatever the order is called.
  for (const unsigned lines : {1U, 9U}) {
    const RasterPtr<float> source(MakePlaced<float>(
        MakeGrid(0, 0, 10, 1, lines, "EPSG:32633"), 7,
        [](unsigned, unsigned, unsigned band) { return static_cast<float>(band); }));
    for (const auto interleave : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
      for (const auto kernel : {WarpKernel::kLinear, WarpKernel::kLanczos, WarpKernel::kAverage}) {
        ProjectedRaster<float> view(
            source, MakeGrid(0, 0, 30, 1, 1, "EPSG:32633"), ReprojectionMethod::kPolynomial,
            PyramidResamplingMethod::kNearest, {ProjectedGrid::kExact, {}, -1.0, kernel});
        Array<float> pixels;
        Array<unsigned char> state;
        ASSERT_TRUE(view.GetSubRect({0, 0, 0, 0}, MakeArray<unsigned>({6, 5, 4, 3, 2, 1, 0}),
                                    interleave, pixels, state));
        for (unsigned i = 0; i < 7; ++i) {
          // The middle of the larger pixel lies beside the column.
          ASSERT_EQ(pixels[i], -1) << unsigned(kernel);
        }
        ProjectedRaster<float> inside(
            source, MakeGrid(-10, 10, 30, 1, 1, "EPSG:32633"), ReprojectionMethod::kPolynomial,
            PyramidResamplingMethod::kNearest, {ProjectedGrid::kExact, {}, -1.0, kernel});
        ASSERT_TRUE(inside.GetSubRect({0, 0, 0, 0}, MakeArray<unsigned>({6, 5, 4, 3, 2, 1, 0}),
                                      interleave, pixels, state));
        for (unsigned i = 0; i < 7; ++i) ASSERT_NEAR(pixels[i], 6.0 - i, 1e-5) << unsigned(kernel);
      }
    }
  }
}

TEST(WarpKernel, KeepsAPlaneThroughASystemThatIsCurved) {
  // A weighed mean of a plane is its value at the middle, and one of squared distances says how
  // wide the footprint is: a twelfth of the squared width for a box.
  const GeoRefPtr utm = MakeGrid(600000, 5000000, 10, 900, 700, "EPSG:32633");
  const GeoRefPtr grid = MakeGrid(16.29, 45.13, 0.001, 80, 40, "EPSG:4326");
  const auto read = [&](WarpKernel kernel, unsigned x, unsigned y, auto value) {
    const RasterPtr<double> source(MakePlaced<double>(utm, 1, value));
    ProjectedRaster<double> view(source, grid, ReprojectionMethod::kPolynomial,
                                 PyramidResamplingMethod::kNearest,
                                 {ProjectedGrid::kExact, {}, -1e9, kernel});
    Array<double> pixels;
    Array<unsigned char> state;
    EXPECT_TRUE(
        view.GetSubRect({x, y, x, y}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state));
    return pixels[0];
  };
  for (const auto& [sample, line] : {std::pair{40U, 20U}, {20U, 10U}, {60U, 25U}}) {
    Array<double> place{ArrayDims(1, 2)};
    place[0] = sample + 0.5;
    place[1] = line + 0.5;
    grid->PixelToPixel(place, *utm);
    const double x = place[0] - 0.5, y = place[1] - 0.5;
    for (const auto kernel : {WarpKernel::kLinear, WarpKernel::kCubic, WarpKernel::kAverage}) {
      const double plane = read(kernel, sample, line, [](unsigned column, unsigned row, unsigned) {
        return 3.0 * column - 2.0 * row;
      });
      // A position by a polynomial is within an eighth of a pixel.
      EXPECT_NEAR(plane, 3 * x - 2 * y, 5.0 / 8) << unsigned(kernel);
    }
    const double square =
        read(WarpKernel::kAverage, sample, line,
             [&](unsigned column, unsigned, unsigned) { return (column - x) * (column - x); });
    const double width = 0.001 * 111320 * std::cos(45.1 * std::numbers::pi / 180) / 10;
    EXPECT_NEAR(square, width * width / 12, 0.6);
  }
}

}  // namespace
}  // namespace lumo
