#include <cmath>
#include <limits>
#include <thread>

#include "orva_scene.h"
#include "raster/block_states.h"

namespace lumo::test {
namespace {

constexpr Interleave kInterleaves[] = {Interleave::BIP, Interleave::BIL, Interleave::BSQ};

struct Case {
  SubRect rect;
  std::vector<unsigned> bands;
};

/// Blocks at the edges and inside, with all bands, some, one twice, out of order.
const std::vector<Case> kBlocks = {
    {{0, 0, 6, 4}, {0, 1, 2, 3}}, {{0, 0, 6, 4}, {2}},       {{6, 4, 6, 4}, {3, 0}},
    {{1, 1, 5, 3}, {0, 1, 2, 3}}, {{0, 2, 6, 3}, {1, 2}},    {{2, 0, 2, 4}, {3, 2, 1, 0}},
    {{0, 4, 6, 4}, {1, 1, 3}},    {{3, 1, 6, 2}, {0, 1, 2}}, {{0, 0, 0, 0}, {0, 1, 2, 3}}};

std::string Name(const Scene& scene, unsigned dataType) {
  return FormatValue(scene.interleave).ToUTF8() + (scene.bigEndian ? " big " : " little ") +
         DataTypeName(dataType).ToUTF8();
}

/// Runs `body<T>(scene, path)` for every type, interleave and byte order.
template <typename Body>
void ForEachScene(Body&& body) {
  const TemporaryDirectory directory;
  ForEachType(TwelveTypes{}, [&]<typename T>() {
    for (const Interleave interleave : kInterleaves) {
      for (const bool bigEndian : {false, true}) {
        Scene scene;
        scene.interleave = interleave;
        scene.bigEndian = bigEndian;
        scene.offset = 3;  // no number lies where the machine would like it
        SCOPED_TRACE(Name(scene, kDataTypeOf<T>));
        const auto path = directory.Path() / "scene";
        scene.Write<T>(path);
        body.template operator()<T>(scene, path);
      }
    }
  });
}

TEST(OrvaPixels, ReadsBlocksOfEveryTypeInterleaveAndByteOrder) {
  ForEachScene([]<typename T>(const Scene& scene, const std::filesystem::path& path) {
    auto source = OpenSource({"ORVA", path.string()});
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    const auto reader = ReaderOf<T>(source);
    ASSERT_TRUE(reader);
    for (const Case& c : kBlocks) {
      Block<T> block{c.rect, c.bands, {}, {}};
      ASSERT_TRUE(block.Read(*reader)) << TakeFault().ToUTF8();
      auto pixel = block.pixels.begin();
      VisitBlock(scene.interleave, c.rect, c.bands, [&](unsigned s, unsigned l, unsigned b) {
        ASSERT_EQ(*pixel++, RampValue<T>(s, l, b)) << s << ' ' << l << ' ' << b;
      });
      EXPECT_EQ(std::count(block.state.begin(), block.state.end(), 0),
                static_cast<std::ptrdiff_t>(block.state.size()));
    }
  });
}

TEST(OrvaPixels, WritesBlocksInPlaceAndLeavesTheRest) {
  ForEachScene([]<typename T>(const Scene& scene, const std::filesystem::path& path) {
    for (const Case& c : kBlocks) {
      scene.Write<T>(path);
      auto source = OpenSource({"ORVA", path.string()});
      ASSERT_TRUE(source) << TakeFault().ToUTF8();
      Block<T> block{c.rect, c.bands, {}, {}};
      std::vector<T> want(std::size_t{scene.samples} * scene.lines * scene.bands);
      const auto at = [&](unsigned s, unsigned l, unsigned b) -> T& {
        return want[(std::size_t{b} * scene.lines + l) * scene.samples + s];
      };
      VisitBlock(Interleave::BSQ, scene.All(), scene.AllBands(),
                 [&](unsigned s, unsigned l, unsigned b) { at(s, l, b) = RampValue<T>(s, l, b); });
      VisitBlock(scene.interleave, c.rect, c.bands, [&](unsigned s, unsigned l, unsigned b) {
        const T value = RampValue<T>(s + 100, l + block.pixels.size(), b);
        block.pixels.push_back(value);
        at(s, l, b) = value;  // of a band that comes twice the last counts
      });
      block.state.assign(block.pixels.size(), 0);
      // BSQ and BIL write a band that comes twice row by row, so the last of it counts there too.
      ASSERT_TRUE(block.Write(*ReaderOf<T>(source))) << TakeFault().ToUTF8();
      ASSERT_EQ(ReadFile(path), scene.Pixels<T>(at)) << c.bands.size();
    }
  });
}

TEST(OrvaPixels, BlocksLargerThanAStretchAndPixelsLargerThanAGap) {
  const TemporaryDirectory directory;
  const struct {
    unsigned samples, lines, bands;
    SubRect rect;
    std::vector<unsigned> chosen;
  } cases[] = {
      {3000, 90, 7, {1, 3, 2990, 88}, {6, 2, 2}},         // many runs of picked rows
      {90000, 2, 3, {5, 0, 89990, 1}, {1}},               // a row larger than a run
      {6, 3, 9000, {1, 0, 4, 2}, {8999, 0, 1, 2, 4500}},  // a pixel larger than a gap
      {700, 40, 20, {690, 0, 699, 39}, {3, 17}},          // narrow: gaps small and large
      {1, 1, 1, {0, 0, 0, 0}, {0}},
  };
  for (const auto& c : cases) {
    for (const Interleave interleave : kInterleaves) {
      Scene scene{c.samples, c.lines, c.bands, interleave, true, 0, ""};
      SCOPED_TRACE(Name(scene, 12) + " " + std::to_string(c.samples));
      const auto path = directory.Path() / "large";
      scene.Write<std::uint16_t>(path);
      auto source = OpenSource({"ORVA", path.string()});
      const auto reader = ReaderOf<std::uint16_t>(source);
      ASSERT_TRUE(reader) << TakeFault().ToUTF8();
      Block<std::uint16_t> block{c.rect, c.chosen, {}, {}};
      ASSERT_TRUE(block.Read(*reader)) << TakeFault().ToUTF8();
      std::size_t i = 0, wrong = 0;
      VisitBlock(interleave, c.rect, c.chosen, [&](unsigned s, unsigned l, unsigned b) {
        wrong += block.pixels[i++] != RampValue<std::uint16_t>(s, l, b) ? 1 : 0;
      });
      EXPECT_EQ(wrong, 0U);

      // Written back as it was read, the file stays the same.
      const std::string before = ReadFile(path);
      ASSERT_TRUE(block.Write(*reader)) << TakeFault().ToUTF8();
      EXPECT_TRUE(ReadFile(path) == before);
    }
  }
}

/// Blocks large enough to be read in parts, in every order of the file and the caller; with and
/// without pixels that are no data, one block after the other in the same arrays.
TEST(OrvaPixels, ReadsOtherInterleavesThroughTheReader) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  for (const Interleave stored : kInterleaves) {
    Scene scene{700, 300, 4, stored, true, 0, "no data values = {none, 77, none, none}\n"};
    const auto value = [](unsigned s, unsigned l, unsigned b) {
      return static_cast<std::uint16_t>(s < 350 ? 1000 + s + 7 * l + b : (s + l + b) % 100);
    };
    WriteFile(path, scene.Pixels<std::uint16_t>(value));
    WriteFile(path + ".hdr", scene.Header("UInt16"));
    auto source = OpenSource({"ORVA", path});
    const auto reader = ReaderOf<std::uint16_t>(source);
    ASSERT_TRUE(reader) << TakeFault().ToUTF8();
    Array<std::uint16_t> pixels;
    Array<unsigned char> state;
    for (const Interleave wanted : kInterleaves) {
      SCOPED_TRACE(FormatValue(stored).ToUTF8() + " to " + FormatValue(wanted).ToUTF8());
      for (const Case& c : std::vector<Case>{{{0, 0, 699, 299}, {0, 1, 2, 3}},
                                             {{0, 0, 349, 299}, {0, 1, 2, 3}},
                                             {{20, 3, 690, 280}, {3, 1}},
                                             {{351, 2, 354, 4}, {2, 1, 1}}}) {
        ASSERT_TRUE(reader->ReadBlock(c.rect, Block<std::uint16_t>{{}, c.bands, {}, {}}.BandArray(),
                                      0, wanted, pixels, state));
        std::size_t at = 0, wrong = 0;
        VisitBlock(wanted, c.rect, c.bands, [&](unsigned s, unsigned l, unsigned b) {
          const std::uint16_t want = value(s, l, b);
          const int bits = b == 1 && want == 77 ? PixelValueState::NoData : 0;
          if (pixels[at] != want || state[at] != bits) ++wrong;
          ++at;
        });
        EXPECT_EQ(at, state.GetCount());
        EXPECT_EQ(wrong, 0U);
      }
    }
  }
}

/// Marks, by the definition, what a reader is to mark.
template <typename T, typename IsNoData>
void ExpectMarks(const Scene& scene, const Block<T>& block, IsNoData&& isNoData) {
  std::size_t i = 0;
  VisitBlock(scene.interleave, block.rect, block.bands, [&](unsigned, unsigned, unsigned b) {
    ASSERT_EQ(block.state[i], isNoData(b, block.pixels[i]) ? PixelValueState::NoData : 0) << i;
    ++i;
  });
}

TEST(OrvaPixels, MarksNoDataOfTheBandsThatHaveIt) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  const double nan = std::numeric_limits<double>::quiet_NaN();
  for (const Interleave interleave : kInterleaves) {
    SCOPED_TRACE(FormatValue(interleave).ToUTF8());
    // Some 300 elements, so that patterns of bands begin again.
    Scene scene{29, 4, 3, interleave, true, 0, "no data values = {5, none, nan}\n"};
    const auto value = [&](unsigned s, unsigned l, unsigned b) {
      const unsigned kind = (s + l + b) % 4;
      return kind == 0 ? 5.0 : kind == 1 ? nan : kind == 2 ? -nan : 5.0 + 1e-12;
    };
    WriteFile(path, scene.Pixels<double>(value));
    WriteFile(path + ".hdr", scene.Header("Double"));
    auto source = OpenSource({"ORVA", path});
    const auto reader = ReaderOf<double>(source);
    ASSERT_TRUE(reader) << TakeFault().ToUTF8();
    EXPECT_TRUE(reader->HasNoDataValue(0));
    EXPECT_FALSE(reader->HasNoDataValue(1));
    EXPECT_EQ(reader->NoDataValue(0), 5);
    EXPECT_TRUE(std::isnan(reader->NoDataValue(2)));
    for (const std::vector<unsigned>& bands :
         {std::vector<unsigned>{0, 1, 2}, {2, 0}, {1}, {0}, {2, 2, 1, 0}}) {
      Block<double> block{{1, 0, 28, 3}, bands, {}, {}};
      ASSERT_TRUE(block.Read(*reader));
      ExpectMarks(scene, block, [](unsigned band, double pixel) {
        return band == 0 ? pixel == 5 : band == 2 && std::isnan(pixel);
      });
      for (const Interleave order : kInterleaves) {
        Array<double> pixels;
        Array<unsigned char> room;
        BlockStates states(room);
        ASSERT_TRUE(reader->ReadBlock(block.rect, block.BandArray(), 0, order, pixels, states));
        EXPECT_EQ(states.AreMade(), bands != std::vector<unsigned>{1}) << "none without a reason";
      }
    }
  }
}

