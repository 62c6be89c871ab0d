#include "vector_source.h"

#include <filesystem>
#include <ogr_api.h>

#include "data/access_policy.h"
#include "gdal_common/coordsys.h"
#include "gdal_common/file_guard.h"
#include "gdal_common/messages.h"
#include "gdal_common/shape_geometry.h"
#include "gdal_common/source.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using gdal::FailWith;
using gdal::Messages;

/// The drivers whose files hold records, none of which reaches over the network or names other
/// files.
constexpr const char* kDrivers[] = {"GPKG",     "FlatGeobuf",     "GeoJSON", "GeoJSONSeq",
                                    "TopoJSON", "ESRI Shapefile", "CSV",     "GML",
                                    "KML",      nullptr};

class GdalVectorSource final : public VectorRecordSource {
 public:
  GdalVectorSource(std::string path, gdal::DatasetPtr dataset)
      : path_(std::move(path)), dataset_(std::move(dataset)) {}

  std::uint32_t LayerCount() override {
    return static_cast<std::uint32_t>(GDALDatasetGetLayerCount(dataset_.get()));
  }
  VectorLayer Layer(std::uint32_t layer) override;
  bool Begin(std::uint32_t layer, const MapRect* box) override;
  bool Next(VectorRecord& record) override;

 private:
  OGRLayerH Find(std::uint32_t layer) const {
    return GDALDatasetGetLayer(dataset_.get(), static_cast<int>(layer));
  }

  const std::string path_;
  const gdal::DatasetPtr dataset_;
  OGRLayerH layer_ = nullptr;
};

VectorFieldType TypeOf(OGRFieldType type) {
  return type == OFTInteger || type == OFTInteger64 ? VectorFieldType::kInteger
         : type == OFTReal                          ? VectorFieldType::kReal
                                                    : VectorFieldType::kText;
}

VectorLayer GdalVectorSource::Layer(std::uint32_t layer) {
  VectorLayer described;
  OGRLayerH const found = Find(layer);
  if (found == nullptr) {
    FailWith(path_, "has no layer " + std::to_string(layer));
    return described;
  }
  const Messages messages;
  described.name = OGR_L_GetName(found);
  described.geometry = gdal::GeometryOf(OGR_L_GetGeomType(found));
  described.coordSys = gdal::ReadCoordSys(OGR_L_GetSpatialRef(found));
  OGRFeatureDefnH const columns = OGR_L_GetLayerDefn(found);
  for (int i = 0; i < OGR_FD_GetFieldCount(columns); ++i) {
    OGRFieldDefnH const column = OGR_FD_GetFieldDefn(columns, i);
    described.fields.push_back({OGR_Fld_GetNameRef(column), TypeOf(OGR_Fld_GetType(column))});
  }
  described.records = OGR_L_GetFeatureCount(found, TRUE);
  OGREnvelope extent{};
  if (described.records > 0 && OGR_L_GetExtent(found, &extent, TRUE) == OGRERR_NONE) {
    described.bounds = {extent.MinX, extent.MinY, extent.MaxX, extent.MaxY};
  }
  if (messages.HasError()) messages.Fail(path_);
  return described;
}

bool GdalVectorSource::Begin(std::uint32_t layer, const MapRect* box) {
  layer_ = Find(layer);
  if (layer_ == nullptr) return FailWith(path_, "has no layer " + std::to_string(layer));
  OGR_L_SetSpatialFilter(layer_, nullptr);
  if (box != nullptr)
    OGR_L_SetSpatialFilterRect(layer_, box->minX, box->minY, box->maxX, box->maxY);
  OGR_L_ResetReading(layer_);
  return true;
}

void AddPart(OGRGeometryH part, bool isHole, VectorRecord& record) {
  const auto points = static_cast<std::size_t>(OGR_G_GetPointCount(part));
  const std::size_t at = record.coordinates.size();
  record.coordinates.resize(at + 2 * points);
  gdal::CopyPart(part, record.coordinates.data() + at);
  record.partEnds.push_back(static_cast<std::uint32_t>(record.coordinates.size() / 2));
  record.holes.push_back(isHole ? 1 : 0);
}

void AddShape(OGRGeometryH shape, VectorRecord& record) {
  const bool isPolygon = wkbFlatten(OGR_G_GetGeometryType(shape)) == wkbPolygon;
  const int inner = OGR_G_GetGeometryCount(shape);
  for (int i = 0; i < inner; ++i) {
    OGRGeometryH const part = OGR_G_GetGeometryRef(shape, i);
    if (isPolygon) {
      AddPart(part, i > 0, record);
    } else {
      AddShape(part, record);
    }
  }
  if (inner == 0 && !isPolygon && OGR_G_GetPointCount(shape) > 0) AddPart(shape, false, record);
}

VectorValue ValueOf(OGRFeatureH feature, int field) {
  if (OGR_F_IsFieldSetAndNotNull(feature, field) == 0) return {};
  switch (TypeOf(OGR_Fld_GetType(OGR_F_GetFieldDefnRef(feature, field)))) {
    case VectorFieldType::kInteger:
      return std::int64_t{OGR_F_GetFieldAsInteger64(feature, field)};
    case VectorFieldType::kReal:
      return OGR_F_GetFieldAsDouble(feature, field);
    case VectorFieldType::kText:
      break;
  }
  return std::string(OGR_F_GetFieldAsString(feature, field));
}

bool GdalVectorSource::Next(VectorRecord& record) {
  record.Clear();
  if (layer_ == nullptr) return false;
  const Messages messages;
  const gdal::FeaturePtr feature(OGR_L_GetNextFeature(layer_));
  if (messages.HasError()) return messages.Fail(path_);
  if (feature == nullptr) return false;
  record.id = OGR_F_GetFID(feature.get());
  if (OGRGeometryH shape = OGR_F_GetGeometryRef(feature.get()); shape != nullptr) {
    // Arcs become lines of short pieces.
    const std::unique_ptr<std::remove_pointer_t<OGRGeometryH>, decltype(&OGR_G_DestroyGeometry)>
        plain(OGR_G_HasCurveGeometry(shape, FALSE) != 0 ? OGR_G_GetLinearGeometry(shape, 0, nullptr)
                                                        : nullptr,
              &OGR_G_DestroyGeometry);
    if (plain != nullptr) shape = plain.get();
    record.geometry = gdal::GeometryOf(OGR_G_GetGeometryType(shape));
    AddShape(shape, record);
  }
  const int fields = OGR_F_GetFieldCount(feature.get());
  for (int i = 0; i < fields; ++i) record.values.push_back(ValueOf(feature.get(), i));
  return true;
}

}  // namespace

VectorRecordSourcePtr OpenVectorSource(const std::string& path) {
  std::error_code fault;
  if (!MayReachFile(path, false)) return {};
  const std::string absolute = fs::absolute(path, fault).string();
  gdal::ForgetRefusals();
  const Messages messages;
  gdal::DatasetPtr dataset(GDALOpenEx(absolute.c_str(), GDAL_OF_VECTOR | GDAL_OF_VERBOSE_ERROR,
                                      kDrivers, nullptr, nullptr));
  if (dataset == nullptr || messages.HasError()) {
    if (!fs::exists(absolute, fault)) {
      FailWith(path, "no such file");
    } else {
      messages.Fail(path, "in no vector format that is known here");
    }
    return {};
  }
  if (!gdal::WasRefusedNothing() || !gdal::MayReachAllFiles(dataset.get())) return {};
  return VectorRecordSourcePtr(new GdalVectorSource(path, std::move(dataset)));
}

}  // namespace lumo
