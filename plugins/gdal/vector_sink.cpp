#include "vector_sink.h"

#include <algorithm>
#include <bit>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <cstring>
#include <filesystem>
#include <ogr_api.h>

#include "data/access_policy.h"
#include "foundation/text_case.h"
#include "gdal_common/coordsys.h"
#include "gdal_common/messages.h"
#include "gdal_common/shape_geometry.h"
#include "gdal_common/source.h"
#include "platform/file_moves.h"
#include "platform/temporary_file.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using gdal::DatasetPtr;
using gdal::FailWith;
using gdal::Messages;

static_assert(std::endian::native == std::endian::little, "shapes are handed over little-endian");

/// A format of GDAL in which files of records are made.
struct SinkFormat {
  const char* ending;
  const char* driver;
  std::vector<const char*> options;  // of the layer
  bool hasLayers = false;            // a file may hold several
};

const std::vector<SinkFormat>& SinkFormats() {
  static const std::vector<SinkFormat> formats{
      {".gpkg", "GPKG", {}, true},
      {".fgb", "FlatGeobuf", {}},
      {".geojson", "GeoJSON", {}},
      {".geojsons", "GeoJSONSeq", {}},
      {".geojsonl", "GeoJSONSeq", {}},
      {".shp", "ESRI Shapefile", {"ENCODING=UTF-8"}},
      {".csv", "CSV", {"GEOMETRY=AS_WKT", "CREATE_CSVT=YES"}}};
  return formats;
}

const SinkFormat* FindSinkFormat(const std::string& path) {
  const std::string ending = LowerCase(fs::path(path).extension().string());
  for (const SinkFormat& format : SinkFormats()) {
    if (ending == format.ending) return &format;
  }
  return nullptr;
}

OGRFieldType TypeOf(VectorFieldType type) {
  return type == VectorFieldType::kInteger ? OFTInteger64
         : type == VectorFieldType::kReal  ? OFTReal
                                           : OFTString;
}

/// Settings of GDAL for this thread while it lives: what is made here is no file of anybody's until
/// it is whole, so SQLite need not see to it that a crash leaves it so; and it reads and writes
/// through GDAL's files, which note why a call fails.
class Settings {
 public:
  Settings() {
    CPLSetThreadLocalConfigOption("OGR_SQLITE_SYNCHRONOUS", "OFF");
    CPLSetThreadLocalConfigOption("OGR_SQLITE_JOURNAL", "OFF");
    CPLSetThreadLocalConfigOption("SQLITE_USE_OGR_VFS", "YES");
  }
  ~Settings() {
    CPLSetThreadLocalConfigOption("OGR_SQLITE_SYNCHRONOUS", nullptr);
    CPLSetThreadLocalConfigOption("OGR_SQLITE_JOURNAL", nullptr);
    CPLSetThreadLocalConfigOption("SQLITE_USE_OGR_VFS", nullptr);
  }
  Settings(const Settings&) = delete;
  Settings& operator=(const Settings&) = delete;
};

/// The shape of a record in the well-known binary form.
class ShapeBytes {
 public:
  /// @param isMulti  all polygons become multipolygons, as a layer of these needs.
  const std::vector<unsigned char>& Make(const VectorRecord& record, bool isMulti) {
    bytes_.clear();
    switch (record.geometry) {
      case VectorGeometry::kPoint:
        PutHead(wkbPoint);
        PutVertices(record, 0, std::min<std::size_t>(record.coordinates.size() / 2, 1));
        break;
      case VectorGeometry::kLine:
        PutHead(wkbLineString);
        Put(static_cast<std::uint32_t>(record.coordinates.size() / 2));
        PutVertices(record, 0, record.coordinates.size() / 2);
        break;
      default:
        PutPolygons(record, isMulti);
    }
    return bytes_;
  }

 private:
  template <typename T>
  void Put(T value) {
    const std::size_t at = bytes_.size();
    bytes_.resize(at + sizeof(value));
    std::memcpy(bytes_.data() + at, &value, sizeof(value));
  }

  void PutHead(OGRwkbGeometryType type) {
    bytes_.push_back(1);  // little-endian
    Put(static_cast<std::uint32_t>(type));
  }

  void PutVertices(const VectorRecord& record, std::size_t begin, std::size_t end) {
    const std::size_t at = bytes_.size(), size = (end - begin) * 2 * sizeof(double);
    bytes_.resize(at + size);
    if (size != 0) std::memcpy(bytes_.data() + at, record.coordinates.data() + 2 * begin, size);
  }

