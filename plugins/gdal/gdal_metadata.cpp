#include "gdal_metadata.h"

#include <algorithm>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <string>
#include <string_view>

namespace lumo::gdal {
namespace {

bool IsLeftOut(std::string_view domain) {
  for (const std::string_view other :
       {"RPC", "SUBDATASETS", "DERIVED_SUBDATASETS", "COLOR_PROFILE", "GEOLOCATION"}) {
    if (domain == other) return true;
  }
  return domain.find(':') != domain.npos;  // "xml:…", "json:…"
}

/// A slash would be a step down the tree.
std::string PathPiece(std::string name) {
  std::replace(name.begin(), name.end(), '/', '_');
  return name;
}

void ReadDomain(GDALDatasetH dataset, const std::string& domain, Metadata& metadata) {
  const std::string place =
      "/GDAL/" + PathPiece(domain.empty() ? std::string("Items") : domain) + "/";
  for (char** item = GDALGetMetadata(dataset, domain.c_str()); item != nullptr && *item != nullptr;
       ++item) {
    char* name = nullptr;
    const char* const value = CPLParseNameValue(*item, &name);
    if (name != nullptr && value != nullptr) metadata.Set(place + PathPiece(name), value);
    CPLFree(name);
  }
}

}  // namespace

Metadata ReadMetadata(GDALDatasetH dataset) {
  Metadata metadata;
  ReadDomain(dataset, "", metadata);
  const CPLStringList domains(GDALGetMetadataDomainList(dataset), TRUE);
  for (int i = 0; i < domains.Count(); ++i) {
    const std::string domain = domains[i];
    if (!domain.empty() && !IsLeftOut(domain)) ReadDomain(dataset, domain, metadata);
  }
  return metadata;
}

}  // namespace lumo::gdal
