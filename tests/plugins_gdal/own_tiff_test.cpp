#include <cmath>
#include <cpl_string.h>
#include <filesystem>
#include <fstream>
#include <gdal.h>
#include <ogr_srs_api.h>
#include <random>
#include <regex>
#include <thread>
#include <typeinfo>

#include "foundation/plugin_library.h"
#include "raster/raster_details.h"
#include "raster/raster_storage.h"
#include "support/raster_sources.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"

// TIFF files that the library reads itself have to be what GDAL makes of them: each is opened both
// ways, and all that the two connections say and give is compared.

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::Strings;

DataConnectionFactory& GdalFactory() {
  static DataConnectionFactory& factory = []() -> DataConnectionFactory& {
    std::string fault;
    const platform::Module module = LoadPlugin(platform::ModuleFileName("vexgdalcore"), fault);
    auto* const create =
        module.Find<CreateDataConnectionFactoryFunction>("CreateDataConnectionFactory");
    return *create(FindFormat("TIFF"));
  }();
  return factory;
}

RasterDataConnectionPtr OpenBy(DataConnectionFactory& factory, const std::string& path) {
  return RasterDataConnectionPtr(
      factory.Connect(Strings({"TIFF", path}), GeoRefPtr(), MetadataPtr()));
}

bool IsOwn(RasterDataConnection& connection) {
  return std::string(typeid(connection).name()).find("tiff") != std::string::npos;
}

/// The text of a system without what GDAL and PROJ say in one way or the other, by what their
/// process has asked for before: an ensemble of datums as such or as one datum, and with it the
/// name of a conversion.
std::string Settled(std::string wkt) {
  wkt = std::regex_replace(
      wkt, std::regex("ENSEMBLE\\[\"([^\"]*) ensemble\",(MEMBER\\[\"[^\"]*\"\\],)*"),
      "DATUM[\"$1\",");
  wkt = std::regex_replace(wkt, std::regex(",ENSEMBLEACCURACY\\[[^\\]]*\\]"), "");
  return std::regex_replace(wkt, std::regex("CONVERSION\\[\"[^\"]*\""), "CONVERSION[\"\"");
}

std::string TextOf(const GeoRefPtr& model) {
  if (!model) return "none";
  String system;
  model->CoordinateSystem().ToString(system);
  double x = 0, y = 0;
  model->PixelToMap(17.5, 3.25, x, y);
  return std::to_string(model->GetType()) + " " + FormatValue(model->PixelSizeX()).ToUTF8() + " " +
         FormatValue(model->PixelSizeY()).ToUTF8() + " " + FormatValue(model->Rotation()).ToUTF8() +
         " " + FormatValue(x).ToUTF8() + " " + FormatValue(y).ToUTF8() + " " +
         Settled(system.ToUTF8());
}

void ExpectSameMetadata(const Metadata& ours, const Metadata& theirs) {
  const auto own = FindStorage(ours), storage = FindStorage(theirs);
  ASSERT_TRUE(own && storage);
  EXPECT_EQ(own->blockWidth, storage->blockWidth);
  EXPECT_EQ(own->compression, storage->compression);
  // GDAL shows a large strip that isn't packed as several.
  EXPECT_TRUE(own->blockHeight == storage->blockHeight ||
              (own->compression == "none" && own->blockHeight > storage->blockHeight));
  Metadata rest[] = {ours, theirs};
  for (Metadata& metadata : rest) DropStorage(metadata);
  EXPECT_EQ(rest[0].Describe().ToUTF8(), rest[1].Describe().ToUTF8());
}

