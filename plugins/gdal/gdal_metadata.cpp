#include "gdal_metadata.h"

#include <algorithm>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <initializer_list>
#include <ogr_srs_api.h>
#include <string>
#include <string_view>
#include <vector>

#include "commands/value_text.h"
#include "gdal_details.h"
#include "gdal_raster.h"
#include "raster/pixel_types.h"
#include "raster/raster_storage.h"

namespace lumo::gdal {
namespace {

bool IsOneOf(std::string_view domain, std::initializer_list<std::string_view> list) {
  return std::find(list.begin(), list.end(), domain) != list.end();
}

bool IsLeftOut(std::string_view domain) {
  return IsOneOf(domain, {"SUBDATASETS", "DERIVED_SUBDATASETS", "COLOR_PROFILE", "GEOLOCATION"}) ||
         domain.find(':') != domain.npos;  // "xml:…", "json:…"
}

/// A slash would be a step down the tree.
std::string PathPiece(std::string name) {
  std::replace(name.begin(), name.end(), '/', '_');
  return name;
}

/// Calls `visit(path piece, value)` for each item of a domain.
template <typename Visit>
void VisitItems(GDALMajorObjectH object, const std::string& domain, const Visit& visit) {
  for (char** item = GDALGetMetadata(object, domain.c_str()); item != nullptr && *item != nullptr;
       ++item) {
    char* name = nullptr;
    const char* const value = CPLParseNameValue(*item, &name);
    if (name != nullptr && value != nullptr) visit(PathPiece(name), value);
    CPLFree(name);
  }
}

/// Calls `visit(path, value)` for each item of the domains that are shown.
template <typename Visit>
void VisitDomains(GDALDatasetH dataset, bool withCamera, const Visit& visit) {
  const CPLStringList domains(GDALGetMetadataDomainList(dataset), TRUE);
  std::vector<std::string> names{""};
  for (int i = 0; i < domains.Count(); ++i) {
    const std::string domain = domains[i];
    const bool isTold = !domain.empty() && !IsLeftOut(domain) && (withCamera || domain != "RPC");
    if (isTold) names.push_back(domain);
  }
  for (const std::string& domain : names) {
    const std::string place = "/GDAL/" + (domain.empty() ? "Items" : PathPiece(domain)) + "/";
    VisitItems(dataset, domain, [&](const std::string& name, const char* value) {
      visit(String(place + name), value);
    });
  }
}

void Put(MetadataContainer& texts, const std::string& path, const String& text) {
  texts.Put(String("/GDAL/" + path), std::make_unique<MetadataString>(std::vector<String>{text}));
}

void CollectPlace(GDALDatasetH dataset, MetadataContainer& texts) {
  const OGRSpatialReferenceH system = GDALGetSpatialRef(dataset);
  if (system != nullptr) {
    const char* const authority = OSRGetAuthorityName(system, nullptr);
    const char* const code = OSRGetAuthorityCode(system, nullptr);
    if (authority != nullptr && code != nullptr && std::string_view(authority) == "EPSG") {
      Put(texts, "CoordSys/Code", code);
    }
    Put(texts, "CoordSys/Text", GDALGetProjectionRef(dataset));
  }
  double transform[6];
  if (GDALGetGeoTransform(dataset, transform) != CE_None) return;
  std::string numbers;
  for (const double number : transform) {
    numbers.append(numbers.empty() ? "" : " ").append(FormatValue(number).ToUTF8());
  }
  Put(texts, "Grid/Transform", String(numbers));
}

using BandText = String (*)(GDALRasterBandH band, bool& has);

String TextOf(const char* text, bool& has) {
  has = text != nullptr && *text != '\0';
  return has ? String(text) : String("");
}

String NumberOf(double number, int has, bool& out) {
  out = has != 0;
  return FormatValue(number);
}

/// Puts a text of each band, if one of them has it.
void CollectOfBands(GDALDatasetH dataset, const char* name, BandText read,
                    MetadataContainer& texts) {
  std::vector<String> all;
  bool anyHas = false;
  for (int band = 1; band <= GDALGetRasterCount(dataset); ++band) {
    bool has = false;
    all.push_back(read(GDALGetRasterBand(dataset, band), has));
    anyHas = anyHas || has;
  }
  if (!anyHas) return;
  for (std::size_t i = 0; i < all.size(); ++i) {
    Put(texts, "Bands/" + std::to_string(i + 1) + "/" + name, all[i]);
  }
}

void CollectBands(GDALDatasetH dataset, MetadataContainer& texts) {
  for (int band = 1; band <= GDALGetRasterCount(dataset); ++band) {
    const std::string place = "Bands/" + std::to_string(band) + "/";
    VisitItems(
        GDALGetRasterBand(dataset, band), "",
        [&](const std::string& name, const char* value) { Put(texts, place + name, value); });
  }
  CollectOfBands(
      dataset, "Description",
      [](GDALRasterBandH band, bool& has) { return TextOf(GDALGetDescription(band), has); }, texts);
  CollectOfBands(
      dataset, "Unit",
      [](GDALRasterBandH band, bool& has) { return TextOf(GDALGetRasterUnitType(band), has); },
      texts);
  CollectOfBands(
      dataset, "Scale",
      [](GDALRasterBandH band, bool& out) {
        int has = 0;
        const double scale = GDALGetRasterScale(band, &has);
        return NumberOf(scale, has, out);
      },
      texts);
  CollectOfBands(
      dataset, "Offset",
      [](GDALRasterBandH band, bool& out) {
        int has = 0;
        const double offset = GDALGetRasterOffset(band, &has);
        return NumberOf(offset, has, out);
      },
      texts);
}

/// The codec of the pixels, of the file or of its first band.
std::string CompressionOf(GDALDatasetH dataset, GDALRasterBandH band) {
  for (GDALMajorObjectH object : {dataset, band}) {
    const char* const word = GDALGetMetadataItem(object, "COMPRESSION", "IMAGE_STRUCTURE");
    if (word != nullptr) return word;
  }
  // Of these a file says so when it is packed.
  const std::string_view driver = GDALGetDriverShortName(GDALGetDatasetDriver(dataset));
  return IsOneOf(driver, {"GTiff", "COG", "HFA"}) ? "none" : std::string();
}

}  // namespace

RasterStorage ReadStorage(GDALDatasetH dataset) {
  GDALRasterBandH band = GDALGetRasterBand(dataset, 1);
  if (band == nullptr) return {};
  int width = 0, height = 0;
  GDALGetBlockSize(band, &width, &height);
  return {static_cast<unsigned>(std::max(width, 0)), static_cast<unsigned>(std::max(height, 0)),
          CompressionOf(dataset, band)};
}

Metadata ReadMetadata(GDALDatasetH dataset, bool hasGrid) {
  Metadata metadata;
  VisitDomains(dataset, false,
               [&](const String& path, const char* value) { metadata.Set(path, value); });
  ReadDetails(dataset, hasGrid, metadata);
  SetStorage(metadata, ReadStorage(dataset));
  return metadata;
}

void CollectTexts(const OpenRaster& raster, MetadataContainer& texts) {
  const GDALDatasetH dataset = raster.Dataset();
  VisitDomains(dataset, true, [&](const String& path, const char* value) {
    texts.Put(path, std::make_unique<MetadataString>(std::vector<String>{value}));
  });
  Put(texts, "Raster/Samples", FormatValue(GDALGetRasterXSize(dataset)));
  Put(texts, "Raster/Lines", FormatValue(GDALGetRasterYSize(dataset)));
  Put(texts, "Raster/Bands", FormatValue(GDALGetRasterCount(dataset)));
  Put(texts, "Raster/DataType", DataTypeName(raster.DataType()));
  Put(texts, "Raster/Interleave", FormatValue(raster.Interleave()));
  CollectPlace(dataset, texts);
  CollectBands(dataset, texts);
}

}  // namespace lumo::gdal
