#include <filesystem>
#include <fstream>
#include <unistd.h>

#include "foundation/warnings.h"
#include "gdal_peer.h"
#include "raster/raster_details.h"
#include "support/file_size_limit.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::Block;
using test::CreateSource;
using test::OpenSource;
using test::ReaderOf;
using test::Release;

std::string Contents(const fs::path& path) {
  std::ifstream in(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void PutContents(const fs::path& path, const std::string& bytes) {
  std::ofstream(path, std::ios::binary) << bytes;
}

std::vector<std::string> NamesIn(const fs::path& directory) {
  std::vector<std::string> names;
  for (const auto& entry : fs::directory_iterator(directory)) {
    names.push_back(entry.path().filename().string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

/// True when the whole raster can be read.
bool ReadsWhole(const RasterDataConnectionPtr& source) {
  bool isRead = false;
  test::WithType(source, [&]<typename T>(RasterReader<T>& reader) {
    const RasterDef def = reader.RasterDef();
    Block<T> block{{0, 0, def.samples - 1, def.lines - 1}, {}, {}, {}};
    for (unsigned band = 0; band < def.bands; ++band) block.bands.push_back(band);
    isRead = block.Read(reader);
  });
  return isRead;
}

RasterDef BytesDef(const char* format) {
  RasterDef def;
  def.format = format;
  def.samples = 300;
  def.lines = 200;
  def.bands = 1;
  def.dataType = kDataTypeOf<std::uint8_t>;
  return def;
}

Block<std::uint8_t> NoiseFor(const RasterDef& def) {
  Block<std::uint8_t> block{{0, 0, def.samples - 1, def.lines - 1}, {}, {}, {}};
  for (unsigned band = 0; band < def.bands; ++band) block.bands.push_back(band);
  block.pixels.resize(std::size_t{def.samples} * def.lines * def.bands);
  unsigned seed = 1;
  for (auto& pixel : block.pixels) {
    seed = seed * 1664525 + 1013904223;
    pixel = static_cast<std::uint8_t>(seed >> 24);
  }
  block.state.resize(block.pixels.size());
  return block;
}

TEST(GdalFaults, ATruncatedFileFailsWithWordsAndSilently) {
  test::TemporaryDirectory directory;
  for (const char* const name :
       {"landsat7_olinda.tif", "landsat7_u16_tiled.tif", "landsat7_f32_strip.tif", "dem_olinda.tif",
        "landsat7.img", "landsat7_rgb.png", "complex64.tif"}) {
    const std::string whole = Contents(test::SampleData(name));
    for (const double part : {0.0005, 0.3, 0.6}) {
      SCOPED_TRACE(name + std::string(" ") + std::to_string(part));
      const std::string path = (directory.Path() / name).string();
      PutContents(path, whole.substr(
                            0, static_cast<std::size_t>(part * static_cast<double>(whole.size()))));
      TakeFault();
      testing::internal::CaptureStderr();
      const auto source = OpenSource({path});
      const bool isRead = source && ReadsWhole(source);
      EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
      EXPECT_FALSE(isRead);
      const std::string fault = TakeFault().ToUTF8();
      EXPECT_TRUE(fault.starts_with(path + ": ") && fault.size() > path.size() + 6) << fault;
      EXPECT_EQ(fault.find('\n'), fault.npos);
    }
  }
}

/// Blocks that GDAL decodes on threads of its own.
TEST(GdalFaults, ATruncatedTileTellsItsReasonToo) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "tiles.tif").string();
  GDALAllRegister();
  const char* const options[] = {"TILED=YES", "COMPRESS=DEFLATE", nullptr};
  GDALDatasetH const file = GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 1024, 1024, 1,
                                       GDT_UInt32, const_cast<char**>(options));
  std::vector<unsigned> pixels(1024 * 1024);
  for (std::size_t i = 0; i < pixels.size(); ++i) pixels[i] = static_cast<unsigned>(i * i);
  ASSERT_EQ(GDALRasterIO(GDALGetRasterBand(file, 1), GF_Write, 0, 0, 1024, 1024, pixels.data(),
                         1024, 1024, GDT_UInt32, 0, 0),
            CE_None);
  GDALClose(file);
  std::string bytes = Contents(path);
  std::fill(bytes.begin() + static_cast<std::ptrdiff_t>(bytes.size() / 2),
            bytes.begin() + static_cast<std::ptrdiff_t>(bytes.size() / 2 + 5000), '\x55');
  PutContents(path, bytes);
  testing::internal::CaptureStderr();
  const auto source = OpenSource({"TIFF", path});
  ASSERT_TRUE(source);
  EXPECT_FALSE(ReadsWhole(source));
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
  const std::string fault = TakeFault().ToUTF8();
  EXPECT_TRUE(fault.starts_with(path + ": ") && fault.find("IReadBlock") != fault.npos) << fault;
  Block<std::uint32_t> intact{{0, 0, 255, 255}, {0}, {}, {}};
  EXPECT_TRUE(intact.Read(*ReaderOf<std::uint32_t>(source)));
  EXPECT_EQ(intact.pixels[300], pixels[1024 + 44]);
}

TEST(GdalFaults, WhatIsNoRasterIsRefusedWithWords) {
  test::TemporaryDirectory directory;
  const auto path = [&](const char* name) { return (directory.Path() / name).string(); };
  PutContents(path("empty.tif"), "");
  PutContents(path("text.tif"), "no raster at all\n");
  PutContents(path("locked.tif"), Contents(test::SampleData("rotated.tif")));
  fs::permissions(path("locked.tif"), fs::perms::none);
  const std::string names[] = {path("empty.tif"), path("text.tif"), path("missing.tif"),
                               directory.Path().string(), path("locked.tif")};
  for (const std::string& name : names) {
    if (name == path("locked.tif") && geteuid() == 0) continue;  // who may do everything
    for (const bool hasKey : {false, true}) {
      SCOPED_TRACE(name);
      TakeFault();
      testing::internal::CaptureStderr();
      EXPECT_FALSE(hasKey ? OpenSource({"TIFF", name}) : OpenSource({name}));
      EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
      const std::string fault = TakeFault().ToUTF8();
      EXPECT_TRUE(fault.find(name) != fault.npos && fault.size() > name.size() + 4) << fault;
    }
  }
}

TEST(GdalFaults, AHeaderThatPromisesTooMuchCostsNoMemory) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "huge.tif").string();
  GDALAllRegister();
  for (const char* const compression : {"COMPRESS=NONE", "COMPRESS=LZW"}) {
    const char* const options[] = {"TILED=YES", compression, "SPARSE_OK=YES", "BIGTIFF=YES",
                                   nullptr};
    GDALClose(GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 60000, 60000, 3, GDT_Float64,
                         const_cast<char**>(options)));
    std::string bytes = Contents(path);
    // The offsets of the tiles lead past the end of the file.
    std::fill(bytes.begin() + static_cast<std::ptrdiff_t>(bytes.size() / 8), bytes.end(), '\x70');
    PutContents(path, bytes);
    const auto source = OpenSource({"TIFF", path});
    if (!source) continue;  // refused at once is well too
    Block<double> block{{59990, 59990, 59999, 59999}, {0, 1, 2}, {}, {}};
    EXPECT_FALSE(block.Read(*ReaderOf<double>(source)));
    EXPECT_TRUE(TakeFault().ToUTF8().starts_with(path + ": "));
  }
}