void ExpectSameDefinition(const RasterDef& ours, const RasterDef& theirs) {
  EXPECT_EQ(ours.samples, theirs.samples);
  EXPECT_EQ(ours.lines, theirs.lines);
  EXPECT_EQ(ours.bands, theirs.bands);
  EXPECT_EQ(ours.dataType, theirs.dataType);
  EXPECT_EQ(ours.interleave, theirs.interleave);
  EXPECT_EQ(ours.tileWidth, theirs.tileWidth);
  EXPECT_EQ(ours.tileHeight, theirs.tileHeight);
  EXPECT_EQ(ours.format, theirs.format);
  ExpectSameMetadata(ours.metadata, theirs.metadata);
  EXPECT_EQ(DetailNames(ours.metadata), DetailNames(theirs.metadata));
  for (const std::string& name : DetailNames(theirs.metadata)) {
    EXPECT_EQ(FindDetail(ours.metadata, DetailPath(name)),
              FindDetail(theirs.metadata, DetailPath(name)))
        << name;
  }
  EXPECT_EQ(TextOf(ours.geoRef), TextOf(theirs.geoRef));
  ASSERT_EQ(ours.noData.size(), theirs.noData.size());
  for (const auto& [band, value] : theirs.noData) {
    const double own = ours.noData.at(band);
    EXPECT_TRUE(own == value || (std::isnan(own) && std::isnan(value))) << own << " " << value;
  }
}

template <typename T>
void ExpectSamePixels(RasterReader<T>& ours, RasterReader<T>& theirs, unsigned level,
                      std::mt19937& random) {
  const unsigned samples = theirs.Samples(level), lines = theirs.Lines(level);
  ASSERT_EQ(ours.Samples(level), samples);
  ASSERT_EQ(ours.Lines(level), lines);
  for (int i = 0; i < 8; ++i) {
    const bool isWhole = i == 0;
    const unsigned left = isWhole ? 0 : random() % samples, top = isWhole ? 0 : random() % lines;
    const unsigned width = isWhole ? samples : 1 + random() % (samples - left);
    const unsigned height = isWhole ? lines : 1 + random() % (lines - top);
    std::vector<unsigned> chosen;
    for (unsigned band = 0; band < theirs.Bands(); ++band) chosen.push_back(band);
    if (i % 3 == 2) std::reverse(chosen.begin(), chosen.end());
    if (i % 3 == 1) chosen.resize(1 + random() % chosen.size());
    Array<unsigned> bands{ArrayDims(static_cast<unsigned>(chosen.size()))};
    std::copy(chosen.begin(), chosen.end(), bands.begin());
    const std::size_t count = std::size_t{width} * height * chosen.size();
    std::vector<T> own(count), other(count);
    std::vector<unsigned char> ownState(count), otherState(count);
    ASSERT_TRUE(
        ours.ReadPixels(left, top, width, height, bands, level, own.data(), ownState.data()))
        << TakeFault().ToUTF8();
    ASSERT_TRUE(
        theirs.ReadPixels(left, top, width, height, bands, level, other.data(), otherState.data()))
        << TakeFault().ToUTF8();
    EXPECT_EQ(0, std::memcmp(own.data(), other.data(), count * sizeof(T)))
        << left << " " << top << " " << width << " " << height;
    EXPECT_EQ(ownState, otherState);
  }
}

/// Compares statistics by all that they hold, by their texts and beyond.
template <typename T>
void ExpectSameStats(const RasterBandStats<T>& ours, const RasterBandStats<T>& theirs) {
  std::ostringstream own, other;
  own << ours, other << theirs;
  EXPECT_EQ(own.str(), other.str());
  EXPECT_EQ(ours.mask, theirs.mask);
  EXPECT_EQ(ours.band, theirs.band);
  EXPECT_EQ(ours.pixelCount, theirs.pixelCount);
}