TEST(OrvaPixels, NoDataOfLargeIntegersIsExact) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  constexpr std::uint64_t kValue = 18446744073709551613U;  // no double is this number
  Scene scene{4, 1, 1, Interleave::BIL, false, 0, "no data values = {18446744073709551613}\n"};
  WriteFile(path, scene.Pixels<std::uint64_t>(
                      [](unsigned s, unsigned, unsigned) { return kValue - 1 + s; }));
  WriteFile(path + ".hdr", scene.Header("UInt64"));
  auto source = OpenSource({"ORVA", path});
  const auto reader = ReaderOf<std::uint64_t>(source);
  ASSERT_TRUE(reader) << TakeFault().ToUTF8();
  EXPECT_EQ(reader->NoDataValue(0), kValue);
  Block<std::uint64_t> block{scene.All(), {0}, {}, {}};
  ASSERT_TRUE(block.Read(*reader));
  EXPECT_EQ(block.state, (std::vector<unsigned char>{0, 1, 0, 0}));
}

TEST(OrvaPixels, RefusesBlocksOutsideTheRaster) {
  const TemporaryDirectory directory;
  Scene scene;
  scene.Write<std::uint8_t>(directory.Path() / "scene");
  auto source = OpenSource({"ORVA", (directory.Path() / "scene").string()});
  const auto reader = ReaderOf<std::uint8_t>(source);
  ASSERT_TRUE(reader);
  std::vector<std::uint8_t> pixels(1000);
  std::vector<unsigned char> state(1000);
  const struct {
    unsigned left, top, width, height;
    std::vector<unsigned> bands;
    unsigned level;
  } cases[] = {{6, 0, 2, 1, {0}, 0},          {0, 4, 1, 2, {0}, 0}, {0, 0, 1, 1, {4}, 0},
               {0xFFFFFFFF, 0, 2, 1, {0}, 0}, {0, 0, 0, 1, {0}, 0}, {0, 0, 1, 1, {}, 0},
               {0, 0, 1, 1, {0}, 1}};
  for (const auto& c : cases) {
    const Array<unsigned> bands = Block<std::uint8_t>{{}, c.bands, {}, {}}.BandArray();
    EXPECT_FALSE(reader->ReadPixels(c.left, c.top, c.width, c.height, bands, c.level, pixels.data(),
                                    state.data()));
    EXPECT_NE(TakeFault().ToUTF8().find("scene: a block outside the raster"), std::string::npos);
    EXPECT_FALSE(reader->WritePixels(c.left, c.top, c.width, c.height, bands, c.level,
                                     pixels.data(), state.data()));
  }
}