TEST(GdalFaults, NamesThatAreNoFilesNeedTheFormat) {
  const std::string name = "/vsimem/vexg-test.tif";
  GDALAllRegister();
  GDALClose(GDALCreate(GDALGetDriverByName("GTiff"), name.c_str(), 20, 10, 1, GDT_Byte, nullptr));
  EXPECT_FALSE(OpenSource({name}));
  EXPECT_FALSE(OpenSource({"GTIFF_DIR:1:" + test::SampleData("RGB.byte.tif")}));
  const auto source = OpenSource({"TIFF", name});
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  EXPECT_EQ(source->RasterDef().samples, 20U);
  EXPECT_FALSE(CreateSource({name}, BytesDef("TIFF")));
}

TEST(GdalFaults, ReadingChangesNothing) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  test::TemporaryDirectory directory;
  for (const char* const name : {"landsat7_olinda.tif", "landsat7.img", "landsat7_rgb.png"}) {
    SCOPED_TRACE(name);
    const std::string path = (directory.Path() / name).string();
    const std::string bytes = Contents(test::SampleData(name));
    PutContents(path, bytes);
    const auto time = fs::last_write_time(path);
    {
      const auto source = OpenSource({path});
      ASSERT_TRUE(ReadsWhole(source));
      const auto reader = ReaderOf<std::uint8_t>(source);
      reader->StatsExist(0);
      reader->Histogram(0);
      reader->HasPalette(0);
      source->CanWrite();
    }
    EXPECT_EQ(Contents(path), bytes);
    EXPECT_EQ(fs::last_write_time(path), time);
  }
  EXPECT_EQ(NamesIn(directory.Path()).size(), 3U);
}