/// Compares a file both ways. @return whether the library reads it itself.
bool ExpectSame(const std::string& path) {
  SCOPED_TRACE(path);
  const RasterDataConnectionPtr ours = OpenBy(*FactoryForFormat("TIFF"), path);
  const RasterDataConnectionPtr theirs = OpenBy(GdalFactory(), path);
  EXPECT_EQ(bool(ours), bool(theirs));
  if (!ours || !theirs) return false;
  const bool isOwn = IsOwn(*ours);
  EXPECT_EQ(ours->DataType(), theirs->DataType());
  EXPECT_EQ(ours->URI(), theirs->URI());
  EXPECT_EQ(ours->CanWrite(), theirs->CanWrite());
  ExpectSameDefinition(ours->RasterDef(), theirs->RasterDef());
  std::mt19937 random(5);
  DispatchType(TwelveTypes{}, static_cast<unsigned>(theirs->DataType()), [&]<typename T>() {
    const RasterReaderPtr<T> own = test::ReaderOf<T>(ours), other = test::ReaderOf<T>(theirs);
    EXPECT_EQ(own->PyramidExists(), other->PyramidExists());
    EXPECT_EQ(own->PyramidLevelMin(), other->PyramidLevelMin());
    EXPECT_EQ(own->PyramidLevelMax(), other->PyramidLevelMax());
    EXPECT_EQ(own->StatsMask(), other->StatsMask());
    EXPECT_EQ(own->CanWritePixels(0), other->CanWritePixels(0));
    for (unsigned band = 0; band < other->Bands(); ++band) {
      EXPECT_EQ(own->HasNoDataValue(band), other->HasNoDataValue(band));
      EXPECT_EQ(own->HasPalette(band), other->HasPalette(band));
      EXPECT_EQ(own->StatsExist(band), other->StatsExist(band));
      if constexpr (std::is_arithmetic_v<T>) {
        ExpectSameStats(own->ReadStats(band), other->ReadStats(band));
        const auto mine = own->Histogram(band), his = other->Histogram(band);
        EXPECT_TRUE(std::equal(mine.begin(), mine.end(), his.begin(), his.end()));
      }
    }
    for (int level = 0; level <= other->PyramidLevelMax(); ++level) {
      if (level == 0 || level >= other->PyramidLevelMin()) {
        ExpectSamePixels(*own, *other, static_cast<unsigned>(level), random);
      }
    }
    return true;
  });
  return isOwn;
}

struct Layout {
  GDALDataType type;
  std::vector<std::string> options;
  unsigned bands = 3;
  int epsg = 32633;
  const char* noData = nullptr;
  bool hasLevels = false;
};

void Make(const std::string& path, const Layout& layout, int seed) {
  GDALAllRegister();
  constexpr int kWidth = 203, kHeight = 149;
  CPLStringList options;
  for (const std::string& option : layout.options) options.AddString(option.c_str());
  GDALDatasetH const file = GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), kWidth, kHeight,
                                       static_cast<int>(layout.bands), layout.type, options.List());
  ASSERT_NE(file, nullptr);
  if (layout.epsg != 0) {
    OGRSpatialReferenceH const system = OSRNewSpatialReference(nullptr);
    ASSERT_EQ(OSRImportFromEPSG(system, layout.epsg), OGRERR_NONE);
    GDALSetSpatialRef(file, system);
    OSRRelease(system);
    double grid[] = {500000.5, 30, 0, 4000000.25, 0, -20};
    if (layout.epsg == 4326) grid[0] = 10, grid[1] = 0.01, grid[3] = 50, grid[5] = -0.02;
    GDALSetGeoTransform(file, grid);
  }
  std::mt19937 random(static_cast<unsigned>(seed));
  std::vector<double> values(std::size_t{kWidth} * kHeight);
  for (unsigned band = 1; band <= layout.bands; ++band) {
    GDALRasterBandH const target = GDALGetRasterBand(file, static_cast<int>(band));
    if (layout.noData != nullptr) GDALSetRasterNoDataValue(target, CPLAtof(layout.noData));
    // Runs of one value among noise, so that codecs have long strings as well as short ones.
    double last = 0;
    for (double& value : values) {
      if (random() % 8 == 0) last = random() % 250;
      value = last + (random() % 16 == 0 ? 1 : 0);
    }
    ASSERT_EQ(GDALRasterIO(target, GF_Write, 0, 0, kWidth, kHeight, values.data(), kWidth, kHeight,
                           GDT_Float64, 0, 0),
              CE_None);
  }
  if (layout.hasLevels) {
    int factors[] = {2, 4, 8};
    ASSERT_EQ(GDALBuildOverviews(file, "NEAREST", 3, factors, 0, nullptr, nullptr, nullptr),
              CE_None);
  }
  GDALClose(file);
}

