#include "shape_layer.h"

#include <filesystem>

#include "foundation/abandonment.h"
#include "foundation/fault.h"
#include "gdal_common/coordsys.h"
#include "gdal_common/messages.h"
#include "georef/std_georef.h"
#include "platform/file_moves.h"
#include "platform/random_access_file.h"
#include "platform/temporary_file.h"
#include "raster/pixel_types.h"

namespace lumo::shapefile {
namespace {

namespace fs = std::filesystem;
using gdal::FailWith;
using gdal::Messages;

/// The files of a shapefile, the one that makes it one last. The first ones describe the shapes
/// further, and would not fit other shapes.
constexpr const char* kParts[] = {".qix", ".sbn", ".sbx", ".cpg", ".qpj",
                                  ".prj", ".dbf", ".shx", ".shp"};

std::string PartOf(const std::string& path, const char* extension) {
  return fs::path(path).replace_extension(extension).string();
}

bool Exists(const std::string& path) {
  std::error_code fault;
  return fs::exists(path, fault);
}

void Remove(const std::string& path) {
  std::error_code ignored;
  fs::remove(path, ignored);
}

}  // namespace

bool Layer::HasShapeName(const std::string& path) {
  const std::string extension = fs::path(path).extension().string();
  return extension == ".shp" || extension == ".SHP";
}

std::unique_ptr<Layer> Layer::Open(const gdal::Format& format, const gdal::Source& source) {
  std::unique_ptr<Layer> layer(new Layer(format, source));
  return layer->TakeDataset(OpenDataset(source, format, GDAL_OF_VECTOR)) ? std::move(layer)
                                                                         : nullptr;
}

std::unique_ptr<Layer> Layer::Create(const gdal::Format& format, const gdal::Source& source,
                                     const VectorDef& def) {
  const std::string& path = source.name;
  std::error_code ignored;
  const OGRwkbGeometryType type = gdal::LayerTypeOf(def.geometry);
  const char* const why =
      path.starts_with("/vsi") || !HasShapeName(path)       ? "a new shapefile's name ends in .shp"
      : Exists(path) && !fs::is_regular_file(path, ignored) ? "not a file"
      : type == wkbUnknown                  ? "shapes have to be points, lines or polygons"
      : def.dataType != kDataTypeOf<double> ? "a shapefile holds coordinates of type Double"
                                            : nullptr;
  if (why != nullptr) {
    FailWith(path, why);
    return nullptr;
  }
  std::unique_ptr<Layer> layer(new Layer(format, source));
  layer->temporary_ = platform::TemporaryPathBeside(path) + ".shp";
  layer->isUpdated_ = true;
  layer->isDoomed_ = true;
  const Messages messages;
  gdal::DatasetPtr dataset(GDALCreate(GDALGetDriverByName(format.drivers.front().c_str()),
                                      layer->temporary_.c_str(), 0, 0, 0, GDT_Unknown, nullptr));
  OGRSpatialReferenceH const reference =
      def.geoRef ? gdal::MakeSpatialReference(def.geoRef->CoordinateSystem()) : nullptr;
  OGRLayerH const made =
      dataset == nullptr ? nullptr
                         : GDALDatasetCreateLayer(
                               dataset.get(), fs::path(layer->temporary_).stem().string().c_str(),
                               reference, type, nullptr);
  if (reference != nullptr) OSRRelease(reference);
  if (made == nullptr) {
    messages.Fail(path);
    return nullptr;
  }
  layer->isDoomed_ = !layer->TakeDataset(std::move(dataset));
  return layer->isDoomed_ ? nullptr : std::move(layer);
}

bool Layer::TakeDataset(gdal::DatasetPtr dataset) {
  last_.reset();
  lastIndex_ = -1;
  dataset_ = std::move(dataset);
  if (dataset_ == nullptr) return false;
  layer_ = GDALDatasetGetLayer(dataset_.get(), 0);
  const bool hasShapes =
      layer_ != nullptr && gdal::GeometryOf(OGR_L_GetGeomType(layer_)) != VectorGeometry::kUnknown;
  if (!hasShapes) return FailWith(Name(), "holds no points, lines or polygons");
  return NumberFeatures();
}

/// The records that are not deleted. Their shapes are not read for it.
bool Layer::NumberFeatures() {
  const Messages messages;
  numbers_.clear();
  const char* const withoutShapes[] = {"OGR_GEOMETRY", nullptr};
  OGR_L_SetIgnoredFields(layer_, const_cast<const char**>(withoutShapes));
  OGR_L_ResetReading(layer_);
  while (const gdal::FeaturePtr feature{OGR_L_GetNextFeature(layer_)}) {
    numbers_.push_back(OGR_F_GetFID(feature.get()));
  }
  OGR_L_SetIgnoredFields(layer_, nullptr);
  return !messages.HasError() || messages.Fail(Name());
}

bool Layer::Close() {
  if (dataset_ == nullptr) {
    if (!temporary_.empty()) Discard();
    return true;
  }
  const Messages messages;
  last_.reset();
  layer_ = nullptr;
  dataset_.reset();
  if (temporary_.empty()) return !isUpdated_ || !messages.HasError() || messages.Fail(Name());
  const bool isWhole =
      isDoomed_ ? FailWith(Name(), "not made, since some of its shapes could not be written")
                : !messages.HasError() || messages.Fail(Name());
  const bool isPlaced = isWhole && !IsAbandoning() && TakePlace();
  if (!isPlaced) Discard();
  temporary_.clear();
  return isPlaced;
}

bool Layer::TakePlace() {
  std::string why;
  for (const char* const extension : kParts) {
    const std::string made = PartOf(temporary_, extension), place = PartOf(Name(), extension);
    if (!Exists(made)) {
      Remove(place);
      continue;
    }
    const auto file =
        platform::RandomAccessFile::Open(made, platform::RandomAccessFile::Access::kUpdate, &why);
    if (file == nullptr || !file->Flush(&why) || !platform::RenameFile(made, place, &why)) {
      SetFault(why);
      return false;
    }
  }
  return true;
}

void Layer::Discard() const {
  for (const char* const extension : kParts) Remove(PartOf(temporary_, extension));
}

VectorDef Layer::Describe() const {
  const Messages messages;
  VectorDef def;
  def.geometry = gdal::GeometryOf(OGR_L_GetGeomType(layer_));
  def.format = String(format_.key);
  def.dataType = kDataTypeOf<double>;
  def.features = Features();
  OGREnvelope extent{};
  if (Features() != 0 && OGR_L_GetExtent(layer_, &extent, TRUE) == OGRERR_NONE) {
    def.bounds = {extent.MinX, extent.MinY, extent.MaxX, extent.MaxY};
  }
  const CoordSys system = gdal::ReadCoordSys(OGR_L_GetSpatialRef(layer_));
  if (!system.IsEmpty()) {
    def.geoRef.Reset(new StdGeoRef);
    def.geoRef->SetCoordinateSystem(system);
  }
  return def;
}

OGRFeatureH Layer::Get(std::int32_t index) {
  if (index < 0 || static_cast<std::uint32_t>(index) >= Features()) {
    FailWith(Name(), "has no feature " + std::to_string(index));
    return nullptr;
  }
  if (index == lastIndex_ && last_ != nullptr) return last_.get();
  const Messages messages;
  last_.reset(OGR_L_GetFeature(layer_, numbers_[static_cast<std::size_t>(index)]));
  lastIndex_ = index;
  if (last_ != nullptr && !messages.HasError()) return last_.get();
  last_.reset();
  messages.Fail(Name(), "a feature can't be read");
  return nullptr;
}

bool Layer::CanWrite() {
  return isUpdated_ ||
         (source_.isFile && platform::RandomAccessFile::Open(
                                Name(), platform::RandomAccessFile::Access::kUpdate) != nullptr);
}

bool Layer::OpenForUpdate() {
  if (isUpdated_) return true;
  if (!CanWrite()) return FailWith(Name(), "can't be written");
  last_.reset();
  dataset_.reset();
  isUpdated_ = TakeDataset(OpenDataset(source_, format_, GDAL_OF_VECTOR | GDAL_OF_UPDATE));
  if (isUpdated_) return true;
  const String fault = TakeFault();
  TakeDataset(OpenDataset(source_, format_, GDAL_OF_VECTOR));
  SetFault(fault);
  return false;
}

bool Layer::Sync() {
  return !temporary_.empty() || OGR_L_SyncToDisk(layer_) == OGRERR_NONE;
}

bool Layer::Put(OGRFeatureH feature) {
  const gdal::FeaturePtr changed(OGR_F_Clone(feature));
  last_.reset();  // it isn't what the file holds
  if (!OpenForUpdate()) return false;
  const Messages messages;
  const bool isPut = OGR_L_SetFeature(layer_, changed.get()) == OGRERR_NONE && Sync();
  if (isPut && !messages.HasError()) return true;
  isDoomed_ = true;
  return messages.Fail(Name());
}

bool Layer::Append(OGRGeometryH geometry) {
  if (!OpenForUpdate()) {
    OGR_G_DestroyGeometry(geometry);
    return false;
  }
  const Messages messages;
  const gdal::FeaturePtr feature(OGR_F_Create(OGR_L_GetLayerDefn(layer_)));
  const bool isPut = OGR_F_SetGeometryDirectly(feature.get(), geometry) == OGRERR_NONE &&
                     OGR_L_CreateFeature(layer_, feature.get()) == OGRERR_NONE && Sync();
  if (isPut && !messages.HasError()) {
    numbers_.push_back(OGR_F_GetFID(feature.get()));
    return true;
  }
  isDoomed_ = true;
  return messages.Fail(Name());
}

}  // namespace lumo::shapefile
