#include "gdal_common/coordsys.h"

#include <algorithm>
#include <cpl_conv.h>
#include <iterator>
#include <ogr_spatialref.h>
#include <string>

namespace lumo::gdal {
namespace {

std::string WriteWkt(OGRSpatialReferenceH reference, const char* form) {
  const std::string format = std::string("FORMAT=") + form;
  const char* const options[] = {format.c_str(), "MULTILINE=NO", nullptr};
  char* text = nullptr;
  const bool written = OSRExportToWktEx(reference, &text, options) == OGRERR_NONE;
  std::string wkt = written && text != nullptr ? text : "";
  CPLFree(text);
  return wkt;
}

}  // namespace

CoordSys ReadCoordSys(OGRSpatialReferenceH reference) {
  CoordSys system;
  if (reference == nullptr) return system;
  OGRSpatialReference plain(*OGRSpatialReference::FromHandle(reference));
  double shift[7] = {};
  const bool hasShift = plain.GetTOWGS84(shift) == OGRERR_NONE;
  const auto isZero = [](double value) { return value == 0; };
  if (hasShift && std::all_of(std::begin(shift), std::end(shift), isZero)) {
    plain.StripTOWGS84IfKnownDatum();
  }
  for (const char* const form : {"WKT2_2019", "WKT1_GDAL", "WKT1_ESRI"}) {
    const std::string wkt = WriteWkt(OGRSpatialReference::ToHandle(&plain), form);
    if (!wkt.empty() && system.SetFromString(String(wkt))) break;
  }
  return system;
}

OGRSpatialReferenceH MakeSpatialReference(const CoordSys& system) {
  String text;
  system.ToString(text);
  std::string wkt = text.ToUTF8();
  if (wkt.empty()) return nullptr;
  OGRSpatialReferenceH reference = OSRNewSpatialReference(nullptr);
  char* at = wkt.data();
  if (OSRImportFromWkt(reference, &at) == OGRERR_NONE) return reference;
  OSRRelease(reference);
  return nullptr;
}

}  // namespace lumo::gdal