/// When the disk is full the older file stays, and nothing lies beside it.
TEST(GdalFaults, AFullDiskLeavesTheOlderFile) {
  test::TemporaryDirectory directory;
  const struct {
    const char* format;
    const char* name;
  } cases[] = {{"TIFF", "a.tif"}, {"Erdas", "a.img"}, {"PNG", "a.png"},      {"NITF", "a.ntf"},
               {"BMP", "a.bmp"},  {"GIF", "a.gif"},   {"JPEG2000", "a.jp2"}, {"JPEG", "a.jpg"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.format);
    const std::string path = (directory.Path() / c.name).string();
    PutContents(path, "older");
    const RasterDef def = BytesDef(c.format);
    std::string fault;
    testing::internal::CaptureStderr();
    {
      const test::FileSizeLimit limit(20000);
      auto made = CreateSource({path}, def);
      if (made && !NoiseFor(def).Write(*ReaderOf<std::uint8_t>(made))) fault = TakeFault().ToUTF8();
      fault += made ? Release(made) : TakeFault().ToUTF8();
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
    EXPECT_TRUE(fault.find(path + ": ") != fault.npos) << fault;
    EXPECT_EQ(Contents(path), "older");
    EXPECT_EQ(NamesIn(directory.Path()), std::vector<std::string>{c.name});
    fs::remove(path);
  }
}

TEST(GdalFaults, ANewFileTakesThePlaceOfTheOlderOneWithAllThatBelongsToIt) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "a.tif").string();
  PutContents(path, "older");
  PutContents(path + ".aux.xml", "<PAMDataset/>");
  PutContents(path + ".ovr", "older");
  PutContents(path + ".hdr", "ORVA\nend = ORVA\n");  // would tell of the new file
  PutContents(directory.Path() / "a.txt", "somebody else's");
  const RasterDef def = BytesDef("TIFF");
  auto made = CreateSource({path}, def);
  ASSERT_TRUE(made);
  EXPECT_EQ(Contents(path), "older");
  ASSERT_TRUE(NoiseFor(def).Write(*ReaderOf<std::uint8_t>(made)));
  ASSERT_EQ(Release(made), "");
  EXPECT_EQ(NamesIn(directory.Path()), (std::vector<std::string>{"a.tif", "a.txt"}));
  EXPECT_TRUE(ReadsWhole(OpenSource({path})));
}

/// A raster of several TIFF blocks in one of the forms that files have, some of whose pixels are
/// excluded by a mask.
RasterDef MaskedDef(BlockCompression compression, FileLayout layout) {
  RasterDef def = BytesDef("TIFF");
  def.samples = def.lines = 130;
  def.bands = 3;
  def.interleave = Interleave::BIP;
  def.tileWidth = def.tileHeight = 16;
  def.creation.compression = compression;
  def.creation.layout = layout;
  def.creation.tile = 16;
  return def;
}

/// A raster with long texts, so that the directory takes several writes.
RasterDef WordyDef() {
  RasterDef def = BytesDef("TIFF");
  def.samples = def.lines = 20;
  def.bands = 60;
  for (unsigned band = 0; band < def.bands; ++band) {
    def.metadata.Set(BandDetailPath(band, "Description"), String(std::string(30, 'x')));
  }
  return def;
}