TEST(OwnTiff, IsReadAsGdalReadsIt) {
  const test::TemporaryDirectory directory;
  const std::vector<std::vector<std::string>> blocks = {
      {"TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=32"}, {"BLOCKYSIZE=7"}, {"BLOCKYSIZE=149"}};
  const std::vector<std::pair<const char*, std::vector<int>>> codecs = {
      {"NONE", {1}}, {"DEFLATE", {1, 2, 3}}, {"LZW", {1, 2, 3}}, {"ZSTD", {1, 2, 3}}};
  int number = 0;
  for (const GDALDataType type :
       {GDT_Byte, GDT_UInt16, GDT_Int16, GDT_UInt32, GDT_Int32, GDT_Float32, GDT_Float64}) {
    for (const auto& block : blocks) {
      for (const auto& [codec, predictors] : codecs) {
        for (const int predictor : predictors) {
          const bool isFloat = type == GDT_Float32 || type == GDT_Float64;
          if ((predictor == 3) != isFloat && predictor != 1) continue;
          Layout layout{type, block, number % 4 == 3 ? 1U : 3U};
          layout.options.push_back(std::string("COMPRESS=").append(codec));
          if (predictor != 1) layout.options.push_back("PREDICTOR=" + std::to_string(predictor));
          layout.options.emplace_back(number % 2 == 0 ? "INTERLEAVE=PIXEL" : "INTERLEAVE=BAND");
          layout.options.emplace_back(number % 5 == 0 ? "BIGTIFF=YES" : "BIGTIFF=NO");
          layout.options.emplace_back("PHOTOMETRIC=MINISBLACK");
          const char* const noData[] = {nullptr, "7", "-9999", "1e300", "nan"};
          // Left to GDAL: no-data values of doubles, and those beyond what a float can hold.
          const bool isBeyond = type == GDT_Float32 && number % 5 == 3;
          if (type != GDT_Float64 && !isBeyond) layout.noData = noData[number % 5];
          const int systems[] = {32633, 4326, 0, 3857, 31985, 2056};
          layout.epsg = systems[number % 6];
          layout.hasLevels = number % 3 == 0;
          const std::string path =
              (directory.Path() / ("s" + std::to_string(number) + "x.tif")).string();
          Make(path, layout, number);
          EXPECT_TRUE(ExpectSame(path)) << "GDAL had to read it";
          ++number;
        }
      }
    }
  }
  EXPECT_GT(number, 100);
}

/// JPEG in its forms; the bands of each are grey, or colours that may be stored as such or not.
TEST(OwnTiff, JpegIsDecodedAsByGdal) {
  const test::TemporaryDirectory directory;
  const std::vector<std::vector<std::string>> blocks = {
      {"TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=32"}, {"BLOCKYSIZE=16"}, {"BLOCKYSIZE=149"}};
  const std::vector<std::pair<unsigned, std::vector<std::string>>> forms = {
      {1, {}},
      {3, {"PHOTOMETRIC=YCBCR"}},
      {3, {"PHOTOMETRIC=RGB"}},
      {3, {"PHOTOMETRIC=MINISBLACK"}},
      {5, {"INTERLEAVE=BAND", "PHOTOMETRIC=MINISBLACK"}},
      {3, {"INTERLEAVE=BAND", "PHOTOMETRIC=RGB"}}};
  int number = 0;
  for (const auto& block : blocks) {
    for (const auto& [bands, options] : forms) {
      for (const char* const quality : {"JPEG_QUALITY=75", "JPEG_QUALITY=23", "JPEG_QUALITY=100"}) {
        Layout layout{GDT_Byte, block, bands};
        layout.options.insert(layout.options.end(), options.begin(), options.end());
        layout.options.insert(layout.options.end(), {"COMPRESS=JPEG", quality});
        layout.hasLevels = number % 3 == 0;
        layout.noData = number % 4 == 1 ? "7" : nullptr;
        const std::string path =
            (directory.Path() / ("j" + std::to_string(number++) + "x.tif")).string();
        Make(path, layout, number);
        EXPECT_TRUE(ExpectSame(path))
            << "GDAL had to read it: " << number << " " << bands << " " << quality;
      }
    }
  }
}

