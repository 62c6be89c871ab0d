#include "commands/catalog.h"
#include "foundation/library.h"
#include "platform/shared_memory.h"
#include "support/fake_source.h"
#include "support/run_command.h"

namespace lumo {
namespace {

using test::FakeFormat;
using test::RunCommand;

const std::string kSource = "EXTERNAL|x";
const std::string kUri = "[fake://source] ";

unsigned CountOf(const char* uri) {
  return GetGlobalDataMap().Find(URI(String(uri))).count;
}

class RasterCommands : public testing::Test {
 protected:
  void TearDown() override {
    while (CountOf("fake://source") != 0) RunCommand("CloseRasterCommand", {{"URI", kUri}});
    EXPECT_EQ(format.fake.made, format.fake.destroyed);
  }
  void Open() {
    const auto opened = RunCommand("OpenRasterCommand", {{"ConnStr", kSource}});
    ASSERT_TRUE(opened.Succeeded()) << opened.reason;
  }

  FakeFormat format{"EXTERNAL"};
};

TEST_F(RasterCommands, OpensOfOneSourceMeet) {
  const auto opened = RunCommand("OpenRasterCommand", {{"ConnStr", kSource}});
  EXPECT_EQ(opened.outputs.at("URI"), kUri);
  EXPECT_EQ(opened.outputs.at("DataType"), "Int16");
  const ObjectPtr first = catalog::Find(URI(String("fake://source")));
  Open();
  EXPECT_EQ(CountOf("fake://source"), 2u);
  EXPECT_TRUE(catalog::Find(URI(String("fake://source"))) == first);
  EXPECT_TRUE(RunCommand("AccessRasterCommand", {{"SrcURI", kUri}}).Succeeded());
  EXPECT_EQ(CountOf("fake://source"), 3u);
  for (unsigned left = 3; left-- > 0;) {
    EXPECT_TRUE(RunCommand("CloseRasterCommand", {{"URI", kUri}}).Succeeded());
    EXPECT_EQ(CountOf("fake://source"), left);
  }
  EXPECT_TRUE(RunCommand("CloseRasterCommand", {{"URI", kUri}}).Succeeded());
  EXPECT_EQ(BasicRasterPtr(first)->Samples(), 7u);  // who holds it works on
}

TEST_F(RasterCommands, TellsWhatARasterIs) {
  Open();
  const auto query = RunCommand("ExtendedQueryRasterCommand", {{"URI", kUri}});
  ASSERT_TRUE(query.Succeeded()) << query.reason;
  const std::map<std::string, std::string> want{{"Samples", "7"},
                                                {"Lines", "5"},
                                                {"Bands", "3"},
                                                {"Interleave", "BSQ"},
                                                {"DataType", "Int16"},
                                                {"Format", "EXTERNAL"},
                                                {"CanWrite", "1"},
                                                {"TileDimensions", "4 2 0 0 0 0 0 Invariable"},
                                                {"PyramidExists", "0"},
                                                {"PyramidType", "None"},
                                                {"PyramidCanBuild", "1"},
                                                {"HasNoDataValue", "1:3 [0 0 1] "},
                                                {"NoDataValue", "1:3 [0 0 3] "},
                                                {"HasPalette", "1:3 [1 0 0] "},
                                                {"StatsExist", "1:3 [0 3 0] "}};
  for (const auto& [name, text] : want) EXPECT_EQ(query.outputs.at(name), text) << name;
  EXPECT_FALSE(RunCommand("QueryRasterCommand", {{"URI", kUri}}).outputs.count("HasPalette"));
}

TEST_F(RasterCommands, PalettesGoThroughTheSource) {
  Open();
  EXPECT_EQ(RunCommand("GetRasterPaletteCommand", {{"URI", kUri}, {"Bands", "1:2 [0 1] "}})
                .outputs.at("Palettes"),
            "1:2 [1 [(red 255 0 0 255 0) ]  0 [] ] ");
  EXPECT_EQ(RunCommand("DeleteRasterPaletteCommand", {{"URI", kUri}, {"Bands", "1:2 [0 1] "}})
                .outputs.at("Return"),
            "1:2 [1 0] ");
  const std::string two = "2 [(red 255 0 0 255 0) (blue 0 0 255 255 0) ] ";
  EXPECT_EQ(RunCommand("SetRasterPaletteCommand", {{"URI", kUri}, {"Band", "0"}, {"Palette", two}})
                .outputs.at("Return"),
            "1");
  EXPECT_FALSE(
      RunCommand("SetRasterPaletteCommand", {{"URI", kUri}, {"Band", "3"}, {"Palette", two}})
          .Succeeded());
}

TEST_F(RasterCommands, BlocksTravelThroughNamedMemory) {
  Open();
  const unsigned elements = 2 * 3 * 2;
  auto pixels = platform::SharedMemoryBlock::Create("vexg_test_pixels", elements * 2);
  auto states = platform::SharedMemoryBlock::Create("vexg_test_states", elements);
  ASSERT_TRUE(pixels && states);
  std::map<std::string, std::string> inputs{{"URI", kUri},
                                            {"SubRect", "2 1 3 3"},
                                            {"Bands", "1:2 [2 0] "},
                                            {"Interleave", "BIP"},
                                            {"PixelDataBufName", "vexg_test_pixels"},
                                            {"PixelDataBufSize", "24"},
                                            {"PixelValueStateBufName", "vexg_test_states"},
                                            {"PixelValueStateBufSize", "12"}};
  const auto read = RunCommand("GetRasterSubRectCommand", inputs);
  ASSERT_TRUE(read.Succeeded()) << read.reason;
  EXPECT_EQ(read.outputs.at("Return"), "1");
  const auto* values = reinterpret_cast<const std::int16_t*>(pixels->GetData());
  unsigned at = 0;
  for (unsigned y = 1; y <= 3; ++y)
    for (unsigned x = 2; x <= 3; ++x)
      for (const unsigned band : {2u, 0u}) {
        EXPECT_EQ(values[at], RampValue<std::int16_t>(x, y, band));
        EXPECT_EQ(states->GetData()[at++], band == 2 && x == 3 ? 1 : 0);
      }
  EXPECT_EQ(RunCommand("PutRasterSubRectCommand", inputs).outputs.at("Return"), "1");
  format.fake.throwInRead = true;
  const auto thrown = RunCommand("GetRasterSubRectCommand", inputs);
  EXPECT_TRUE(thrown.Succeeded());
  EXPECT_EQ(thrown.outputs.at("Return"), "0");
  format.fake.throwInRead = false;

  const struct {
    const char *name, *input, *value, *want;
  } bad[] = {{"pixels too small", "PixelDataBufSize", "23", "24 bytes"},
             {"states too small", "PixelValueStateBufSize", "11", "12 bytes"},
             {"no such memory", "PixelDataBufName", "vexg_test_none", "vexg_test_none"},
             {"memory smaller than told", "PixelDataBufSize", "1000000", "1000000 bytes"},
             {"over the edge", "SubRect", "2 1 7 3", "7 by 5"},
             {"band too high", "Bands", "1:2 [0 3] ", "band 3"},
             {"no bands", "Bands", "1:1 [", "no integer array"},
             {"more bands than told", "Bands", "1:999999 [0] ", "no integer array"},
             {"no band", "Bands", "0:[] ", "no band"},
             {"unknown raster", "URI", "[nowhere] ", "nowhere"}};
  for (const auto& c : bad) {
    SCOPED_TRACE(c.name);
    auto changed = inputs;
    changed[c.input] = c.value;
    const auto failed = RunCommand("GetRasterSubRectCommand", changed);
    EXPECT_EQ(failed.result, CommandResult::kFailed);
    EXPECT_THAT(failed.reason, testing::HasSubstr(c.want));
  }
}

TEST_F(RasterCommands, CreatesFromATemplateAndItsChanges) {
  Open();
  format.fake.uri = "fake://made";
  const auto made = RunCommand("CreateRasterCommand", {{"ConnStr", "new"},
                                                       {"SrcURI", kUri},
                                                       {"Lines", "9"},
                                                       {"DataType", "Single"},
                                                       {"NoDataValue", "1:2 [5 6] "}});
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  EXPECT_EQ(made.outputs.at("URI"), "[fake://made] ");
  EXPECT_EQ(made.outputs.at("DataType"), "Single");
  EXPECT_EQ(format.fake.samples, 7u);
  EXPECT_EQ(format.fake.lines, 9u);
  RunCommand("CloseRasterCommand", {{"URI", "[fake://made] "}});
  const struct {
    const char *input, *value, *want;
  } bad[] = {{"HasNoDataValue", "1:4 [1 1 1 1] ", "more no-data entries"},
             {"GeoRef", "nonsense", "GeoRef"},
             {"Format", "TIFFF", "no such format"}};
  for (const auto& c : bad) {
    const auto failed = RunCommand("CreateRasterCommand",
                                   {{"ConnStr", "new"}, {"SrcURI", kUri}, {c.input, c.value}});
    EXPECT_EQ(failed.result, CommandResult::kFailed) << c.input;
    EXPECT_THAT(failed.reason, testing::HasSubstr(c.want));
  }
  format.fake.uri = "fake://source";
}

TEST_F(RasterCommands, AnUnknownRasterFailsThemAll) {
  const std::map<std::string, std::string> inputs{{"URI", "[none] "},
                                                  {"SrcURI", "[none] "},
                                                  {"DstURI", "[none] "},
                                                  {"Bands", "1:1 [0] "},
                                                  {"Band", "0"},
                                                  {"Palette", "0 [] "},
                                                  {"TileDimensions", "1 1 0 0 0 0 0 Variable"}};
  for (const char* name :
       {"AccessRasterCommand", "QueryRasterCommand", "ExtendedQueryRasterCommand",
        "GetRasterPaletteCommand", "SetRasterPaletteCommand", "DeleteRasterPaletteCommand",
        "SetDefaultTileSizeCommand", "CopyRasterCommand"}) {
    const auto failed = RunCommand(name, inputs);
    EXPECT_EQ(failed.result, CommandResult::kFailed) << name;
    EXPECT_THAT(failed.reason, testing::HasSubstr("[none]")) << name;
  }
}

}  // namespace
}  // namespace lumo
