#pragma once

#include <cmath>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <filesystem>
#include <functional>
#include <gdal.h>
#include <ogr_srs_api.h>
#include <random>
#include <regex>
#include <typeinfo>

#include "foundation/plugin_library.h"
#include "raster/raster_details.h"
#include "raster/raster_storage.h"
#include "support/raster_sources.h"

// TIFF files that the library reads itself have to be what GDAL makes of them: each is opened both
// ways, and all that the two connections say and give is compared.

namespace lumo::test {

inline DataConnectionFactory& GdalFactory() {
  static DataConnectionFactory& factory = []() -> DataConnectionFactory& {
    std::string fault;
    const platform::Module module = LoadPlugin(platform::ModuleFileName("vexgdalcore"), fault);
    auto* const create =
        module.Find<CreateDataConnectionFactoryFunction>("CreateDataConnectionFactory");
    return *create(FindFormat("TIFF"));
  }();
  return factory;
}

inline RasterDataConnectionPtr OpenBy(DataConnectionFactory& factory, const std::string& path) {
  return RasterDataConnectionPtr(
      factory.Connect(Strings({"TIFF", path}), GeoRefPtr(), MetadataPtr()));
}

inline bool IsOwn(RasterDataConnection& connection) {
  return std::string(typeid(connection).name()).find("tiff") != std::string::npos;
}

/// The text of a system without what GDAL and PROJ say in one way or the other, by what their
/// process has asked for before: an ensemble of datums as such or as one datum, and with it the
/// name of a conversion.
inline std::string Settled(std::string wkt) {
  wkt = std::regex_replace(
      wkt, std::regex("ENSEMBLE\\[\"([^\"]*) ensemble\",(MEMBER\\[\"[^\"]*\"\\],)*"),
      "DATUM[\"$1\",");
  wkt = std::regex_replace(wkt, std::regex(",ENSEMBLEACCURACY\\[[^\\]]*\\]"), "");
  return std::regex_replace(wkt, std::regex("CONVERSION\\[\"[^\"]*\""), "CONVERSION[\"\"");
}

inline std::string TextOf(const GeoRefPtr& model) {
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

inline void ExpectSameMetadata(const Metadata& ours, const Metadata& theirs) {
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

inline void ExpectSameDefinition(const RasterDef& ours, const RasterDef& theirs) {
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
    Array<T> ordered, otherOrdered;
    Array<unsigned char> orderedState, otherOrderedState;
    const SubRect rect(left, top, left + width - 1, top + height - 1);
    const Interleave orders[] = {Interleave::BSQ, Interleave::BIL, Interleave::BIP};
    const Interleave order = orders[i % 3];
    ASSERT_TRUE(ours.ReadBlock(rect, bands, level, order, ordered, orderedState));
    ASSERT_TRUE(theirs.ReadBlock(rect, bands, level, order, otherOrdered, otherOrderedState));
    EXPECT_EQ(0, std::memcmp(ordered.GetData(), otherOrdered.GetData(), count * sizeof(T)));
    EXPECT_TRUE(std::equal(orderedState.begin(), orderedState.end(), otherOrderedState.begin(),
                           otherOrderedState.end()));
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

inline void ExpectSameColors(const Palette& ours, const Palette& theirs) {
  std::ostringstream own, other;
  own << ours, other << theirs;
  EXPECT_EQ(own.str(), other.str());
}

/// Compares a file both ways. @return whether the library reads it itself.
inline bool ExpectSame(const std::string& path) {
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
      ExpectSameColors(own->Palette(band), other->Palette(band));
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
  std::function<void(GDALDatasetH)> changeNew = nullptr;  // before the first pixel is written
  bool hasMask = false;
};

/// Excludes some runs of pixels of a new file by a mask inside.
inline void AddMask(GDALDatasetH file, std::mt19937& random) {
  const CPLConfigOptionSetter inside("GDAL_TIFF_INTERNAL_MASK", "YES", false);
  ASSERT_EQ(GDALCreateDatasetMaskBand(file, GMF_PER_DATASET), CE_None);
  const int width = GDALGetRasterXSize(file), height = GDALGetRasterYSize(file);
  std::vector<unsigned char> mask(static_cast<std::size_t>(width) * height);
  unsigned char last = 0;
  for (unsigned char& value : mask) value = last = random() % 16 == 0 ? 255 - last : last;
  ASSERT_EQ(GDALRasterIO(GDALGetMaskBand(GDALGetRasterBand(file, 1)), GF_Write, 0, 0, width, height,
                         mask.data(), width, height, GDT_Byte, 0, 0),
            CE_None);
}

inline void Make(const std::string& path, const Layout& layout, int seed) {
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
  if (layout.changeNew) layout.changeNew(file);
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
  if (layout.hasMask) AddMask(file, random);
  if (layout.hasLevels) {
    int factors[] = {2, 4, 8};
    ASSERT_EQ(GDALBuildOverviews(file, "NEAREST", 3, factors, 0, nullptr, nullptr, nullptr),
              CE_None);
  }
  GDALClose(file);
}

}  // namespace lumo::test