/// Systems of all kinds: in feet and degrees, with other meridians, withdrawn ones.
TEST(OwnTiff, SystemsOfTheRegistryAreThoseOfGdal) {
  GDALAllRegister();
  const test::TemporaryDirectory directory;
  unsigned own = 0, all = 0;
  for (int code = 2000; code < 32767; code += code < 5000 ? 41 : 97) {
    const std::string path = (directory.Path() / ("c" + std::to_string(code) + "x.tif")).string();
    {
      OGRSpatialReferenceH const system = OSRNewSpatialReference(nullptr);
      CPLPushErrorHandler(CPLQuietErrorHandler);
      if (OSRImportFromEPSG(system, code) == OGRERR_NONE &&
          (OSRIsProjected(system) != 0 || OSRIsGeographic(system) != 0)) {
        GDALDatasetH const file =
            GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 3, 2, 1, GDT_Byte, nullptr);
        double grid[] = {100, 1, 0, 50, 0, -1};
        GDALSetGeoTransform(file, grid);
        GDALSetSpatialRef(file, system);
        GDALClose(file);
      }
      CPLPopErrorHandler();
      OSRRelease(system);
    }
    if (!fs::exists(path)) continue;
    own += ExpectSame(path) ? 1 : 0;
    ++all;
    fs::remove(path);
  }
  EXPECT_GT(all, 80U);
  EXPECT_GT(own, all / 3);
}

/// Each case stores statistics in another way, or something that isn't statistics of all pixels.
TEST(OwnTiff, StoredStatisticsAreThoseOfGdal) {
  const test::TemporaryDirectory directory;
  const auto set = [](GDALDatasetH file, const char* name, const char* text, int band = 2) {
    GDALSetMetadataItem(GDALGetRasterBand(file, band), name, text, nullptr);
  };
  const auto compute = [](GDALDatasetH file, bool isApproximate) {
    double n = 0;
    GDALComputeRasterStatistics(GDALGetRasterBand(file, 1), isApproximate, &n, &n, &n, &n, nullptr,
                                nullptr);
  };
  using Store = std::function<void(GDALDatasetH)>;
  const struct {
    const char* name;
    bool isOwn;
    Store store;
  } cases[] = {
      {"computed", true, [&](GDALDatasetH file) { compute(file, false); }},
      {"approximate", true, [&](GDALDatasetH file) { compute(file, true); }},
      {"some are missing", true, [&](GDALDatasetH file) { set(file, "STATISTICS_MEAN", "3"); }},
      {"odd texts", true,
       [&](GDALDatasetH file) {
         compute(file, false);
         set(file, "STATISTICS_MEAN", " +1e400 and more");
         set(file, "STATISTICS_STDDEV", "-1.#IND");
         set(file, "STATISTICS_MINIMUM", "  3.5");
         set(file, "STATISTICS_MAXIMUM", "260");
         set(file, "STATISTICS_APPROXIMATE", "Off");
         set(file, "STATISTICS_VALID_PERCENT", "97.3");
         set(file, "STATISTICS_MEAN", "7", 1);  // beside the others of this band
       }},
      {"marks in a text", true, [&](GDALDatasetH file) { set(file, "STATISTICS_MEAN", "<&>"); }},
      {"another item", false, [&](GDALDatasetH file) { set(file, "SENSOR", "here"); }},
      {"an alpha band", false,
       [](GDALDatasetH file) {
         GDALSetRasterColorInterpretation(GDALGetRasterBand(file, 2), GCI_AlphaBand);
       }},
      {"a histogram", true,
       [&](GDALDatasetH file) {
         compute(file, false);
         GUIntBig counts[] = {1, 2, 3};
         GDALSetDefaultHistogramEx(GDALGetRasterBand(file, 2), -0.5, 2.5, 3, counts);
       }},
  };
  int number = 0;
  for (const GDALDataType type : {GDT_Byte, GDT_Int16, GDT_Float32}) {
    for (const auto& each : cases) {
      for (const int how : {0, 1, 2}) {  // beside the file, in the file, in both
        SCOPED_TRACE(std::string(each.name) + " " + std::to_string(how));
        const std::string path =
            (directory.Path() / ("v" + std::to_string(number++) + "x.tif")).string();
        const bool hasNoData = number % 3 == 0;
        Make(path, {type, {}, 3, 32633, hasNoData ? "7" : nullptr}, number);
        const auto store = [&](unsigned flags, const Store& body) {
          GDALDatasetH const file = GDALOpenEx(path.c_str(), flags, nullptr, nullptr, nullptr);
          body(file);
          GDALClose(file);
        };
        if (how != 0) store(GDAL_OF_RASTER | GDAL_OF_UPDATE, each.store);
        if (how == 2) {
          store(GDAL_OF_RASTER, [&](GDALDatasetH file) { set(file, "STATISTICS_MAXIMUM", "9"); });
        } else if (how == 0) {
          store(GDAL_OF_RASTER, each.store);
        }
        EXPECT_EQ(ExpectSame(path), each.isOwn);
      }
    }
  }
}

