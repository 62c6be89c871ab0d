#include "metadata/metadata_formats.h"

namespace lumo {
namespace {

constexpr MetadataFormat kFormats[] = {
    {"ORVA", "mdf_orva.txt", kOrvaMetadataReader, "NotRequired"},
    {"DGTIL", "mdf_dg_til.txt", kTextMetadataReader, "NotRequired"},
    {"DGIMD", "mdf_dg_imd.txt", kTextMetadataReader, "NotRequired"},
    {"DGRPB", "mdf_dg_rpb.txt", kTextMetadataReader, "NotRequired"},
    {"TIFF", "mdf_gdal.txt", kGdalMetadataReader, "GTiff"},
    {"Erdas", "mdf_gdal.txt", kGdalMetadataReader, "HFA"},
    {"GRIB", "mdf_gdal.txt", kGdalMetadataReader, "GRIB"},
    {"GML", "mdf_gml.txt", kGmlMetadataReader, "XmlFile"},
    {"PLEIADESDIM", "mdf_pleiades_dim.txt", kPleiadesDimMetadataReader, "XmlFile"},
    {"PLEIADESRPC", "mdf_pleiades_rpc.txt", kXmlMetadataReader, "XmlFile"},
    // Of this library's own:
    {"LANDSAT", "mdf_landsat_mtl.txt", kLandsatMetadataReader, "NotRequired"},
    {"SENTINEL2", "mdf_sentinel2.txt", kXmlMetadataReader, "XmlFile"},
};

}  // namespace

std::span<const MetadataFormat> GetMetadataFormats() {
  return kFormats;
}

const MetadataFormat* FindMetadataFormat(const String& word) {
  for (const MetadataFormat& format : kFormats) {
    if (word == format.word) return &format;
  }
  return nullptr;
}

bool GMetadataByFrmtName(const String& format, String& mdfFile, eMetadataReader& reader,
                         String& extra) {
  const MetadataFormat* const found = FindMetadataFormat(format);
  if (found == nullptr) return false;
  mdfFile = found->mdfFile;
  reader = found->reader;
  extra = found->extra;
  return true;
}

}  // namespace lumo
