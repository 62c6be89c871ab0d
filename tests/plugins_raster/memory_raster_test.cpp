#include "views/sources/memory_raster.h"

#include <cmath>
#include <cstdio>
#include <cwchar>

#include "commands/catalog.h"
#include "raster/pixel_value.h"
#include "support/raster_sources.h"
#include "support/run_command.h"
#include "support/test_rasters.h"
#include "views/spectral_subset_raster.h"

namespace lumo::test {
namespace {

/// The connection text as the class for such rasters writes it.
std::string Describe(const void* pixels, const char* name, unsigned long samples,
                     unsigned long lines, unsigned short bands, int interleave, int pixelType,
                     double sizeX = 0, double sizeY = 0, double tieX = 0, double tieY = 0,
                     const char* coordSys = " ") {
  char text[2048];
  std::snprintf(text, sizeof text,
                "PIXELDATA=%p;NAME=%s;SAMPLES=%lu;LINES=%lu;BANDS=%hu;INTERLEAVE=%d;PIXELTYPE=%d;"
                "PIXELSIZE=%.9f,%.9f;TIEPTMAP=%.9f,%.9f;COORDSYS=%s",
                pixels, name, samples, lines, bands, interleave, pixelType, sizeX, sizeY, tieX,
                tieY, coordSys);
  return text;
}

constexpr unsigned kSamples = 7, kLines = 5, kBands = 3;

TEST(MemoryRaster, ReadsAndWritesTheBlockInEveryInterleave) {
  for (const Interleave interleave : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
    std::vector<std::int32_t> memory;
    VisitBlock(interleave, {0, 0, kSamples - 1, kLines - 1}, {0, 1, 2},
               [&](unsigned s, unsigned l, unsigned b) {
                 memory.push_back(RampValue<std::int32_t>(s, l, b));
               });
    auto source = OpenSource(
        {"MemoryRaster", Describe(memory.data(), "block", kSamples, kLines, kBands,
                                  static_cast<int>(interleave), kDataTypeOf<std::int32_t>)});
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    const auto reader = ReaderOf<std::int32_t>(source);
    ASSERT_TRUE(reader && reader->CanWritePixels(0) && source->CanWrite());
    EXPECT_EQ(source->RasterDef().interleave, interleave);
    for (const std::vector<unsigned>& bands :
         {std::vector<unsigned>{0, 1, 2}, {2, 0}, {1}, {1, 1, 0, 2}}) {
      for (const SubRect& rect : {SubRect(0, 0, 6, 4), SubRect(2, 1, 6, 3), SubRect(6, 4, 6, 4)}) {
        Block<std::int32_t> block{rect, bands, {}, {}};
        ASSERT_TRUE(block.Read(*reader)) << TakeFault().ToUTF8();
        auto pixel = block.pixels.begin();
        VisitBlock(interleave, rect, bands, [&](unsigned s, unsigned l, unsigned b) {
          ASSERT_EQ(*pixel++, RampValue<std::int32_t>(s, l, b));
        });
      }
    }
    const std::vector<std::int32_t> before = memory;
    ASSERT_TRUE((Block<std::int32_t>{{3, 2, 3, 2}, {2, 0}, {-5, -6}, {0, 0}}.Write(*reader)));
    std::size_t i = 0;
    VisitBlock(interleave, {0, 0, kSamples - 1, kLines - 1}, {0, 1, 2},
               [&](unsigned s, unsigned l, unsigned b) {
                 const bool written = s == 3 && l == 2 && b != 1;
                 EXPECT_EQ(memory[i], written ? (b == 2 ? -5 : -6) : before[i]) << i;
                 ++i;
               });
    EXPECT_FALSE((Block<std::int32_t>{{3, 2, 7, 2}, {0}, {}, {}}.Read(*reader)));
  }
}

TEST(MemoryRaster, WritesOnlyTheWindowOfABlockThatNoCacheHolds) {
  constexpr unsigned kSide = 2900;
  std::vector<std::int32_t> memory(std::size_t{kSide} * kSide, 7);
  auto source = OpenSource({"MemoryRaster", Describe(memory.data(), "large", kSide, kSide, 1, 2,
                                                     kDataTypeOf<std::int32_t>)});
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  const SubRect rect(1001, 2000, 1777, 2100);
  std::vector<std::int32_t> values(std::size_t{rect.Width()} * rect.Height());
  for (std::size_t i = 0; i < values.size(); ++i) values[i] = static_cast<std::int32_t>(i) * 3 + 8;
  Block<std::int32_t> block{rect, {0}, values, std::vector<unsigned char>(values.size())};
  ASSERT_TRUE(block.Write(*ReaderOf<std::int32_t>(source)));
  auto written = values.begin();
  for (unsigned line = 0; line < kSide; ++line) {
    for (unsigned sample = 0; sample < kSide; ++sample) {
      const bool isInside =
          sample >= rect.left && sample <= rect.right && line >= rect.top && line <= rect.bottom;
      const std::int32_t want = isInside ? *written++ : 7;
      ASSERT_EQ(memory[std::size_t{line} * kSide + sample], want) << sample << ' ' << line;
    }
  }
}

TEST(MemoryRaster, ServesAllPixelTypes) {
  alignas(16) unsigned char memory[16] = {1, 2, 3, 4};
  for (const unsigned type : {1U, 99U, 12U, 2U, 13U, 3U, 4U, 5U, 15U, 14U, 6U, 9U}) {
    auto source =
        OpenSource({"MemoryRaster", Describe(memory, "", 1, 1, 1, -1, static_cast<int>(type))});
    ASSERT_TRUE(source) << type << TakeFault().ToUTF8();
    EXPECT_EQ(source->DataType(), static_cast<std::int32_t>(type));
    EXPECT_EQ(source->RasterReaderDispatch()->DataType(), type);
  }
}

TEST(MemoryRaster, TheTextTellsNameAndPlace) {
  unsigned char memory[kSamples * kLines] = {};
  auto source =
      OpenSource({"MemoryRaster", Describe(memory, "a;b];SAMPLES=1;LINES=x", kSamples, kLines, 1, 2,
                                           1, 28.5, 30, 288776.25, -9120760.125, "EPSG:31985")});
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  char address[32];
  std::snprintf(address, sizeof address, "%p", static_cast<void*>(memory));
  EXPECT_EQ(source->URI().ToUTF8(),
            std::string("MemoryRaster a;b%5D;SAMPLES=1;LINES=x ") + address);
  const RasterDef def = source->RasterDef();
  EXPECT_EQ(def.format, String("MemoryRaster"));
  EXPECT_EQ(def.samples, kSamples);
  EXPECT_EQ(def.lines, kLines);
  EXPECT_EQ(def.bands, 1U);
  ASSERT_TRUE(def.geoRef);
  double x = 0, y = 0;
  ASSERT_TRUE(def.geoRef->PixelToMap(1, 2, x, y));
  EXPECT_EQ(x, 288776.25 + 28.5);
  EXPECT_EQ(y, -9120760.125 - 60);
  EXPECT_EQ(def.geoRef->CoordinateSystem().Type(), 2);

  source = OpenSource({"MemoryRaster", Describe(memory, "plain", kSamples, kLines, 1, 2, 1)});
  ASSERT_TRUE(source);
  EXPECT_FALSE(source->RasterDef().geoRef);
}

TEST(MemoryRaster, APaletteLastsWithTheConnection) {
  unsigned char memory[1] = {};
  auto source = OpenSource({"MemoryRaster", Describe(memory, "p", 1, 1, 1, 0, 1)});
  const auto reader = ReaderOf<std::uint8_t>(source);
  ASSERT_TRUE(reader);
  Palette palette;
  palette.Append(Color("red", 255, 0, 0));
  EXPECT_FALSE(reader->HasPalette(0) || reader->WritePalette(1, palette));
  ASSERT_TRUE(reader->WritePalette(0, palette) && reader->HasPalette(0));
  EXPECT_EQ(reader->Palette(0).At(0)->r, 255);
  EXPECT_TRUE(reader->DeletePalette(0));
  EXPECT_FALSE(reader->HasPalette(0));
}

TEST(MemoryRaster, AWriteEndsStatisticsOfTheRasterAndItsViews) {
  const RasterPtr<std::uint8_t> raster(
      new AutoMemoryRaster<std::uint8_t>("block", 8, 4, 2, Interleave::BSQ, {}));
  ASSERT_TRUE(raster->IsValid()) << TakeFault().ToUTF8();
  const RasterPtr<std::uint8_t> view(
      new SpectralSubsetRaster<std::uint8_t>(raster, MakeArray<unsigned>({1, 0})));
  for (const std::uint8_t value : {5, 77}) {
    Array<std::uint8_t> pixels{BlockDims(Interleave::BIP, 8, 4, 2)};
    Array<unsigned char> states{pixels.GetDims()};
    std::fill(pixels.begin(), pixels.end(), value);
    std::fill(states.begin(), states.end(), static_cast<unsigned char>(0));
    ASSERT_TRUE(raster->PutSubRect({0, 0, 7, 3}, MakeArray<unsigned>({0, 1}), Interleave::BIP,
                                   pixels, states));
    EXPECT_FALSE(raster->StatsExist(0, StatsMask::Mean));
    EXPECT_EQ(view->BandHistogram(1).GetCount(), 0U);
    EXPECT_EQ(raster->Mean(0, IPC()), value);
    EXPECT_EQ(view->Max(1, IPC()), value);
    view->HistogramAllBands(0, 255, 256, HistogramSign::kBoth, IPC())->WaitFinished();
    ASSERT_EQ(raster->BandHistogram(0).GetCount(), 1U);
    EXPECT_EQ(raster->BandHistogram(0)[0].counts[value], 32U);
  }
}

TEST(MemoryRaster, TextsOfAnotherFormAreRefused) {
  alignas(8) unsigned char memory[64] = {};
  const std::string good = Describe(memory, "n", 2, 2, 2, 0, 2, 1, 1, 0, 0, "x");
  ASSERT_TRUE(OpenSource({"MemoryRaster", good})) << TakeFault().ToUTF8();
  constexpr const char* kForm = "MemoryRaster: the connection text doesn't describe a block";
  const struct {
    const char *from, *to, *fault;
  } cases[] = {
      {"PIXELDATA=", "pixeldata=", kForm},
      {"PIXELDATA=", "PIXELDATA=(nil);", kForm},
      {"PIXELDATA=0x", "PIXELDATA=0xg", kForm},
      {"PIXELDATA=0x", "PIXELDATA=0x1000000000000", kForm},
      {"PIXELDATA=0x", "PIXELDATA=-0x", kForm},
      {";NAME=", ";", kForm},
      {"SAMPLES=2", "SAMPLES=", kForm},
      {"SAMPLES=2", "SAMPLES=4294967296", kForm},
      {"SAMPLES=2", "SAMPLES=-2", kForm},
      {"SAMPLES=2", "SAMPLES=2 ", kForm},
      {"SAMPLES=2", "SAMPLES=0", "MemoryRaster: no pixels"},
      {"LINES=2", "LINES=0", "MemoryRaster: no pixels"},
      {"BANDS=2", "BANDS=65536", kForm},
      {"BANDS=2", "BANDS=0", "MemoryRaster: no pixels"},
      {"INTERLEAVE=0", "INTERLEAVE=3", "MemoryRaster: no such interleave"},
      {"INTERLEAVE=0", "INTERLEAVE=-1", "MemoryRaster: no such interleave"},
      {"PIXELTYPE=2", "PIXELTYPE=98", "MemoryRaster: no such pixel type"},
      {"PIXELTYPE=2", "PIXELTYPE=", kForm},
      {"PIXELSIZE=1.000000000,", "PIXELSIZE=", kForm},
      {"PIXELSIZE=1.000000000", "PIXELSIZE=nan", kForm},
      {"TIEPTMAP=", "TIEPTMAP=inf,0;", kForm},
      {";COORDSYS=", ";", kForm},
  };
  for (const auto& c : cases) {
    std::string text = good;
    const std::size_t at = text.find(c.from);
    ASSERT_NE(at, std::string::npos) << c.from;
    text.replace(at, std::strlen(c.from), c.to);
    EXPECT_FALSE(OpenSource({"MemoryRaster", text})) << text;
    EXPECT_EQ(TakeFault().ToUTF8(), c.fault) << text;
  }
  EXPECT_FALSE(OpenSource({"MemoryRaster"}));
  EXPECT_FALSE(OpenSource({"MemoryRaster", good, good}));
  EXPECT_FALSE(OpenSource({"MemoryRaster", Describe(memory + 1, "odd", 2, 2, 2, 0, 2)}));
  EXPECT_FALSE(OpenSource(
      {"MemoryRaster", Describe(memory, "huge", 4294967295UL, 4294967295UL, 65535, 0, 9)}));
  EXPECT_FALSE(OpenSource({"MemoryRaster", "PIXELDATA=" + good}));
  for (std::size_t size = 0; size < good.find("COORDSYS=") + 9; ++size) {
    EXPECT_FALSE(OpenSource({"MemoryRaster", good.substr(0, size)})) << size;
  }
}

TEST(MemoryRaster, IsNotTakenForAnotherFormatNorMade) {
  unsigned char memory[1] = {};
  DataConnectionFactory* const factory = FactoryForFormat("MemoryRaster");
  ASSERT_NE(factory, nullptr) << TakeFault().ToUTF8();
  const std::string text = Describe(memory, "n", 1, 1, 1, 0, 1);
  EXPECT_TRUE(factory->CanConnect(Strings({"MemoryRaster", text})));
  EXPECT_FALSE(factory->CanConnect(Strings({text})));
  RasterDef def;
  def.format = "MemoryRaster";
  EXPECT_FALSE(CreateSource({text}, def));
  EXPECT_EQ(TakeFault().ToUTF8(), "MemoryRaster: a block of memory is opened, not made");
}

/// The raster that a command made, as one of Byte.
RasterPtr<std::uint8_t> MadeBytes(const CommandOutcome& made) {
  return RasterPtr<std::uint8_t>(catalog::Find(ParseValue<URI>(String(made.outputs.at("URI")))));
}

TEST(MemoryRaster, TheCommandGivesNoDataValuesAndZeroes) {
  constexpr unsigned kSide = 64, kMemoryBands = 3;
  {
    std::vector<unsigned char> dirty(std::size_t{kSide} * kSide * kMemoryBands, 0xAB);
    EXPECT_EQ(dirty[1], 0xAB);  // memory that the raster may get next
  }
  const std::map<std::string, std::string> size{
      {"Samples", "64"}, {"Lines", "64"}, {"Bands", "3"}, {"DataType", "Byte"}};
  auto inputs = size;
  inputs["HasNoDataValue"] = "1:3 [1 0 1] ";
  inputs["NoDataValue"] = "1:1 [7] ";
  const CommandOutcome made = RunCommand("CreateMemoryRasterCommand", inputs);
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  // A template's values go on; one that a Byte can't hold equals no pixel.
  const CommandOutcome like =
      RunCommand("CreateMemoryRasterCommand",
                 {{"SrcURI", made.outputs.at("URI")}, {"NoDataValue", "1:2 [7 -9999] "}});
  ASSERT_TRUE(like.Succeeded()) << like.reason;
  const struct {
    const CommandOutcome& outcome;
    std::vector<int> noData;  // by band; -1 for none
  } cases[] = {{made, {7, -1, 0}}, {like, {7, -1, 0}}};
  for (const auto& c : cases) {
    const RasterPtr<std::uint8_t> raster = MadeBytes(c.outcome);
    ASSERT_TRUE(raster);
    Array<unsigned> bands{ArrayDims(kMemoryBands)};
    for (unsigned band = 0; band < kMemoryBands; ++band) bands[band] = band;
    Array<std::uint8_t> pixels;
    Array<unsigned char> state;
    const SubRect all(0, 0, kSide - 1, kSide - 1);
    ASSERT_TRUE(raster->GetSubRect(all, bands, Interleave::BSQ, pixels, state));
    for (const std::uint8_t pixel : pixels) ASSERT_EQ(pixel, 0);
    pixels[0] = 7;                    // band 0
    pixels[kSide * kSide + 1] = 241;  // band 1: -9999 in eight bits
    ASSERT_TRUE(raster->PutSubRect(all, bands, Interleave::BSQ, pixels, state));
    ASSERT_TRUE(raster->GetSubRect(all, bands, Interleave::BSQ, pixels, state));
    for (unsigned i = 0; i < pixels.GetCount(); ++i) {
      const int noData = c.noData[i / (kSide * kSide)];
      ASSERT_EQ(state[i], pixels[i] == noData ? PixelValueState::NoData : PixelValueState::Valid);
    }
    for (unsigned band = 0; band < kMemoryBands; ++band) {
      EXPECT_EQ(raster->HasNoDataValue(band), c.noData[band] >= 0) << band;
    }
  }
  for (const CommandOutcome* outcome : {&like, &made}) {
    RunCommand("CloseRasterCommand", {{"URI", outcome->outputs.at("URI")}});
  }
}

TEST(MemoryRaster, NumbersBecomePixelsOnlyWhereTheyFit) {
  EXPECT_EQ(ToPixel<std::uint8_t>(-9999.0), std::nullopt);
  EXPECT_EQ(ToPixel<std::uint8_t>(255.5), std::nullopt);
  EXPECT_EQ(ToPixel<std::int16_t>(-32768.0), std::int16_t{-32768});
  EXPECT_EQ(ToPixel<std::int64_t>(std::string("-9223372036854775807")), -9223372036854775807);
  EXPECT_EQ(ToPixel<std::int64_t>(9223372036854775808.0), std::nullopt);
  EXPECT_EQ(ToPixel<std::uint64_t>(std::string("18446744073709551615")), 18446744073709551615U);
  EXPECT_EQ(ToPixel<float>(1e300), std::nullopt);
  EXPECT_TRUE(std::isnan(*ToPixel<float>(std::string("nan"))));
  EXPECT_EQ(ToPixel<std::int32_t>(std::string("seven")), std::nullopt);
}

}  // namespace
}  // namespace lumo::test
