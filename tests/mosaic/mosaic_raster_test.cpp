#include "mosaic/mosaic_raster.h"

#include <cmath>
#include <filesystem>
#include <random>

#include "foundation/fault.h"
#include "mosaic/colour_table.h"
#include "mosaic/footprint_file.h"
#include "mosaic/mosaic_tables.h"
#include "raster/block_strides.h"
#include "support/placed_raster.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using Ring = Point2DArray<std::uint32_t>;

/// A definition of scenes in memory.
template <typename T>
MosaicRasterDefPtr<T> Define(const std::vector<Pointer<PlacedRaster<T>>>& scenes,
                             const MosaicSettings& settings = {}) {
  Array<RasterPtr<T>> list{ArrayDims(static_cast<unsigned>(scenes.size()))};
  std::copy(scenes.begin(), scenes.end(), list.begin());
  return MosaicRasterDefPtr<T>(new MosaicRasterDef<T>(list, settings));
}

RasterDef Grid(const GeoRefPtr& grid, unsigned bands, std::optional<double> noData = {}) {
  RasterDef def;
  def.samples = grid->Samples();
  def.lines = grid->Lines();
  def.bands = bands;
  for (unsigned band = 0; noData && band < bands; ++band) def.noData[band] = *noData;
  def.SetGeoRef(grid);
  return def;
}

/// Writes one polygon without holes.
void WritePolygon(const std::string& path, Ring ring) {
  ring.push_back(ring.front());
  Polygon2D<std::uint32_t> polygon({{ring, false}}, 1);
  MosaicFootPrintPolygonWriter<std::int16_t> file{URI(String(path))};
  ASSERT_TRUE(file.Write(polygon));
  ASSERT_TRUE(file.Close());
}

/// How far a point lies inside a ring, below 0 outside, not beyond a limit: by all edges.
double DistanceIn(const Ring& ring, double x, double y, double limit) {
  double least = limit;
  bool isInside = false;
  for (std::size_t i = 0; i < ring.size(); ++i) {
    const double ax = ring[i].x, ay = ring[i].y;
    const double bx = ring[(i + 1) % ring.size()].x, by = ring[(i + 1) % ring.size()].y;
    const double t = ((x - ax) * (bx - ax) + (y - ay) * (by - ay)) /
                     ((bx - ax) * (bx - ax) + (by - ay) * (by - ay));
    const double at = std::clamp(t, 0.0, 1.0);
    least = std::min(least, std::hypot(x - ax - at * (bx - ax), y - ay - at * (by - ay)));
    if ((ay > y) != (by > y) && x < ax + (y - ay) * (bx - ax) / (by - ay)) isInside = !isInside;
  }
  return isInside ? least : -least;
}

class MosaicPixels : public testing::Test {
 protected:
  std::string Path(const std::string& name) const { return (directory_.Path() / name).string(); }

  /// Three scenes on one grid whose seam polygons meet in the pixel (60, 50), each of values of its
  /// own, with a hole of pixels that aren't valid.
  MosaicRasterPtr<std::int16_t> MakeThree(double featherWidth) {
    const double places[][2] = {{0, 0}, {40, 0}, {20, 30}};
    const unsigned sizes[][2] = {{80, 70}, {70, 70}, {80, 60}};
    for (unsigned i = 0; i < 3; ++i) {
      scenes_.push_back(MakePlaced<std::int16_t>(
          MakeGrid(places[i][0], -places[i][1], 1, sizes[i][0], sizes[i][1]), 2,
          [i](unsigned x, unsigned y, unsigned band) {
            return static_cast<std::int16_t>(1000 * (i + 1) + 7 * x + 3 * y + 100 * band);
          }));
      for (unsigned y = 20; y < 30; ++y)
        for (unsigned x = 45; x < 52; ++x)
          for (const unsigned band : {0U, 1U}) {
            scenes_[i]->states[scenes_[i]->At(x, y, band)] = PixelValueState::NoData;
          }
    }
    seams_ = {{{0, 0}, {65, 0}, {60, 50}, {20, 70}, {0, 70}},
              {{65, 0}, {110, 0}, {110, 70}, {100, 70}, {60, 50}},
              {{60, 50}, {100, 70}, {100, 90}, {20, 90}, {20, 70}}};
    MosaicSettings settings;
    settings.featherWidth = featherWidth;
    settings.noData = -1;
    for (unsigned i = 0; i < 3; ++i) {
      WritePolygon(Path("seam" + std::to_string(i)), seams_[i]);
      settings.seamFiles[String(scenes_[i]->GetURI())] = String(Path("seam" + std::to_string(i)));
    }
    return MosaicRasterPtr<std::int16_t>(new MosaicRaster<std::int16_t>(
        Define<std::int16_t>(scenes_, settings), Grid(MakeGrid(0, 0, 1, 112, 92), 2, -1)));
  }