  void PutPolygons(const VectorRecord& record, bool isMulti) {
    const std::size_t parts = record.partEnds.size();
    const auto outer =
        static_cast<std::uint32_t>(std::count(record.holes.begin(), record.holes.end(), 0));
    if (outer > 1 || isMulti) {
      PutHead(wkbMultiPolygon);
      Put(outer);
    }
    for (std::size_t part = 0; part < parts;) {
      std::size_t end = part + 1;
      while (end < parts && record.holes[end] != 0) ++end;
      PutHead(wkbPolygon);
      Put(static_cast<std::uint32_t>(end - part));
      for (; part < end; ++part) {
        const std::uint32_t begin = part != 0 ? record.partEnds[part - 1] : 0;
        Put(record.partEnds[part] - begin);
        PutVertices(record, begin, record.partEnds[part]);
      }
    }
  }

  std::vector<unsigned char> bytes_;
};

/// The file is made in a folder of its own beside its place, under its own name, which some formats
/// write into it.
class GdalVectorSink final : public VectorRecordSink {
 public:
  GdalVectorSink(const std::string& path, const SinkFormat& format)
      : path_(path), format_(format) {}
  ~GdalVectorSink() override {
    feature_.reset();
    const Messages unheard;
    dataset_.reset();
    std::error_code ignored;
    if (!folder_.empty()) fs::remove_all(folder_, ignored);
  }

  bool Begin(const VectorLayer& layer);
  bool Write(const VectorRecord& record) override;
  bool Close() override;
  bool NextLayer(const VectorLayer& layer) override;

 private:
  void Commit();
  bool MakeLayer(const VectorLayer& layer);
  bool SetShape(const VectorRecord& record);
  bool SetValues(const VectorRecord& record);
  bool TakePlace() const;
  std::string WorkName() const { return (fs::path(folder_) / fs::path(path_).filename()).string(); }

  /// The fault in the user's words. False, to be returned.
  bool Fail(const Messages& messages) {
    isFailed_ = true;
    std::string why = messages.Text();
    for (std::size_t at = 0; (at = why.find(folder_ + "/", at)) != std::string::npos;) {
      why.replace(at, folder_.size() + 1, "");
    }
    return FailWith(path_, why.empty() ? "can't be written" : why);
  }

  const std::string path_;
  const SinkFormat& format_;
  std::string folder_;
  DatasetPtr dataset_;
  OGRLayerH layer_ = nullptr;
  gdal::FeaturePtr feature_;
  ShapeBytes shape_;
  bool hasShapes_ = true;
  bool isMulti_ = false;
  bool isFailed_ = false;
};

bool GdalVectorSink::Begin(const VectorLayer& layer) {
  std::error_code fault;
  folder_ = platform::TemporaryFolderBeside(path_);
  if (!fs::create_directory(folder_, fault)) {
    folder_.clear();
    return FailWith(path_, fault.message());
  }
  const Settings settings;
  const Messages messages;
  dataset_.reset(GDALCreate(GDALGetDriverByName(format_.driver), WorkName().c_str(), 0, 0, 0,
                            GDT_Unknown, nullptr));
  if (dataset_ == nullptr || !MakeLayer(layer) || messages.HasError()) return Fail(messages);
  GDALDatasetStartTransaction(dataset_.get(), FALSE);  // where the format has them
  feature_.reset(OGR_F_Create(OGR_L_GetLayerDefn(layer_)));
  return feature_ != nullptr;
}

bool GdalVectorSink::MakeLayer(const VectorLayer& layer) {
  CPLStringList options;
  hasShapes_ = layer.hasShapes;
  isMulti_ = layer.isMulti && layer.geometry == VectorGeometry::kPolygon;
  if (hasShapes_) {
    for (const char* const option : format_.options) options.AddString(option);
  } else {
    options.AddString("STRING_QUOTING=IF_NEEDED");  // of a table alone, for those who read it
  }
  OGRSpatialReferenceH const system = gdal::MakeSpatialReference(layer.coordSys);
  layer_ = GDALDatasetCreateLayer(dataset_.get(), layer.name.c_str(), system,
                                  !hasShapes_ ? wkbNone
                                  : isMulti_  ? wkbMultiPolygon
                                              : gdal::LayerTypeOf(layer.geometry),
                                  options.List());
  if (system != nullptr) OSRRelease(system);
  if (layer_ == nullptr) return false;
  for (const VectorField& field : layer.fields) {
    OGRFieldDefnH const made = OGR_Fld_Create(field.name.c_str(), TypeOf(field.type));
    const bool isMade = OGR_L_CreateField(layer_, made, TRUE) == OGRERR_NONE;
    OGR_Fld_Destroy(made);
    if (!isMade) return false;
  }
  return true;
}