/// GDAL keeps names, units, meanings and scales of bands in a tag of the file.
TEST(OwnTiff, DetailsOfBandsAreThoseOfGdal) {
  const test::TemporaryDirectory directory;
  using Store = std::function<void(GDALRasterBandH)>;
  const struct {
    bool isOwn;
    Store store;
  } cases[] = {
      {true, [](GDALRasterBandH band) { GDALSetDescription(band, "near infrared, 30 m"); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterUnitType(band, "W/(m2 sr um)"); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterScale(band, 2.75e-05); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterScale(band, 1); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterOffset(band, -0.2); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterColorInterpretation(band, GCI_BlueBand); }},
      {false, [](GDALRasterBandH band) { GDALSetDescription(band, "<a & b>"); }},
      {false, [](GDALRasterBandH band) { GDALSetRasterColorInterpretation(band, GCI_HueBand); }},
  };
  int number = 0;
  for (const auto& each : cases) {
    for (const char* const photometric : {"PHOTOMETRIC=MINISBLACK", "PHOTOMETRIC=RGB"}) {
      for (const int bandNumber : {1, 2, 3}) {
        SCOPED_TRACE(std::to_string(number) + photometric);
        const std::string path =
            (directory.Path() / ("d" + std::to_string(number++) + "x.tif")).string();
        Make(path, {GDT_Byte, {photometric}, 4, 32633}, number);
        GDALDatasetH const file =
            GDALOpenEx(path.c_str(), GDAL_OF_RASTER | GDAL_OF_UPDATE, nullptr, nullptr, nullptr);
        each.store(GDALGetRasterBand(file, bandNumber));
        GDALClose(file);
        EXPECT_EQ(ExpectSame(path), each.isOwn);
      }
    }
  }
}

TEST(OwnTiff, LeavesToGdalWhatItDoesNotKnow) {
  const test::TemporaryDirectory directory;
  const auto path = [&](const char* name) { return (directory.Path() / name).string(); };
  const auto isOwn = [&](const char* name, const Layout& layout) {
    Make(path(name), layout, 1);
    return ExpectSame(path(name));
  };
  EXPECT_FALSE(isOwn("cmyk.tif", {GDT_Byte, {"COMPRESS=JPEG", "PHOTOMETRIC=CMYK"}, 4}));
  EXPECT_FALSE(isOwn("packed.tif", {GDT_Byte, {"COMPRESS=PACKBITS"}}));
  EXPECT_FALSE(isOwn("bits.tif", {GDT_Byte, {"NBITS=4"}}));
  EXPECT_FALSE(isOwn("signed.tif", {GDT_Byte, {"PIXELTYPE=SIGNEDBYTE"}, 1}));
  EXPECT_FALSE(isOwn("alpha.tif", {GDT_Byte, {"ALPHA=YES"}, 4}));
  EXPECT_FALSE(isOwn("complex.tif", {GDT_CFloat32, {}, 1}));
  EXPECT_FALSE(isOwn("other-end.tif", {GDT_UInt16, {"ENDIANNESS=BIG"}}));
  EXPECT_FALSE(isOwn("white.tif", {GDT_Byte, {"PHOTOMETRIC=MINISWHITE"}, 1}));
  EXPECT_FALSE(isOwn("sparse.tif", {GDT_UInt64, {}, 1, 32633, "5"}));
  EXPECT_TRUE(isOwn("colours.tif", {GDT_Byte, {"PHOTOMETRIC=RGB"}}));
  // Files beside a file may change what it is.
  for (const char* const beside : {"plain.tif.aux.xml", "plain.tfw", "PLAIN.TFW", "plain.tif.ovr",
                                   "plain.tif.msk", "plain_rpc.txt", "plain.IMD", "pla_MTL.txt"}) {
    SCOPED_TRACE(beside);
    Make(path("plain.tif"), {GDT_Byte, {}}, 2);
    const auto opened = [&] {
      const RasterDataConnectionPtr file = OpenBy(*FactoryForFormat("TIFF"), path("plain.tif"));
      return file && IsOwn(*file);
    };
    EXPECT_TRUE(opened());
    std::ofstream(path(beside)) << "0\n";
    EXPECT_FALSE(opened());
    fs::remove(path(beside));
  }
}

