#include <cmath>
#include <map>

#include "raster/level_reduction.h"
#include "support/pyramid_scene.h"
#include "support/test_types.h"

namespace lumo::test {
namespace {

/// A raster or level in memory, pixel-interleaved.
template <typename T>
struct Plane {
  unsigned samples = 0, lines = 0, bands = 0;
  Array<T> pixels;
  Array<unsigned char> states;

  std::size_t At(unsigned x, unsigned y, unsigned band) const {
    return (std::size_t{y} * samples + x) * bands + band;
  }
};

template <typename T>
Plane<T> ReadAll(Raster<T>& raster) {
  Plane<T> plane{raster.Samples(), raster.Lines(), raster.Bands(), {}, {}};
  Array<unsigned> bands{ArrayDims(raster.Bands())};
  for (unsigned i = 0; i < bands.GetCount(); ++i) bands[i] = i;
  EXPECT_TRUE(raster.GetSubRect({0, 0, plane.samples - 1, plane.lines - 1}, bands, Interleave::BIP,
                                plane.pixels, plane.states))
      << TakeFault().ToUTF8();
  return plane;
}

/// The parts of a pixel as numbers with all digits.
template <typename T>
std::vector<long double> PartsOf(const T& value) {
  if constexpr (std::is_arithmetic_v<T>) {
    return {static_cast<long double>(value)};
  } else {
    return {static_cast<long double>(value.real), static_cast<long double>(value.imag)};
  }
}

/// The mean of the valid pixels of a block of the raster; nothing where there is none.
template <typename T>
std::vector<long double> MeanOfBlock(const Plane<T>& plane, unsigned level, unsigned x, unsigned y,
                                     unsigned band) {
  std::vector<long double> sums(PartsOf(T()).size());
  unsigned count = 0;
  for (unsigned v = y << level; v < (y + 1) << level; ++v) {
    for (unsigned u = x << level; u < (x + 1) << level; ++u) {
      const std::size_t at = plane.At(u, v, band);
      if (!IsValidState(plane.states[at])) continue;
      const auto parts = PartsOf(plane.pixels[at]);
      for (std::size_t i = 0; i < parts.size(); ++i) sums[i] += parts[i];
      ++count;
    }
  }
  if (count == 0) return {};
  for (long double& sum : sums) {
    sum /= count;
    if (std::is_integral_v<T>) sum = std::floor(sum + 0.5L);
  }
  return sums;
}

AsyncPtr Build(BasicRaster& raster, LevelReduction reduction, unsigned levelMax) {
  PyramidDef def;
  def.levelMin = 0;
  def.levelMax = levelMax;
  def.resamplingMethod = *MethodOf(reduction);
  const AsyncPtr build = raster.PyramidBuild(def, TileDimensions{16, 16}, {});
  if (build) build->WaitFinished();
  return build;
}

template <typename T>
class ReducedLevelsOfType : public testing::Test {};
TYPED_TEST_SUITE(ReducedLevelsOfType, typename test::AsTestTypes<TwelveTypes>::Types);

/// Of strips and squares, of bands together and each alone, with a third of the pixels masked and a
/// no-data value in one band.
TYPED_TEST(ReducedLevelsOfType, MeansAreThoseOfTheValidPixelsBelow) {
  using T = TypeParam;
  const struct {
    unsigned samples, lines, bands, tileHeight;
  } cases[] = {{261, 83, 3, 1}, {101, 70, 3, 2}, {130, 65, 9, 2}, {40, 1, 1, 1}};
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.samples << " by " << c.lines << " by " << c.bands);
    PyramidScene scene;
    scene.Fake().samples = c.samples;
    scene.Fake().lines = c.lines;
    scene.Fake().bands = c.bands;
    scene.Fake().tileHeight = c.tileHeight;
    scene.Fake().hasMask = true;
    const RasterPtr<T> raster = scene.Open<T>();
    ASSERT_TRUE(raster);
    const Plane<T> source = ReadAll(*raster);
    std::vector<bool> hasNoData;
    std::vector<std::vector<long double>> noData;
    for (unsigned band = 0; band < c.bands; ++band) {
      hasNoData.push_back(raster->HasNoDataValue(band));
      noData.push_back(PartsOf(raster->NoDataValue(band)));
    }
    constexpr unsigned kLast = 4;
    const AsyncPtr build = Build(*raster, LevelReduction::kAverage, kLast);
    ASSERT_TRUE(build && !build->HasError()) << (raster->PyramidAsync(), TakeFault().ToUTF8());
    EXPECT_EQ(ReductionOf(raster->GetPyramidDef().resamplingMethod), LevelReduction::kAverage);
    EXPECT_EQ(raster->StatsExist(0, StatsMask::Basic), std::is_arithmetic_v<T>);
    for (unsigned number = 0; number <= kLast; ++number) {
      const RasterPtr<T> level = raster->PyramidLevel(number);
      ASSERT_TRUE(level);
      if (level->Samples() == 0 || level->Lines() == 0) continue;
      const Plane<T> made = ReadAll(*level);
      for (unsigned y = 0; y < made.lines; ++y) {
        for (unsigned x = 0; x < made.samples; ++x) {
          for (unsigned band = 0; band < made.bands; ++band) {
            const std::size_t at = made.At(x, y, band);
            const auto want = MeanOfBlock(source, number, x, y, band);
            // The store of the fake knows nothing of its no-data values.
            ASSERT_TRUE(hasNoData[band] || IsValidState(made.states[at]) == !want.empty())
                << number << ' ' << x << ' ' << y << ' ' << band;
            if (want.empty() || (hasNoData[band] && want == noData[band])) {
              continue;
            }
            const auto found = PartsOf(made.pixels[at]);
            for (std::size_t i = 0; i < want.size(); ++i) {
              const long double slack =
                  std::is_integral_v<T> ? 0 : std::max(1.0L, std::abs(want[i])) * 1e-6L;
              ASSERT_NEAR(found[i], want[i], slack)
                  << number << ' ' << x << ' ' << y << ' ' << band;
            }
          }
        }
      }
    }
  }
}