bool GdalVectorSink::SetValues(const VectorRecord& record) {
  const int count = OGR_F_GetFieldCount(feature_.get());
  for (int i = 0; i < count; ++i) {
    const auto at = static_cast<std::size_t>(i);
    if (at >= record.values.size() || record.values[at].index() == 0) {
      OGR_F_SetFieldNull(feature_.get(), i);
    } else if (const auto* whole = std::get_if<std::int64_t>(&record.values[at])) {
      OGR_F_SetFieldInteger64(feature_.get(), i, *whole);
    } else if (const auto* real = std::get_if<double>(&record.values[at])) {
      OGR_F_SetFieldDouble(feature_.get(), i, *real);
    } else {
      OGR_F_SetFieldString(feature_.get(), i, std::get<std::string>(record.values[at]).c_str());
    }
  }
  return true;
}

/// Gives the feature the shape of a record; none to one without parts.
bool GdalVectorSink::SetShape(const VectorRecord& record) {
  if (!hasShapes_) return true;
  OGRGeometryH shape = nullptr;
  if (!record.partEnds.empty()) {
    const std::vector<unsigned char>& bytes = shape_.Make(record, isMulti_);
    if (OGR_G_CreateFromWkb(bytes.data(), nullptr, &shape, static_cast<int>(bytes.size())) !=
        OGRERR_NONE) {
      return false;
    }
  }
  return OGR_F_SetGeometryDirectly(feature_.get(), shape) == OGRERR_NONE;
}

bool GdalVectorSink::Write(const VectorRecord& record) {
  if (isFailed_ || dataset_ == nullptr) return false;
  const Messages messages;
  if (!SetShape(record)) return Fail(messages);
  SetValues(record);
  OGR_F_SetFID(feature_.get(), record.id < 0 ? OGRNullFID : record.id);
  if (OGR_L_CreateFeature(layer_, feature_.get()) != OGRERR_NONE || messages.HasError()) {
    return Fail(messages);
  }
  return true;
}

bool GdalVectorSink::Close() {
  if (dataset_ == nullptr || isFailed_) return false;
  const Settings settings;
  const Messages messages;
  Commit();
  dataset_.reset();
  if (messages.HasError()) return Fail(messages);
  return TakePlace();
}

void GdalVectorSink::Commit() {
  feature_.reset();
  if (GDALDatasetTestCapability(dataset_.get(), ODsCTransactions) != 0) {
    GDALDatasetCommitTransaction(dataset_.get());
  }
}

bool GdalVectorSink::NextLayer(const VectorLayer& layer) {
  if (dataset_ == nullptr || isFailed_) return false;
  if (!format_.hasLayers) return FailWith(path_, "a file of this format holds one layer");
  const Settings settings;
  const Messages messages;
  Commit();
  if (!MakeLayer(layer) || messages.HasError()) return Fail(messages);
  GDALDatasetStartTransaction(dataset_.get(), FALSE);
  feature_.reset(OGR_F_Create(OGR_L_GetLayerDefn(layer_)));
  return feature_ != nullptr;
}

/// Moves the files into their places, the one that was asked for last.
bool GdalVectorSink::TakePlace() const {
  const fs::path main = fs::path(path_).filename();
  std::error_code fault;
  std::vector<fs::path> made;
  for (fs::directory_iterator at(folder_, fault), end; !fault && at != end; at.increment(fault)) {
    if (at->path().filename() != main) made.push_back(at->path().filename());
  }
  if (fault) return FailWith(path_, fault.message());
  made.push_back(main);
  for (const fs::path& name : made) {
    std::string why;
    const std::string place = (fs::path(path_).parent_path() / name).string();
    if (!platform::RenameFile((fs::path(folder_) / name).string(), place, &why)) {
      return FailWith(path_, why);
    }
  }
  return true;
}

}  // namespace

std::vector<std::string> VectorSinkEndings() {
  std::vector<std::string> endings;
  for (const SinkFormat& format : SinkFormats()) endings.emplace_back(format.ending);
  return endings;
}

VectorRecordSinkPtr CreateVectorSink(const std::string& path, const VectorLayer& layer) {
  const SinkFormat* const format = FindSinkFormat(path);
  if (format == nullptr) {
    FailWith(path, "the ending is of no vector format that can be written here");
    return {};
  }
  if (!MayReachFile(path, true)) return {};
  std::error_code ignored;
  const std::string absolute = fs::absolute(path, ignored).string();
  auto* const sink = new GdalVectorSink(absolute, *format);
  const VectorRecordSinkPtr made(sink);
  return sink->Begin(layer) ? made : VectorRecordSinkPtr();
}

}  // namespace lumo
