#include "gdal_side_file.h"

#include <algorithm>
#include <cmath>
#include <gdal_pam.h>

#include "gdal_common/coordsys.h"
#include "gdal_common/source.h"
#include "gdal_details.h"
#include "gdal_georef.h"
#include "gdal_no_data.h"

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

bool HasNoData(GDALRasterBandH band, const NoDataNumber& wanted) {
  const std::optional<NoDataNumber> value = ReadNoData(band);
  return value && value->IsSame(wanted);
}

// Each sets what differs, by the operations of the base class: a driver's own would write into the
// file itself. False when something can't be set.

bool CompleteGrid(GDALPamDataset& file, const GeoRef& model, const RasterDef& def) {
  GDALDatasetH const handle = GDALDataset::ToHandle(&file);
  GridTransform grid{};
  if (!GridOf(model, grid)) return true;
  if (!HasGrid(handle, grid, def) && file.GDALPamDataset::SetGeoTransform(grid.data()) != CE_None) {
    return false;
  }
  const CoordSys& system = model.CoordinateSystem();
  if (system.IsEmpty() || ReadCoordSys(GDALGetSpatialRef(handle)).IsEqual(system)) return true;
  OGRSpatialReferenceH const reference = MakeSpatialReference(system);
  if (reference == nullptr) return false;
  const CPLErr result =
      file.GDALPamDataset::SetSpatialRef(OGRSpatialReference::FromHandle(reference));
  OSRRelease(reference);
  return result == CE_None;
}

bool CompleteCamera(GDALPamDataset& file, const GeoRef& model) {
  CPLStringList camera = CameraItemsOf(model);
  return camera.Count() == 0 || HasCamera(GDALDataset::ToHandle(&file)) ||
         file.GDALPamDataset::SetMetadata(camera.List(), "RPC") == CE_None;
}

bool CompleteNoData(GDALPamDataset& file, const RasterDef& def) {
  for (const auto& [band, number] : def.noData) {
    if (band >= def.bands) continue;
    const NoDataNumber value = *NoDataOf(def, band);
    GDALRasterBandH const target =
        GDALRasterBand::ToHandle(file.GetRasterBand(static_cast<int>(band) + 1));
    if (!HasNoData(target, value) && !WriteNoDataBeside(target, value)) return false;
  }
  return true;
}

bool CompleteHistograms(GDALDatasetH file,
                        const std::vector<std::optional<StoredHistogram>>& histograms) {
  for (std::size_t i = 0; i < histograms.size(); ++i) {
    GDALRasterBandH const band = GDALGetRasterBand(file, static_cast<int>(i) + 1);
    if (histograms[i] && !ReadStoredHistogram(band) &&
        !WriteStoredHistogram(band, *histograms[i])) {
      return false;
    }
  }
  return true;
}

}  // namespace

bool CompleteBeside(const std::string& path, const std::string& driver, const RasterDef& def,
                    const std::vector<std::optional<StoredHistogram>>& histograms) {
  const DatasetPtr file = OpenToRead(path, driver);
  auto* const withSideFile = dynamic_cast<GDALPamDataset*>(GDALDataset::FromHandle(file.get()));
  if (withSideFile == nullptr) return false;
  const bool hasGeoRef = !def.geoRef || (CompleteGrid(*withSideFile, *def.geoRef, def) &&
                                         CompleteCamera(*withSideFile, *def.geoRef));
  return hasGeoRef && CompleteDetails(*withSideFile, def) && CompleteNoData(*withSideFile, def) &&
         CompleteHistograms(file.get(), histograms);
}

}  // namespace lumo::gdal
