#include <unistd.h>

#include "orva_scene.h"
#include "support/file_size_limit.h"

namespace lumo::test {
namespace {

/// The names in a directory, in order.
std::vector<std::string> Names(const std::filesystem::path& directory) {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(directory)) {
    names.push_back(entry.path().filename().string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

using NameList = std::vector<std::string>;

template <typename T>
bool WriteRamp(const Scene& scene, RasterReader<T>& reader) {
  Block<T> block{scene.All(), scene.AllBands(), {}, {}};
  VisitBlock(scene.interleave, block.rect, block.bands, [&](unsigned s, unsigned l, unsigned b) {
    block.pixels.push_back(RampValue<T>(s, l, b));
  });
  block.state.assign(block.pixels.size(), 0);
  return block.Write(reader);
}

TEST(OrvaCreation, GivesTheRasterItsHeaderWhenItIsLetGo) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "new").string();
  ForEachType(TwelveTypes{}, [&]<typename T>() {
    for (const Interleave interleave :
         {Interleave::BIP, Interleave::BIL, Interleave::BSQ, Interleave::None}) {
      SCOPED_TRACE(DataTypeName(kDataTypeOf<T>).ToUTF8());
      Scene scene;
      scene.interleave = interleave;
      RasterDef def = scene.Def(kDataTypeOf<T>);
      def.noData = {{1, 7}, {3, 0}};
      auto source = CreateSource({path}, def);
      ASSERT_TRUE(source) << TakeFault().ToUTF8();
      const auto reader = ReaderOf<T>(source);
      ASSERT_TRUE(reader && reader->CanWritePixels(0) && WriteRamp(scene, *reader));
      EXPECT_FALSE(std::filesystem::exists(path + ".hdr"));
      EXPECT_FALSE(OpenSource({"ORVA", path}));
      ASSERT_EQ(Release(source), "");
      EXPECT_EQ(Names(directory.Path()), (NameList{"new", "new.hdr"}));

      source = OpenSource({"ORVA", path});
      ASSERT_TRUE(source) << TakeFault().ToUTF8();
      EXPECT_EQ(source->RasterDef().noData, def.noData);
      scene.interleave = interleave == Interleave::None ? Interleave::BSQ : interleave;
      EXPECT_EQ(source->RasterDef().interleave, scene.interleave);
      EXPECT_TRUE(ReadFile(path) == scene.Pixels<T>(RampValue<T>));
      std::filesystem::remove(path);
      std::filesystem::remove(path + ".hdr");
    }
  });
}

TEST(OrvaCreation, WhatIsNotWrittenIsZeroAndTakesNoRoom) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "new").string();
  Scene scene{100000, 100000, 10, Interleave::BSQ, false, 0, ""};
  auto source = CreateSource({path}, scene.Def(kDataTypeOf<double>));
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  const auto reader = ReaderOf<double>(source);
  ASSERT_TRUE((Block<double>{{99999, 99999, 99999, 99999}, {9}, {2.5}, {0}}.Write(*reader)));
  Block<double> block{{99998, 99999, 99999, 99999}, {8, 9}, {}, {}};
  ASSERT_TRUE(block.Read(*reader));
  EXPECT_EQ(block.pixels, (std::vector<double>{0, 0, 0, 2.5}));
  ASSERT_EQ(Release(source), "");
  EXPECT_EQ(std::filesystem::file_size(path), 800'000'000'000U);
}

TEST(OrvaCreation, AnOlderRasterStaysUntilTheNewOneIsWhole) {
  const TemporaryDirectory directory;
  const auto path = directory.Path() / "old";
  Scene older, newer;
  older.bands = 2;
  older.Write<float>(path);
  const std::string header = ReadFile(path.string() + ".hdr");
  auto source = CreateSource({path.string()}, newer.Def(kDataTypeOf<std::int16_t>));
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  ASSERT_TRUE(WriteRamp(newer, *ReaderOf<std::int16_t>(source)));
  EXPECT_TRUE(ReadFile(path) == older.Pixels<float>(RampValue<float>));
  EXPECT_EQ(ReadFile(path.string() + ".hdr"), header);
  auto open = OpenSource({"ORVA", path.string()});
  EXPECT_TRUE(open);

  ASSERT_EQ(Release(source), "");
  EXPECT_EQ(Names(directory.Path()), (NameList{"old", "old.hdr"}));
  EXPECT_TRUE(ReadFile(path) == newer.Pixels<std::int16_t>(RampValue<std::int16_t>));
  EXPECT_TRUE(OpenSource({"ORVA", path.string()}));
  // Who has the older one open goes on with its pixels, and leaves the new header alone.
  Block<float> block{older.All(), {1}, {}, {}};
  EXPECT_TRUE(block.Read(*ReaderOf<float>(open)));
  EXPECT_EQ(block.pixels[1], RampValue<float>(1, 0, 1));
  RasterBandStats<float> stats;
  stats.mask = StatsMask::Basic;
  EXPECT_FALSE(ReaderOf<float>(open)->WriteStats(MakeArray<RasterBandStats<float>>({stats})));
  EXPECT_NE(TakeFault().ToUTF8().find("replaced since it was opened"), std::string::npos);
}

TEST(OrvaCreation, AFileThatItsUserDeletedGetsNoHeader) {
  const TemporaryDirectory directory;
  const auto path = directory.Path() / "temporary";
  auto source = CreateSource({path.string()}, Scene().Def(kDataTypeOf<float>));
  ASSERT_TRUE(source);
  EXPECT_TRUE(std::filesystem::exists(path)) << "the name is taken from the start";
  std::filesystem::remove(path);
  EXPECT_EQ(Release(source), "");
  EXPECT_EQ(Names(directory.Path()), NameList{});
}

TEST(OrvaCreation, RefusesWhatItCanNotHold) {
  const TemporaryDirectory directory;
  const std::string path = (std::filesystem::canonical(directory.Path()) / "new").string();
  const struct {
    const char* fault;
    void (*change)(RasterDef&);
  } cases[] = {
      {"a raster without pixels", [](RasterDef& def) { def.lines = 0; }},
      {"no pixels of the type Quad", [](RasterDef& def) { def.dataType = 95; }},
      {"no such interleave", [](RasterDef& def) { def.interleave = Interleave{3}; }},
      {"the file would be larger than any file",
       [](RasterDef& def) { def.samples = def.lines = def.bands = 0xFFFFFFFF; }},
      {"the no-data value 0.5 of band 0 is no pixel of this raster",
       [](RasterDef& def) { def.noData[0] = 0.5; }},
      {"the no-data value 1 of band 4 is no pixel of this raster",
       [](RasterDef& def) { def.noData[4] = 1; }},
  };
  for (const auto& c : cases) {
    RasterDef def = Scene().Def(kDataTypeOf<std::int16_t>);
    c.change(def);
    EXPECT_FALSE(CreateSource({path}, def));
    EXPECT_EQ(TakeFault().ToUTF8(), path + ": " + c.fault);
    EXPECT_EQ(Names(directory.Path()), NameList{});
  }
  const RasterDef def = Scene().Def(kDataTypeOf<float>);
  EXPECT_FALSE(CreateSource({path + "/in"}, def));
  EXPECT_EQ(TakeFault().ToUTF8(), path + "/in: No such file or directory");
  EXPECT_FALSE(CreateSource({directory.Path().string()}, def));
  EXPECT_NE(TakeFault().ToUTF8().find(": not a file"), std::string::npos);
}

TEST(OrvaCreation, AFullDiskLeavesNoRasterAndTheOlderOne) {
  for (const bool hasOlder : {false, true}) {
    const TemporaryDirectory directory;
    const auto path = std::filesystem::canonical(directory.Path()) / "full";
    if (hasOlder) Scene().Write<float>(path);
    const Scene scene{64, 64, 4, Interleave::BSQ, false, 0, ""};
    auto source = CreateSource({path.string()}, scene.Def(kDataTypeOf<double>));
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    {
      const FileSizeLimit limit(20000);
      EXPECT_FALSE(WriteRamp(scene, *ReaderOf<double>(source)));
    }
    EXPECT_EQ(TakeFault().ToUTF8(), path.string() + ": File too large");
    Release(source);
    EXPECT_EQ(Names(directory.Path()), hasOlder ? (NameList{"full", "full.hdr"}) : NameList{});
    EXPECT_EQ(bool(OpenSource({"ORVA", path.string()})), hasOlder);
  }
}

TEST(OrvaCreation, NoRoomForTheHeaderLeavesNoRasterAndTheOlderOne) {
  for (const bool hasOlder : {false, true}) {
    const TemporaryDirectory directory;
    const auto path = std::filesystem::canonical(directory.Path()) / "full";
    if (hasOlder) Scene().Write<float>(path);
    auto source = CreateSource({path.string()}, Scene().Def(kDataTypeOf<double>));
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    {
      const FileSizeLimit limit(20);
      EXPECT_NE(Release(source).find(".hdr"), std::string::npos);
    }
    EXPECT_EQ(Names(directory.Path()), hasOlder ? (NameList{"full", "full.hdr"}) : NameList{});
    EXPECT_EQ(bool(OpenSource({"ORVA", path.string()})), hasOlder);
  }
}

/// Two that are made at one place at once: the first to be whole stays, the other says so.
TEST(OrvaCreation, OfTwoMakersOneWinsAndTheOtherSaysSo) {
  for (const bool hasOlder : {false, true}) {
    for (const bool firstWins : {true, false}) {
      SCOPED_TRACE(testing::Message() << "older " << hasOlder << ", first " << firstWins);
      const TemporaryDirectory directory;
      const auto path = std::filesystem::canonical(directory.Path()) / "scene";
      if (hasOlder) Scene().Write<float>(path);
      Scene small, large;
      large.lines = 9;
      auto first = CreateSource({path.string()}, small.Def(kDataTypeOf<double>));
      auto second = CreateSource({path.string()}, large.Def(kDataTypeOf<double>));
      ASSERT_TRUE(first && second) << TakeFault().ToUTF8();
      ASSERT_TRUE(WriteRamp(small, *ReaderOf<double>(first)));
      ASSERT_TRUE(WriteRamp(large, *ReaderOf<double>(second)));
      EXPECT_EQ(Release(firstWins ? first : second), "");
      EXPECT_EQ(Release(firstWins ? second : first),
                path.string() + ": was replaced by another program meanwhile");
      EXPECT_EQ(Names(directory.Path()), (NameList{"scene", "scene.hdr"}));
      const Scene& whole = firstWins ? small : large;
      EXPECT_TRUE(ReadFile(path) == whole.Pixels<double>(RampValue<double>));
      EXPECT_EQ(OpenSource({"ORVA", path.string()})->RasterDef().lines, whole.lines);
    }
  }
}

TEST(OrvaCreation, AFileThatCanNotBeWrittenIsReadOnly) {
  if (geteuid() == 0) GTEST_SKIP() << "root may write everything";
  const TemporaryDirectory directory;
  const auto path = directory.Path() / "scene";
  Scene().Write<float>(path);
  std::filesystem::permissions(path, std::filesystem::perms::owner_read);
  auto source = OpenSource({"ORVA", path.string()});
  ASSERT_TRUE(source);
  const auto reader = ReaderOf<float>(source);
  EXPECT_FALSE(source->CanWrite() || reader->CanWritePixels(0));
  // The format has room for statistics: that they can't be stored is a failure, not a matter of
  // course.
  RasterBandStats<float> stats;
  stats.mask = StatsMask::Basic;
  EXPECT_TRUE(reader->CanWriteStats() && reader->CanWriteHistogram());
  EXPECT_FALSE(reader->WriteStats(MakeArray<RasterBandStats<float>>({stats})));
  EXPECT_NE(TakeFault().ToUTF8().find("scene: Permission denied"), std::string::npos);
  EXPECT_FALSE((Block<float>{{0, 0, 0, 0}, {0}, {1.5F}, {0}}.Write(*reader)));
}

}  // namespace
}  // namespace lumo::test