  /// A pixel as the rule has it; nothing where no scene has one.
  std::optional<double> Expect(unsigned x, unsigned y, unsigned band, double width) const {
    const auto valueOf = [&](unsigned i) -> std::optional<double> {
      const GeoRef& place = *scenes_[i]->geoRef;
      const double column = x - place.TieMapX(), line = y + place.TieMapY();
      if (column < 0 || line < 0 || column >= scenes_[i]->Samples() ||
          line >= scenes_[i]->Lines()) {
        return {};
      }
      const std::size_t at = scenes_[i]->At(std::size_t(column), std::size_t(line), band);
      if (scenes_[i]->states[at] != 0) return {};
      return scenes_[i]->pixels[at];
    };
    double least = 1e9, sum = 0, weights = 0;
    unsigned count = 0;
    std::vector<double> distances;
    std::optional<double> owner;
    for (unsigned i = 0; i < 3; ++i) {
      double distance = DistanceIn(seams_[i], x + 0.5, y + 0.5, 1e9);
      if (distance > 0 && !owner) owner = valueOf(i);
      least = std::min(least, std::abs(distance));
      for (const double earlier : distances) distance = std::min(distance, -earlier);
      distances.push_back(DistanceIn(seams_[i], x + 0.5, y + 0.5, 1e9));
      const double weight = std::clamp(0.5 + distance / width, 0.0, 1.0);
      const std::optional<double> value = valueOf(i);
      if (!(weight > 1e-6) || !value) continue;
      sum += weight * *value;
      weights += weight;
      ++count;
    }
    return width > 0 && least < width / 2 && count > 1 ? sum / weights : owner;
  }

  test::TemporaryDirectory directory_;
  std::vector<Pointer<PlacedRaster<std::int16_t>>> scenes_;
  std::vector<Ring> seams_;
};

TEST_F(MosaicPixels, AreThoseOfTheSeamPolygonsInBlocksOfAnyShape) {
  for (const double width : {0.0, 1.0, 14.0}) {
    scenes_.clear();
    const MosaicRasterPtr<std::int16_t> mosaic = MakeThree(width);
    ASSERT_TRUE(mosaic->IsValid());
    Array<std::int16_t> whole;
    Array<unsigned char> states;
    const Array<unsigned> bands = MakeArray<unsigned>({0, 1});
    ASSERT_TRUE(mosaic->GetSubRect({0, 0, 111, 91}, bands, Interleave::BIP, whole, states));
    unsigned blended = 0;
    for (unsigned y = 0; y < 92; ++y)
      for (unsigned x = 0; x < 112; ++x)
        for (unsigned band = 0; band < 2; ++band) {
          const std::size_t at = (std::size_t{y} * 112 + x) * 2 + band;
          const std::optional<double> expected = Expect(x, y, band, width);
          ASSERT_EQ(states[at] == PixelValueState::Valid, expected.has_value())
              << x << ' ' << y << ' ' << width;
          ASSERT_NEAR(whole[at], expected.value_or(-1), 0.5 + 1e-3 * width)
              << x << ' ' << y << ' ' << width;
          blended += expected && *expected != std::floor(*expected);
        }
    EXPECT_EQ(blended > 500, width > 1) << blended;

    std::mt19937 random(7);
    for (int i = 0; i < 60; ++i) {
      const SubRect rect(random() % 112, random() % 92, random() % 112, random() % 92);
      const auto order = static_cast<Interleave>(random() % 3);
      Array<std::int16_t> block;
      Array<unsigned char> state;
      ASSERT_TRUE(mosaic->GetSubRect(rect, MakeArray<unsigned>({1, 0}), order, block, state));
      const BlockStrides strides(order, rect.Width(), rect.Height(), 2);
      for (unsigned y = rect.top; y <= rect.bottom; ++y)
        for (unsigned x = rect.left; x <= rect.right; ++x)
          for (unsigned b = 0; b < 2; ++b) {
            const std::size_t at =
                (y - rect.top) * strides.line + (x - rect.left) * strides.pixel + b * strides.band;
            const std::size_t in = (std::size_t{y} * 112 + x) * 2 + (1 - b);
            ASSERT_EQ(block[at], whole[in]);
            ASSERT_EQ(state[at], states[in]);
          }
    }
  }
}