/// Reads all of a damaged file both ways.
template <typename T>
void ExpectSameOutcome(const RasterDataConnectionPtr& ours, const RasterDataConnectionPtr& theirs) {
  const RasterReaderPtr<T> own = test::ReaderOf<T>(ours), other = test::ReaderOf<T>(theirs);
  ASSERT_EQ(bool(own), bool(other));
  if (!own) return;
  Array<unsigned> bands{ArrayDims(other->Bands())};
  for (unsigned i = 0; i < bands.GetCount(); ++i) bands[i] = i;
  const std::size_t count = std::size_t{other->Samples(0)} * other->Lines(0) * bands.GetCount();
  if (count > 1 << 24) return;
  std::vector<T> a(count), b(count);
  std::vector<unsigned char> state(count);
  const bool isOurs =
      own->ReadPixels(0, 0, other->Samples(0), other->Lines(0), bands, 0, a.data(), state.data());
  const String ourRead = TakeFault();
  const bool isTheirs =
      other->ReadPixels(0, 0, other->Samples(0), other->Lines(0), bands, 0, b.data(), state.data());
  const String theirRead = TakeFault();
  EXPECT_EQ(isOurs, isTheirs) << ourRead.ToUTF8() << " / " << theirRead.ToUTF8();
  if (isOurs && isTheirs) {
    EXPECT_EQ(a, b);
  } else if (!isOurs && !isTheirs) {
    EXPECT_EQ(ourRead, theirRead);
  }
}

TEST(OwnTiff, DamageIsWhatGdalSaysOfIt) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "damaged.tif").string();
  for (const char* const codec : {"NONE", "DEFLATE", "LZW", "ZSTD", "JPEG"}) {
    for (int seed = 0; seed < 12; ++seed) {
      const bool isJpeg = std::string(codec) == "JPEG";
      Make(
          path,
          {isJpeg ? GDT_Byte : GDT_UInt16,
           {std::string("COMPRESS=").append(codec), "TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=64"}},
          seed);
      const auto size = static_cast<unsigned>(fs::file_size(path));
      std::mt19937 random(static_cast<unsigned>(seed));
      if (seed % 3 == 0) {
        fs::resize_file(path, size / 2 + random() % (size / 2));
      } else {
        std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
        for (int i = 0; i < 20; ++i) {
          file.seekp(static_cast<std::streamoff>(random() % size));
          file.put(static_cast<char>(random()));
        }
      }
      SCOPED_TRACE(std::string(codec) + " " + std::to_string(seed));
      const RasterDataConnectionPtr ours = OpenBy(*FactoryForFormat("TIFF"), path);
      const String ourFault = TakeFault();
      const RasterDataConnectionPtr theirs = OpenBy(GdalFactory(), path);
      const String theirFault = TakeFault();
      ASSERT_EQ(bool(ours), bool(theirs));
      EXPECT_EQ(ourFault, theirFault);
      if (isJpeg) {
        ExpectSameOutcome<std::uint8_t>(ours, theirs);
      } else {
        ExpectSameOutcome<std::uint16_t>(ours, theirs);
      }
    }
  }
}