/// Wherever the disk is full while a TIFF file's directories, its blocks, its levels, its mask or
/// the file beside it are written, the run comes to its end, with the whole file or with the older
/// one.
TEST(GdalFaults, ATiffFileIsGivenUpAfterItsFirstFailedWrite) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "a.tif").string();
  const RasterDef defs[] = {WordyDef(), MaskedDef(BlockCompression::kNone, FileLayout::kTold),
                            MaskedDef(BlockCompression::kZstd, FileLayout::kTold),
                            MaskedDef(BlockCompression::kDeflate, FileLayout::kCog)};
  for (const RasterDef& def : defs) {
    SCOPED_TRACE(testing::Message() << "form " << &def - defs);
    PutContents(path, "older");
    Block<std::uint8_t> block = NoiseFor(def);
    if (&def != defs) {
      for (std::size_t i = 0; i < block.state.size(); i += 3 * 7) {
        std::fill_n(&block.state[i], 3, static_cast<unsigned char>(PixelValueState::Masked));
      }
    }
    unsigned failed = 0;
    for (rlim_t bytes = 0;; bytes += 700) {
      SCOPED_TRACE(bytes);
      std::string fault;
      bool isMade = false;
      {
        const test::FileSizeLimit limit(bytes);
        TakeFault();
        auto made = CreateSource({path}, def);
        isMade = made && block.Write(*ReaderOf<std::uint8_t>(made));
        fault = TakeFault().ToUTF8();
        const std::string late = made ? Release(made) : "";
        isMade = isMade && late.empty();
        if (fault.empty()) fault = late;
      }
      if (isMade) break;
      ++failed;
      EXPECT_EQ(fault, path + ": File too large");
      ASSERT_EQ(Contents(path), "older");
      ASSERT_EQ(NamesIn(directory.Path()), std::vector<std::string>{"a.tif"});
      ASSERT_LT(bytes, 1U << 20);
    }
    EXPECT_GT(failed, 10U);
    EXPECT_TRUE(ReadsWhole(OpenSource({path})));
  }
}

/// Two that make a file at one place at once: the first to be whole stays, the other says so.
TEST(GdalFaults, OfTwoMakersOneWinsAndTheOtherSaysSo) {
  for (const char* const format : {"TIFF", "Erdas", "PNG"}) {
    for (const bool hasOlder : {false, true}) {
      SCOPED_TRACE(std::string(format) + (hasOlder ? " over an older one" : ""));
      test::TemporaryDirectory directory;
      const std::string path = (directory.Path() / "a").string();
      if (hasOlder) PutContents(path, "older");
      RasterDef large = BytesDef(format), small = large;
      small.lines = 7;
      auto first = CreateSource({path}, large), second = CreateSource({path}, small);
      ASSERT_TRUE(first && second) << TakeFault().ToUTF8();
      EXPECT_EQ(Release(second), "");
      EXPECT_EQ(Release(first), path + ": was made by another program meanwhile");
      EXPECT_EQ(NamesIn(directory.Path()), std::vector<std::string>{"a"});
      EXPECT_EQ(OpenSource({format, path})->RasterDef().lines, 7U);
    }
  }
}

/// A file beside a raster that is damaged is left out with a warning; the raster can be read.
TEST(GdalFaults, ADamagedFileBesideARasterIsAWarning) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const struct {
    const char* suffix;
    const char* what;
  } cases[] = {{".aux.xml", "isn't whole"},
               {".ovr", "holds no levels that can be read"},
               {".msk", "holds no mask that can be read"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.suffix);
    test::TemporaryDirectory directory;
    const std::string path = (directory.Path() / "a.tif").string();
    fs::copy_file(test::SampleData("landsat7_u16_tiled.tif"), path);
    TakeWarnings();
    ASSERT_TRUE(OpenSource({path}));
    EXPECT_TRUE(TakeWarnings().empty());
    const std::string damaged = "<PAMDataset><Metadata>cut off";
    PutContents(path + c.suffix, damaged);
    const auto source = OpenSource({path});
    ASSERT_TRUE(ReadsWhole(source));
    EXPECT_EQ(TakeWarnings(),
              (std::vector<std::string>{path + c.suffix + ": " + c.what + "; it is left out"}));
  }
}

TEST(GdalFaults, ATargetThatCannotBeIsRefusedAtOnce) {
  test::TemporaryDirectory directory;
  const std::string names[] = {directory.Path().string(), "/dev/full",
                               (directory.Path() / "missing" / "a.tif").string()};
  for (const std::string& name : names) {
    for (const char* const format : {"TIFF", "PNG"}) {
      SCOPED_TRACE(name);
      TakeFault();
      EXPECT_FALSE(CreateSource({name}, BytesDef(format)));
      EXPECT_TRUE(TakeFault().ToUTF8().starts_with(name + ": "));
    }
  }
  EXPECT_TRUE(NamesIn(directory.Path()).empty());
}

}  // namespace
}  // namespace lumo