/// The most frequent of four, of several such the first, level by level.
TEST(ReducedLevels, ModesAreTheMostFrequentPixels) {
  PyramidScene scene;
  scene.Fake().samples = 77;
  scene.Fake().lines = 50;
  scene.Fake().bands = 1;
  scene.Fake().hasMask = true;
  const RasterPtr<std::uint8_t> raster = scene.Open<std::uint8_t>();
  Plane<std::uint8_t> below = ReadAll(*raster);
  ASSERT_TRUE(Build(*raster, LevelReduction::kMode, 3));
  for (unsigned number = 1; number <= 3; ++number) {
    const RasterPtr<std::uint8_t> level = raster->PyramidLevel(number);
    ASSERT_TRUE(level);
    const Plane<std::uint8_t> made = ReadAll(*level);
    for (unsigned y = 0; y < made.lines; ++y) {
      for (unsigned x = 0; x < made.samples; ++x) {
        std::map<unsigned, unsigned> times;
        unsigned most = 0;
        for (const unsigned i : {0, 1, 2, 3}) {
          const std::size_t at = below.At(2 * x + i % 2, 2 * y + i / 2, 0);
          if (IsValidState(below.states[at])) most = std::max(most, ++times[below.pixels[at]]);
        }
        const std::size_t at = made.At(x, y, 0);
        ASSERT_EQ(IsValidState(made.states[at]), most != 0) << number << ' ' << x << ' ' << y;
        if (most == 0) continue;
        ASSERT_EQ(times[made.pixels[at]], most) << number << ' ' << x << ' ' << y;
      }
    }
    below = made;
  }
}

}  // namespace
}  // namespace lumo::test
