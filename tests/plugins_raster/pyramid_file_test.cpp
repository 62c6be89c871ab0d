#include <algorithm>
#include <fstream>
#include <functional>
#include <random>

#include "data/packed_levels.h"
#include "pyramid/packed_tiles.h"
#include "support/pyramid_scene.h"
#include "views/sources/file_state.h"

namespace lumo::test {
namespace {

namespace fs = std::filesystem;

std::string ReadFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void WriteFile(const std::string& path, const std::string& bytes) {
  std::ofstream(path, std::ios::binary) << bytes;
}

/// All that is read of a pyramid, or nothing for a file that is refused somewhere.
struct Shown {
  bool isWhole = false;
  std::vector<std::int16_t> pixels;
  std::vector<unsigned char> states;
  std::vector<bool> haveNoData;
  std::vector<double> means;  // of the bands that have any
  std::vector<unsigned long long> counts;

  friend bool operator==(const Shown&, const Shown&) = default;
};

Shown Show(const std::string& path) {
  Shown shown;
  TakeFault();
  const auto source = OpenSource({"Pyramid", path});
  const auto reader = ReaderOf<std::int16_t>(source);
  if (!reader) return {};
  const auto bands = static_cast<unsigned>(reader->Bands());
  Array<unsigned> all{ArrayDims(bands)};
  for (unsigned i = 0; i < bands; ++i) all[i] = i;
  for (int level = reader->PyramidLevelMin(); level <= reader->PyramidLevelMax(); ++level) {
    const auto number = static_cast<unsigned>(level);
    const unsigned width = reader->Samples(number), height = reader->Lines(number);
    const std::size_t count = std::size_t{width} * height * bands;
    std::vector<std::int16_t> pixels(count);
    std::vector<unsigned char> states(count);
    if (!reader->ReadPixels(0, 0, width, height, all, number, pixels.data(), states.data())) {
      return {};
    }
    shown.pixels.insert(shown.pixels.end(), pixels.begin(), pixels.end());
    shown.states.insert(shown.states.end(), states.begin(), states.end());
  }
  for (unsigned band = 0; band < bands; ++band) {
    shown.haveNoData.push_back(reader->HasNoDataValue(band));
    if (reader->StatsExist(band)) shown.means.push_back(reader->ReadStats(band).mean);
    for (const auto& histogram : reader->Histogram(band)) {
      shown.counts.insert(shown.counts.end(), histogram.counts.begin(), histogram.counts.end());
    }
  }
  shown.isWhole = true;
  return shown;
}

/// The bytes of a small pyramid, with and without packed tiles.
std::string MakeFile(PyramidScene& scene, unsigned bands, const char* compression) {
  scene.Fake().samples = 40;
  scene.Fake().lines = 24;
  scene.Fake().bands = bands;
  scene.Fake().hasMask = true;
  fs::remove(scene.Path());
  const DataConnectionPtr source(OpenSource({"EXTERNAL", "x"}));
  RasterDef def = RasterDataConnectionPtr(source)->RasterDef();
  def.format = "Pyramid";
  def.noData[0] = 5;
  const DataConnectionPtr pyramid(CreateSource({"Pyramid", scene.Path(), compression}, def));
  const RasterPtr<std::int16_t> raster(MakeReaderRaster(source, pyramid));
  EXPECT_TRUE(PyramidScene::Build(*raster, 1, 2, 8));
  return ReadFile(scene.Path());
}

TEST(PyramidFile, DamageIsNeverShownAsPixels) {
  for (const unsigned bands : {2U, 9U}) {
    for (const char* const compression : {"COMPRESSION=NONE", "COMPRESSION=LZ4"}) {
      SCOPED_TRACE(testing::Message() << bands << ' ' << compression);
      PyramidScene scene;
      const std::string whole = MakeFile(scene, bands, compression);
      const Shown before = Show(scene.Path());
      ASSERT_TRUE(before.isWhole);
      ASSERT_FALSE(before.counts.empty() || before.means.empty());
      // Many places of the first header and of the first tiles, and some of the rest.
      constexpr std::size_t kTiles = 8192, kTilesEnd = kTiles + 400;
      const auto isInTiles = [](std::size_t at) { return at >= kTiles && at < kTilesEnd; };
      const auto stepFrom = [&](std::size_t at) -> std::size_t {
        return at < 1000 ? 5 : isInTiles(at) ? 11 : 128;
      };
      for (std::size_t at = 0; at < whole.size(); at += stepFrom(at)) {
        std::string damaged = whole;
        damaged[at] = static_cast<char>(damaged[at] ^ (1 << at % 8));
        WriteFile(scene.Path(), damaged);
        const Shown after = Show(scene.Path());
        if (!after.isWhole) {
          ASSERT_NE(TakeFault().GetLength(), 0u) << at;
          continue;
        }
        ASSERT_FALSE(isInTiles(at)) << at;
        // A byte that isn't in use, or the header of before there were statistics.
        ASSERT_TRUE(after.pixels == before.pixels && after.states == before.states) << at;
        ASSERT_EQ(after.haveNoData, before.haveNoData) << at;
        ASSERT_TRUE(after.means.empty() || after.means == before.means) << at;
        ASSERT_TRUE(after.counts.empty() || after.counts == before.counts) << at;
      }
      for (std::size_t size = 0; size < whole.size(); size += 397) {
        WriteFile(scene.Path(), whole.substr(0, size));
        const Shown after = Show(scene.Path());
        ASSERT_TRUE(!after.isWhole || after.pixels == before.pixels) << size;
        ASSERT_TRUE(!after.isWhole || size > whole.size() / 2) << size;
      }
    }
  }
}

TEST(PyramidFile, IsSmallerWhenItIsPacked) {
  PyramidScene scene;
  scene.Fake().dataType = kDataTypeOf<std::int16_t>;
  const std::size_t plain = MakeFile(scene, 9, "COMPRESSION=NONE").size();
  const Shown before = Show(scene.Path());
  const std::size_t packed = MakeFile(scene, 9, "COMPRESSION=LZ4").size();
  EXPECT_LT(packed, plain);
  EXPECT_TRUE(Show(scene.Path()) == before);
}

TEST(PyramidFile, TellsWhatIsWrongWithIt) {
  PyramidScene scene;
  const std::string whole = MakeFile(scene, 2, "COMPRESSION=NONE");
  const std::string path = scene.Path();
  const auto openWith = [&](const std::string& bytes) {
    WriteFile(path, bytes);
    TakeFault();
    OpenSource({"Pyramid", path});
    return TakeFault().ToUTF8();
  };
  const auto changed = [&](std::size_t at, char value) {
    std::string bytes = whole;
    for (const std::size_t place : {at, at + 4096}) bytes[place] = value;
    return bytes;
  };
  EXPECT_EQ(openWith(std::string(whole.size(), '\0')), path + ": isn't a whole pyramid");
  EXPECT_EQ(openWith(""), path + ": isn't a whole pyramid");
  EXPECT_EQ(openWith(changed(12, '2')), path + ": the pyramid is of another version");
  EXPECT_EQ(openWith(changed(40, '\x7F')), path + ": the header is damaged");
  EXPECT_EQ(openWith(whole.substr(0, whole.size() / 2)), path + ": the file is cut off");
  EXPECT_EQ(openWith(whole), "");
  OpenSource({"Pyramid", path, "one more"});
  EXPECT_EQ(TakeFault().ToUTF8(), "Pyramid: \"one more\" is one piece too many");
  OpenSource({"Pyramid", path + ".none"});
  EXPECT_EQ(TakeFault().ToUTF8(), path + ".none: No such file or directory");
}

TEST(PyramidFile, KeepsNoDataAndGeoReference) {
  PyramidScene scene;
  MakeFile(scene, 2, "COMPRESSION=LZ4");
  const auto source = OpenSource({scene.Path()});  // known without its key
  const auto reader = ReaderOf<std::int16_t>(source);
  ASSERT_TRUE(reader) << TakeFault().ToUTF8();
  EXPECT_EQ(source->RasterDef().format, String("Pyramid"));
  EXPECT_EQ(reader->Samples(0), 40u);
  EXPECT_EQ(reader->Samples(2), 10u);
  EXPECT_EQ(reader->Samples(3), 0u);
  EXPECT_FALSE(reader->CanWritePixels(1));

  RasterDef def;
  def.noData[1] = RampValue<std::int16_t>(8, 4, 1);
  reader->InheritNoDataValues(def);
  EXPECT_TRUE(reader->HasNoDataValue(1) && !reader->HasNoDataValue(0));
  std::int16_t pixels[2];
  unsigned char states[2] = {};
  Array<unsigned> bands{ArrayDims(2)};
  bands[0] = 0;
  bands[1] = 1;
  ASSERT_TRUE(reader->ReadPixels(2, 1, 1, 1, bands, 2, pixels, states));
  EXPECT_EQ(states[0] & 1, 0);
  EXPECT_EQ(states[1] & 1, 1);
}

/// A file from before files kept the state of their raster's, or of a raster that is no file.
TEST(PyramidFile, WithoutTheStateOfItsRasterItMustNotBeOlder) {
  PyramidScene scene;
  MakeFile(scene, 2, "COMPRESSION=LZ4");  // of a raster that is no file
  const std::string raster = scene.Path() + ".raster";
  fs::copy_file(scene.Path(), raster);  // any file of the size will do
  const auto now = fs::last_write_time(raster);
  for (const int seconds : {-1, 0, 1}) {
    fs::last_write_time(scene.Path(), now + std::chrono::seconds(seconds));
    const auto source = OpenSource({"Pyramid", raster}),
               pyramid = OpenSource({"Pyramid", scene.Path()});
    ASSERT_TRUE(source && pyramid);
    EXPECT_EQ(FindMismatch(*source, *pyramid), seconds < 0 ? "is older than the raster" : "");
  }
}

/// Describes a raster whose level 1 has 20 by 12 pixels.
RasterDef SmallDef() {
  RasterDef def;
  def.samples = 40;
  def.lines = 24;
  def.bands = 2;
  def.dataType = kDataTypeOf<std::int16_t>;
  def.format = "Pyramid";
  return def;
}

TEST(PyramidFile, TakesWholeTilesOnly) {
  PyramidScene scene;
  const RasterPtr<std::int16_t> raster = scene.Open<std::int16_t>();
  const auto source = CreateSource({"Pyramid", scene.Path()}, SmallDef());
  const auto reader = ReaderOf<std::int16_t>(source);
  EXPECT_FALSE(reader->CanWritePixels(1));
  ASSERT_TRUE(reader->PyramidBuild(1, 1, 2, TileDimensions{8, 8}));  // 20 by 12
  std::vector<std::int16_t> pixels(20 * 12 * 2, 7);
  std::vector<unsigned char> states(pixels.size());
  const auto write = [&](const SubRect& rect, const std::vector<unsigned>& bands) {
    return reader->WritePixels(rect.left, rect.top, rect.Width(), rect.Height(), MakeArray(bands),
                               1, pixels.data(), states.data());
  };
  for (const SubRect& rect : {SubRect(0, 0, 19, 11), SubRect(1, 0, 7, 7), SubRect(0, 0, 6, 7),
                              SubRect(0, 0, 19, 6), SubRect(0, 8, 20, 11)}) {
    EXPECT_FALSE(write(rect, {0, 1})) << rect.right;
  }
  EXPECT_FALSE(write({0, 0, 19, 7}, {0}));
  EXPECT_FALSE(write({0, 0, 19, 7}, {1, 0}));
  ASSERT_TRUE(write({8, 8, 19, 11}, {0, 1}));
  ASSERT_TRUE(write({0, 0, 19, 7}, {0, 1}));
  EXPECT_FALSE(fs::exists(scene.Path()));
  ASSERT_TRUE(write({0, 8, 7, 11}, {0, 1}));
  EXPECT_TRUE(reader->PyramidRefresh()) << TakeFault().ToUTF8();
  EXPECT_TRUE(fs::exists(scene.Path()) && reader->PyramidExists());
  EXPECT_FALSE(reader->CanWritePixels(1));
  const Shown shown = Show(scene.Path());
  EXPECT_EQ(shown.pixels, pixels);
}

/// Of bands together and each alone, along Z and by rows; tiles are written in any order.
TEST(PyramidFile, HasTheSameBytesWhicheverTileIsFirst) {
  const struct {
    unsigned samples, lines, bands;
    std::int32_t method;
  } cases[] = {{40, 70, 2, 2}, {600, 900, 9, 2}, {600, 300, 9, 6}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.method + 10 * c.bands);
    std::string first;
    for (const unsigned seed : {1, 2, 3}) {
      PyramidScene scene;
      RasterDef def;
      def.samples = c.samples;
      def.lines = c.lines;
      def.bands = c.bands;
      def.dataType = kDataTypeOf<std::uint16_t>;
      def.format = "Pyramid";
      const auto source = CreateSource({"Pyramid", scene.Path()}, def);
      const auto reader = ReaderOf<std::uint16_t>(source);
      ASSERT_TRUE(reader->PyramidBuild(0, 3, c.method, TileDimensions{8, 8}));
      struct Place {
        LevelShape shape;
        unsigned column, row, band;
      };
      std::vector<Place> places;
      const LevelTiling tiling = TilingOf(c.bands, 8);
      for (unsigned level = 0; level <= 3; ++level) {
        const LevelShape shape(c.samples, c.lines, level, tiling.side);
        for (unsigned row = 0; row < shape.Rows(); ++row)
          for (unsigned column = 0; column < shape.Columns(); ++column)
            for (unsigned band = 0; band < c.bands; band += tiling.bands)
              places.push_back({shape, column, row, band});
      }
      std::shuffle(places.begin(), places.end(), std::mt19937(seed));
      for (const Place& place : places) {
        const unsigned width = place.shape.ColumnWidth(place.column);
        const unsigned height = place.shape.RowHeight(place.row);
        Array<unsigned> bands(ArrayDims(tiling.bands));
        for (unsigned i = 0; i < tiling.bands; ++i) bands[i] = place.band + i;
        const auto value = static_cast<std::uint16_t>(place.shape.level * 1000 + place.row * 50 +
                                                      place.column * 3 + place.band);
        const std::vector<std::uint16_t> pixels(std::size_t{width} * height * tiling.bands, value);
        const std::vector<unsigned char> states(pixels.size());
        ASSERT_TRUE(reader->WritePixels(place.column * tiling.side, place.row * tiling.side, width,
                                        height, bands, place.shape.level, pixels.data(),
                                        states.data()))
            << TakeFault().ToUTF8();
      }
      ASSERT_TRUE(reader->PyramidRefresh()) << TakeFault().ToUTF8();
      const std::string bytes = ReadFile(scene.Path());
      if (first.empty()) first = bytes;
      EXPECT_TRUE(bytes == first);
    }
  }
}

TEST(PyramidFile, TakesPackedTilesThatCanBeItsOwn) {
  PyramidScene scene;
  const auto source = CreateSource({"Pyramid", scene.Path()}, SmallDef());
  const auto reader = ReaderOf<std::int16_t>(source);
  auto* const levels = dynamic_cast<PackedLevels*>(reader.Get());
  ASSERT_TRUE(levels != nullptr && levels->GetLevelPacking() == Packing::kLz4);
  std::vector<std::int16_t> pixels(20 * 8 * 2, 7);
  const std::vector<unsigned char> states(pixels.size());
  const LevelShape shape(40, 24, 1, 8);  // 20 by 12
  const auto rowOf = [&](unsigned row) {
    PackedTileRow made{1, row, 0, 0, {}, {}};
    std::vector<unsigned char> bytes;
    for (const TileToStore& tile :
         PackTiles({shape, row, 0, 3, 2, 2, reinterpret_cast<const unsigned char*>(pixels.data()),
                    states.data()},
                   Packing::kLz4)) {
      made.tiles.push_back(tile.entry);
      bytes.insert(bytes.end(), tile.pixels.begin(), tile.pixels.end());
    }
    made.bytes.Resize(bytes.size());
    std::copy(bytes.begin(), bytes.end(), made.bytes.Get());
    return made;
  };
  EXPECT_FALSE(levels->WritePackedTiles(rowOf(0)));  // nothing is being built
  ASSERT_TRUE(reader->PyramidBuild(1, 1, 2, TileDimensions{8, 8}));
  const std::function<void(PackedTileRow&)> faults[] = {
      [](PackedTileRow& row) { row.level = 2; },
      [](PackedTileRow& row) { row.row = 2; },
      [](PackedTileRow& row) { row.column = 1; },
      [](PackedTileRow& row) { row.band = 1; },
      [](PackedTileRow& row) { row.tiles.clear(); },
      [](PackedTileRow& row) { row.tiles.pop_back(); },
      [](PackedTileRow& row) { ++row.tiles[1].checksum; },
      [](PackedTileRow& row) { row.bytes.Get()[3] ^= 1; },
      [](PackedTileRow& row) { row.tiles[2].pixelBytes += 4096; },
      [](PackedTileRow& row) { row.tiles[0].stateBytes = 0xFFFFFFFF; },
  };
  for (const auto& fault : faults) {
    PackedTileRow row = rowOf(0);
    fault(row);
    EXPECT_FALSE(levels->WritePackedTiles(row)) << &fault - faults;
    EXPECT_NE(TakeFault().GetLength(), 0U);
  }
  EXPECT_TRUE(levels->WritePackedTiles(rowOf(0)) && levels->WritePackedTiles(rowOf(1)));
  EXPECT_TRUE(reader->PyramidRefresh()) << TakeFault().ToUTF8();
  const Shown shown = Show(scene.Path());
  EXPECT_EQ(shown.pixels, std::vector<std::int16_t>(20 * 12 * 2, 7));
}

}  // namespace
}  // namespace lumo::test
