#include "gdal_makers.h"

#include <cstring>

#include "gdal_details.h"
#include "gdal_no_data.h"
#include "gdal_tiff_options.h"
#include "gdal_types.h"

namespace lumo::gdal {
namespace {

constexpr Maker kMakers[] = {
    {"GTiff", false, "SPARSE_OK=TRUE"},
    {"HFA", false, ""},
    {"VRT", false, ""},  // on files that hold the lines
    {"BMP", true, ""},
    {"NITF", true, "", true},  // corners to the metre or the second
    {"PNG", true, ""},
    {"GIF", true, ""},
    {"JPEG", true, "QUALITY=95", false, true},  // the one format here that loses something
    {"JP2OpenJPEG", true, "QUALITY=100 REVERSIBLE=YES YCBCR420=NO"},
};

}  // namespace

const Maker* FindMaker(const std::string& driver) {
  for (const Maker& maker : kMakers) {
    if (driver == maker.driver) return &maker;
  }
  return nullptr;
}

CPLStringList OptionsOf(const Maker& maker) {
  return CPLStringList(CSLTokenizeString2(maker.options, " ", 0), TRUE);
}

bool DiffersByBand(const RasterDef& def) {
  if (def.noData.empty()) return false;
  if (def.noData.size() != def.bands) return true;
  const auto first = NoDataOf(def, def.noData.begin()->first);
  for (const auto& [band, value] : def.noData) {
    if (!NoDataOf(def, band)->IsSame(*first)) return true;
  }
  return false;
}

bool SetNoData(GDALDatasetH dataset, const RasterDef& def) {
  for (const auto& [band, value] : def.noData) {
    if (band >= def.bands) continue;
    const GDALRasterBandH target = GDALGetRasterBand(dataset, static_cast<int>(band) + 1);
    if (!WriteNoData(target, *NoDataOf(def, band))) return false;
  }
  return true;
}

std::vector<unsigned char> FillValueOf(const RasterDef& def) {
  std::vector<unsigned char> bytes(DataTypeBytes(def.dataType));
  const auto value = DiffersByBand(def) ? std::nullopt : NoDataOf(def, 0);
  DispatchType(TwelveTypes{}, def.dataType, [&]<typename T>() {
    const std::optional<T> pixel = value ? value->As<T>() : std::nullopt;
    if (pixel) std::memcpy(bytes.data(), &*pixel, sizeof(T));
    return true;
  });
  return bytes;
}

void AddMeaning(const RasterDef& def, CPLStringList& options) {
  if (IsInColors(def)) options.SetNameValue("PHOTOMETRIC", "RGB");
  if (def.bands < 2) return;
  options.SetNameValue("ALPHA", IsAlpha(def, def.bands - 1) ? "NON-PREMULTIPLIED" : "NO");
  const bool isPlain = !IsInColors(def) && def.bands != 3;
  if (isPlain) options.SetNameValue("PHOTOMETRIC", "MINISBLACK");
}

bool HoldsSignedBytes(GDALDriverH driver) {
  const char* const list = GDALGetMetadataItem(driver, GDAL_DMD_CREATIONOPTIONLIST, nullptr);
  return list != nullptr && std::string(list).find("SIGNEDBYTE") != std::string::npos;
}

RasterDef AsKept(const std::string& driver, const RasterDef& def) {
  RasterDef kept = def;
  const Maker* const maker = FindMaker(driver);
  if (maker != nullptr && maker->changesValues) kept.noData.clear();
  if (driver != "GTiff") return kept;
  const CreationOptions& wanted = def.creation;
  if (wanted.LosesValues()) kept.noData.clear();
  if (wanted.tile) kept.tileWidth = kept.tileHeight = *wanted.tile;
  if (wanted.layout != FileLayout::kCog) return kept;
  constexpr unsigned kUsualTile = 512;
  if (!wanted.tile) kept.tileWidth = kept.tileHeight = kUsualTile;
  kept.interleave = Interleave::BIP;
  return kept;
}

}  // namespace lumo::gdal
