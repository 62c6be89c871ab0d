#include "gdal_side_file.h"

#include <algorithm>
#include <cmath>
#include <gdal_pam.h>

#include "common/coordsys.h"
#include "common/source.h"
#include "gdal_georef.h"

namespace lumo::gdal {
namespace {

DatasetPtr OpenToRead(const std::string& path, const std::string& driver) {
  const char* const drivers[] = {driver.c_str(), nullptr};
  return DatasetPtr(
      GDALOpenEx(path.c_str(), GDAL_OF_RASTER | GDAL_OF_VERBOSE_ERROR, drivers, nullptr, nullptr));
}

/// True when both put every corner of the raster to the same place, within a millionth of a pixel.
bool IsSameGrid(const GridTransform& a, const GridTransform& b, const RasterDef& def) {
  const double pixel = std::hypot(b[1], b[4]);
  for (const double sample : {0.0, static_cast<double>(def.samples)}) {
    for (const double line : {0.0, static_cast<double>(def.lines)}) {
      const double x = a[0] - b[0] + (a[1] - b[1]) * sample + (a[2] - b[2]) * line;
      const double y = a[3] - b[3] + (a[4] - b[4]) * sample + (a[5] - b[5]) * line;
      if (!(std::hypot(x, y) <= pixel * 1e-6)) return false;
    }
  }
  return true;
}

bool HasGrid(GDALDatasetH dataset, const GridTransform& wanted, const RasterDef& def) {
  GridTransform transform{};
  return GDALGetGeoTransform(dataset, transform.data()) == CE_None &&
         IsSameGrid(transform, wanted, def);
}

bool HasCamera(GDALDatasetH dataset) {
  char** const items = GDALGetMetadata(dataset, "RPC");
  return items != nullptr && *items != nullptr;
}

bool HasNoData(GDALDatasetH dataset, unsigned band, const RasterDef& def) {
  const auto wanted = def.noData.find(band);
  int has = FALSE;
  const double value =
      GDALGetRasterNoDataValue(GDALGetRasterBand(dataset, static_cast<int>(band) + 1), &has);
  if (wanted == def.noData.end()) return has == FALSE;
  return has != FALSE && IsSameNumber(value, wanted->second);
}

/// Sets what differs. False when something can't be set.
bool Complete(GDALPamDataset& file, const RasterDef& def) {
  GDALDatasetH const handle = GDALDataset::ToHandle(&file);
  bool isSet = true;
  // The operations of the base class: the driver's own would write into the file itself.
  if (def.geoRef) {
    GridTransform grid{};
    if (GridOf(*def.geoRef, grid) && !HasGrid(handle, grid, def)) {
      isSet = isSet && file.GDALPamDataset::SetGeoTransform(grid.data()) == CE_None;
    }
    const CoordSys& system = def.geoRef->CoordinateSystem();
    if (GridOf(*def.geoRef, grid) && !system.IsEmpty() &&
        !ReadCoordSys(GDALGetSpatialRef(handle)).IsEqual(system)) {
      OGRSpatialReferenceH const reference = MakeSpatialReference(system);
      isSet =
          isSet && reference != nullptr &&
          file.GDALPamDataset::SetSpatialRef(OGRSpatialReference::FromHandle(reference)) == CE_None;
      if (reference != nullptr) OSRRelease(reference);
    }
    CPLStringList camera = CameraItemsOf(*def.geoRef);
    if (camera.Count() != 0 && !HasCamera(handle)) {
      isSet = isSet && file.GDALPamDataset::SetMetadata(camera.List(), "RPC") == CE_None;
    }
  }
  for (const auto& [band, value] : def.noData) {
    if (band >= def.bands || HasNoData(handle, band, def)) continue;
    auto* const target =
        dynamic_cast<GDALPamRasterBand*>(file.GetRasterBand(static_cast<int>(band) + 1));
    isSet =
        isSet && target != nullptr && target->GDALPamRasterBand::SetNoDataValue(value) == CE_None;
  }
  return isSet;
}

}  // namespace

bool IsSameNumber(double a, double b) {
  return a == b || (a != a && b != b);
}

bool CompleteBeside(const std::string& path, const std::string& driver, const RasterDef& def) {
  const DatasetPtr file = OpenToRead(path, driver);
  auto* const withSideFile = dynamic_cast<GDALPamDataset*>(GDALDataset::FromHandle(file.get()));
  return withSideFile != nullptr && Complete(*withSideFile, def);
}

}  // namespace lumo::gdal