TEST_F(MosaicPixels, FillGapsBetweenSeamsFromFootprints) {
  const auto left =
      MakePlaced<std::int16_t>(MakeGrid(0, 0, 1, 20, 10), 1, [](auto...) { return 1; });
  const auto right =
      MakePlaced<std::int16_t>(MakeGrid(0, 0, 1, 20, 10), 1, [](auto...) { return 2; });
  WritePolygon(Path("seamL"), {{0, 0}, {8, 0}, {8, 10}, {0, 10}});
  WritePolygon(Path("seamR"), {{12, 0}, {20, 0}, {20, 10}, {12, 10}});
  WritePolygon(Path("footL"), {{0, 0}, {10, 0}, {10, 10}, {0, 10}});
  WritePolygon(Path("footR"), {{9, 0}, {20, 0}, {20, 8}, {9, 8}});
  MosaicSettings settings;
  for (const auto& [scene, name] : {std::pair(left, "L"), std::pair(right, "R")}) {
    const String key(scene->GetURI());
    settings.seamFiles[key] = String(Path(std::string("seam") + name));
    settings.footprints[key] = String(Path(std::string("foot") + name));
  }
  const RasterPtr<std::int16_t> mosaic(new MosaicRaster<std::int16_t>(
      Define<std::int16_t>({left, right}, settings), Grid(MakeGrid(0, 0, 1, 20, 10), 1)));
  Array<std::int16_t> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(
      mosaic->GetSubRect({0, 0, 19, 9}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state));
  for (unsigned x = 0; x < 20; ++x) {
    EXPECT_EQ(pixels[x], x < 10 ? 1 : 2) << x;
    EXPECT_EQ(state[180 + x] == 0, x < 10 || x >= 12) << x;  // the last line is in no footprint
  }
  // A file that isn't there any more fails the block, and says which one it is.
  std::filesystem::remove(Path("seamR"));
  settings.lutPath = String();
  const RasterPtr<std::int16_t> broken(new MosaicRaster<std::int16_t>(
      Define<std::int16_t>({left, right}, settings), Grid(MakeGrid(0, 0, 1, 20, 10), 1)));
  EXPECT_FALSE(
      broken->GetSubRect({0, 0, 19, 9}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state));
  EXPECT_NE(TakeFault().ToUTF8().find("seamR"), std::string::npos);
}

TEST(MosaicRaster, TakesAPixelFromTheFirstSceneThatHasIt) {
  const auto first = MakePlaced<int>(MakeGrid(0, 0, 1, 6, 4), 2, [](auto...) { return 1; });
  const auto second = MakePlaced<int>(MakeGrid(4, 0, 1, 6, 4), 2, [](auto...) { return 2; });
  for (const unsigned band : {0U, 1U}) {
    first->states[first->At(5, 1, band)] = PixelValueState::NoData;
  }
  first->states[first->At(4, 1, 0)] = PixelValueState::NoData;  // its other band is there
  const MosaicRasterPtr<int> mosaic(
      new MosaicRaster<int>(Define<int>({first, second}), Grid(MakeGrid(0, 0, 1, 12, 4), 2, -9)));
  ASSERT_TRUE(mosaic->IsValid());
  EXPECT_TRUE(BasicMosaicRasterDefPtr(mosaic->Definition())->IsA(BasicMosaicRasterDef::TypeCode));
  EXPECT_TRUE(MosaicRasterPtr<int>(RasterPtr<int>(mosaic)));

  Array<int> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(mosaic->GetSubRect({0, 1, 11, 1}, MakeArray<unsigned>({0, 1}), Interleave::BSQ,
                                 pixels, state));
  const std::vector<int> band0(pixels.begin(), pixels.begin() + 12);
  EXPECT_EQ(std::vector<int>(band0.begin(), band0.begin() + 4), std::vector<int>(4, 1));
  EXPECT_NE(state[4], PixelValueState::Valid);
  EXPECT_EQ(pixels[12 + 4], 1);
  EXPECT_EQ(std::vector<int>(band0.begin() + 5, band0.end()),
            (std::vector<int>{2, 2, 2, 2, 2, -9, -9}));
  EXPECT_EQ(state[11], PixelValueState::NoData);
  EXPECT_EQ(mosaic->NoDataValue(1), -9);

  // A scene that can't be read fails the blocks that need it, and no others.
  second->fails = true;
  EXPECT_FALSE(
      mosaic->GetSubRect({0, 0, 11, 3}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state));
  EXPECT_TRUE(
      mosaic->GetSubRect({0, 0, 3, 3}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state));
}