TEST(OwnTiff, SamplesAreThoseOfGdal) {
  unsigned own = 0;
  for (const auto& entry : fs::recursive_directory_iterator(test::SampleData("."))) {
    if (entry.path().extension() == ".tif" && ExpectSame(entry.path().string())) ++own;
  }
  EXPECT_GE(own, 7U);
}

/// Threads with readers of their own and of others, on windows that lie anywhere: the blocks of all
/// files are in one cache, and go with their file.
TEST(OwnTiff, WindowsOfManyThreadsDoNotMixFiles) {
  const test::TemporaryDirectory directory;
  constexpr int kFiles = 3;
  constexpr const char* kCompressions[kFiles] = {"COMPRESS=LZW", "COMPRESS=NONE", "COMPRESS=NONE"};
  std::vector<RasterDataConnectionPtr> shared;
  std::vector<std::vector<std::uint8_t>> want;
  const auto path = [&](int file) {
    return (directory.Path() / ("w" + std::to_string(file) + "x.tif")).string();
  };
  const auto read = [](RasterReader<std::uint8_t>& reader, const SubRect& rect) {
    test::Block<std::uint8_t> block{rect, {0, 1, 2}, {}, {}};
    EXPECT_TRUE(block.Read(reader));
    return block.pixels;
  };
  for (int file = 0; file < kFiles; ++file) {
    Make(path(file),
         {GDT_Byte,
          {"TILED=YES", "BLOCKXSIZE=32", "BLOCKYSIZE=32", kCompressions[file], "INTERLEAVE=PIXEL"}},
         100 + file);
    shared.push_back(test::OpenSource({path(file)}));
    const auto peer = OpenBy(GdalFactory(), path(file));
    want.push_back(read(*test::ReaderOf<std::uint8_t>(peer), {0, 0, 202, 148}));
  }
  std::vector<std::jthread> threads;
  std::atomic<int> wrong{0};
  for (unsigned t = 0; t < 6; ++t) {
    threads.emplace_back([&, t] {
      std::mt19937 random(t);
      for (int i = 0; i < 60; ++i) {
        const auto file = static_cast<std::size_t>(random() % kFiles);
        const auto source =
            i % 4 == 0 ? test::OpenSource({path(static_cast<int>(file))}) : shared[file];
        const unsigned left = random() % 150, top = random() % 100;
        const SubRect rect(left, top, left + random() % 53, top + random() % 49);
        const auto got = read(*test::ReaderOf<std::uint8_t>(source), rect);
        std::size_t at = 0;
        for (unsigned y = rect.top; y <= rect.bottom; ++y) {
          for (unsigned x = rect.left * 3; x < (rect.right + 1) * 3; ++x) {
            if (got[at++] != want[file][y * 203 * 3 + x]) ++wrong;
          }
        }
      }
    });
  }
  threads.clear();
  EXPECT_EQ(wrong, 0);
}

/// Requests beyond reading go to GDAL, and reads afterwards give what it changed.
TEST(OwnTiff, ChangesGoThroughGdal) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "changed.tif").string();
  Make(path, {GDT_Byte, {"TILED=YES", "COMPRESS=DEFLATE"}, 1}, 3);
  const RasterDataConnectionPtr file = OpenBy(*FactoryForFormat("TIFF"), path);
  ASSERT_TRUE(file && IsOwn(*file));
  const RasterReaderPtr<std::uint8_t> reader = test::ReaderOf<std::uint8_t>(file);
  test::Block<std::uint8_t> block{{5, 6, 8, 7}, {0}, {}, {}};
  ASSERT_TRUE(block.Read(*reader));
  block.pixels = {1, 2, 3, 4, 5, 6, 7, 8};
  ASSERT_TRUE(block.Write(*reader)) << TakeFault().ToUTF8();
  test::Block<std::uint8_t> again{{5, 6, 8, 7}, {0}, {}, {}};
  ASSERT_TRUE(again.Read(*reader));
  EXPECT_EQ(again.pixels, block.pixels);
  EXPECT_TRUE(reader->PyramidBuild(1, 2, 0, TileDimensions{}));
  EXPECT_EQ(reader->PyramidLevelMax(), 2);
  EXPECT_EQ(reader->Samples(1), 102U);
}

}  // namespace
}  // namespace lumo