TEST(OrvaPixels, AFileThatShrinksFailsTheReadAlone) {
  const TemporaryDirectory directory;
  const auto path = directory.Path() / "scene";
  Scene scene;
  scene.Write<float>(path);
  auto source = OpenSource({"ORVA", path.string()});
  const auto reader = ReaderOf<float>(source);
  ASSERT_TRUE(reader);
  std::filesystem::resize_file(path, 8);
  Block<float> block{scene.All(), scene.AllBands(), {}, {}};
  EXPECT_FALSE(block.Read(*reader));
  EXPECT_EQ(TakeFault().ToUTF8(),
            std::filesystem::canonical(path).string() + ": the file is too short");
  scene.Write<float>(path);
  EXPECT_TRUE(block.Read(*reader));
}

/// A block that is read in parts fails as a whole, and leaves nothing to the next one.
TEST(OrvaPixels, AReadInAnotherOrderThatFailsLeavesZeroes) {
  const TemporaryDirectory directory;
  const auto path = directory.Path() / "scene";
  Scene scene{500, 400, 3, Interleave::BIP, false, 0, "no data values = {1004, none, none}\n"};
  for (const bool isDirect : {false, true}) {
    scene.Write<float>(path);
    DataManager& manager = GetGlobalDataManager();
    const Array<String> strings = Strings({"ORVA", path.string()});
    const RasterDataConnectionPtr source(isDirect ? manager.ConnectDirect(strings, {}, {})
                                                  : manager.Connect(strings, GeoRefPtr(), {}));
    const auto reader = ReaderOf<float>(source);
    ASSERT_TRUE(reader) << TakeFault().ToUTF8();
    Array<float> pixels;
    Array<unsigned char> state;
    const auto read = [&] {
      return reader->ReadBlock(scene.All(), Block<float>{{}, {0, 2, 1}, {}, {}}.BandArray(), 0,
                               Interleave::BSQ, pixels, state);
    };
    ASSERT_TRUE(read()) << TakeFault().ToUTF8();
    EXPECT_EQ(pixels[std::size_t{500} * 400 + 77], RampValue<float>(77, 0, 2));
    EXPECT_EQ(state[500 + 4], PixelValueState::NoData);
    EXPECT_EQ(std::count(state.begin(), state.end(), 0), state.GetCount() - 1);
    std::filesystem::resize_file(path, 300 * 6000);
    EXPECT_FALSE(read());
    EXPECT_EQ(TakeFault().ToUTF8(),
              std::filesystem::canonical(path).string() + ": the file is too short");
    EXPECT_EQ(std::count(pixels.begin(), pixels.end(), 0.0F), pixels.GetCount());
    EXPECT_EQ(std::count(state.begin(), state.end(), 0), state.GetCount());
  }
}

TEST(OrvaPixels, ThreadsShareOneProxy) {
  const TemporaryDirectory directory;
  Scene scene{211, 97, 3, Interleave::BIL, true, 0, ""};
  scene.Write<std::int32_t>(directory.Path() / "scene");
  auto source = OpenSource({"ORVA", (directory.Path() / "scene").string()});
  const auto reader = ReaderOf<std::int32_t>(source);
  ASSERT_TRUE(reader);
  std::atomic<unsigned> wrong{0};
  const auto read = [&](unsigned band) {
    for (unsigned line = 0; line < scene.lines; ++line) {
      Block<std::int32_t> block{{0, line, scene.samples - 1, line}, {band}, {}, {}};
      if (!block.Read(*reader)) ++wrong;
      for (unsigned s = 0; s < scene.samples; ++s) {
        wrong += block.pixels[s] != RampValue<std::int32_t>(s, line, band) ? 1U : 0U;
      }
    }
  };
  std::thread other(read, 1);
  read(2);
  other.join();
  EXPECT_EQ(wrong, 0U);
}

}  // namespace
}  // namespace lumo::test