TEST(MosaicRaster, AsksOnlyTheScenesThatABlockTouches) {
  std::vector<Pointer<PlacedRaster<std::uint8_t>>> scenes;
  for (unsigned i = 0; i < 100; ++i) {
    scenes.push_back(
        MakePlaced<std::uint8_t>(MakeGrid((i % 10) * 8.0, (i / 10) * -8.0, 1, 10, 10), 1,
                                 [i](auto...) { return static_cast<std::uint8_t>(i); }));
  }
  const RasterPtr<std::uint8_t> mosaic(new MosaicRaster<std::uint8_t>(
      Define<std::uint8_t>(scenes), Grid(MakeGrid(0, 0, 1, 82, 82), 1)));
  Array<std::uint8_t> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(mosaic->GetSubRect({21, 21, 30, 23}, MakeArray<unsigned>({0}), Interleave::BSQ,
                                 pixels, state));
  unsigned asked = 0;
  for (const auto& scene : scenes) asked += scene->reads != 0;
  EXPECT_EQ(asked, 2U);  // the second one covers the rest, so that no third is looked at
  EXPECT_EQ(pixels[0], 22);
  EXPECT_EQ(pixels[9], 23);
}

TEST(ColourTable, GoesByBinsAndBetweenThem) {
  // Bytes have an entry for each value; those outside go on by the mean gain.
  const std::vector<double> entries{20, 22.4, 30, 29.6};
  const ColourTable<std::uint8_t> bytes(10, 13, 1, entries, std::nullopt);
  std::uint8_t values[] = {9, 10, 11, 12, 13, 15, 200};
  const unsigned char states[] = {0, 0, 0, 0, 0, 0, 1};
  bytes.Apply(values, states, 7, 1);
  EXPECT_THAT(values, testing::ElementsAre(17, 20, 22, 30, 30, 36, 200));

  // Wide values come between the entries: a ramp stays a ramp without steps.
  const std::vector<double> steps{0, 10, 40};
  const ColourTable<float> floats(0, 1, 0.5, steps, std::nullopt);
  float ramp[] = {0, 0.25F, 0.5F, 0.75F, 1, 2, -1};
  const unsigned char valid[7] = {};
  floats.Apply(ramp, valid, 7, 1);
  EXPECT_THAT(ramp, testing::ElementsAre(0, 5, 10, 25, 40, 80, -40));

  // No pixel becomes the no-data value, and values beyond the type are its bounds.
  const ColourTable<std::uint8_t> low(0, 2, 1, {-7, 0.2, 900}, std::uint8_t{0});
  std::uint8_t dark[] = {1, 2};
  low.Apply(dark, valid, 2, 1);
  EXPECT_THAT(dark, testing::ElementsAre(1, 255));
  EXPECT_TRUE(ColourTable<float>(0, 0, 1, {}, std::nullopt).IsIdentity());
}

TEST(MosaicRaster, TurnsColoursByItsTables) {
  const test::TemporaryDirectory directory;
  const auto scene = MakePlaced<std::uint8_t>(MakeGrid(0, 0, 1, 4, 1), 1, [](unsigned x, auto...) {
    return static_cast<std::uint8_t>(10 + x);
  });
  const auto reference = MakePlaced<std::uint8_t>(MakeGrid(90, 0, 1, 4, 1), 1,
                                                  [](auto...) { return std::uint8_t{9}; });
  MosaicSettings settings;
  settings.reference = 1;
  settings.lutPath = String((directory.Path() / "tables").string());
  const MosaicRasterDefPtr<std::uint8_t> definition =
      Define<std::uint8_t>({scene, reference}, settings);
  const RasterPtr<std::uint8_t> mosaic(
      new MosaicRaster<std::uint8_t>(definition, Grid(MakeGrid(0, 0, 1, 4, 1), 1)));
  const auto read = [&] {
    Array<std::uint8_t> pixels;
    Array<unsigned char> state;
    EXPECT_TRUE(
        mosaic->GetSubRect({0, 0, 3, 0}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state));
    return std::vector<int>(pixels.begin(), pixels.end());
  };
  EXPECT_EQ(read(), (std::vector<int>{10, 11, 12, 13}));
  EXPECT_EQ(mosaic->Max(0, IPC()), 13);
  {
    MosaicHistMatchingLUTBaseFile<MosaicLUTItemBase> items(settings.lutPath + ".mlh", 2, 1);
    MosaicHistMatchingLUTFile<double> entries(settings.lutPath + ".mlt", 2, 1);
    items.Ref(0, 0) = {10, 13, 4, 0};
    for (unsigned bin = 0; bin < 4; ++bin) entries.Ref(0, 0, bin) = 100 - 10.0 * bin;
    ASSERT_TRUE(items.Close() && entries.Close());
  }
  std::string reason;
  ASSERT_TRUE(definition->Keep(reason));
  EXPECT_EQ(read(), (std::vector<int>{100, 90, 80, 70}));
  EXPECT_EQ(mosaic->Max(0, IPC()), 100);  // what was computed before is gone
}

}  // namespace
}  // namespace lumo
