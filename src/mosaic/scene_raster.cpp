#include "mosaic/scene_raster.h"

#include <filesystem>

#include <fmt/format.h>

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "data/file_uri.h"
#include "foundation/fault.h"
#include "pyramid/exact_levels.h"
#include "raster/pixel_value.h"
#include "raster/raster_details.h"
#include "views/sources/catalog_raster_ref.h"
#include "views/sources/file_state.h"

namespace lumo {
namespace {

/// Opens a source of this process.
/// @param geoRef  in place of its own, which it need not find out then; may be empty.
DataConnectionPtr Connect(const Array<String>& strings, SceneThread thread,
                          const GeoRefPtr& geoRef = {}) {
  DataManager& manager = GetGlobalDataManager();
  if (thread == SceneThread::kOwn) return manager.Connect(strings, geoRef, MetadataPtr());
  return MayUseSource(strings, false) ? manager.ConnectDirect(strings, GeoRefPtr(), MetadataPtr())
                                      : DataConnectionPtr();
}

/// The grid of a scene, without its coordinate system: the source need not find that out, which
/// takes longer than all else, since the header has it.
GeoRefPtr PlaceOf(const MosaicScene& scene) {
  const GeoRefPtr place = CloneOf(scene.header.geoRef);
  if (!place || place->GetType() != GeoRef::kStd) return {};
  place->SetDimensions(0, 0);
  place->SetCoordinateSystem(CoordSys());
  return place;
}

/// Opens a scene by the format that its header names, or else in whatever format it is.
DataConnectionPtr ConnectScene(const MosaicScene& scene, SceneThread thread) {
  const Array<String> strings = ConnStringsOf(scene);
  const bool isNamed = FindFormatName(strings).GetLength() != 0;
  if (!isNamed && FindFormat(String(scene.header.format)) != nullptr) {
    const GeoRefPtr place = thread == SceneThread::kOwn ? PlaceOf(scene) : GeoRefPtr();
    const bool isTiff = place && scene.header.format == "TIFF";
    Array<String> keyed{ArrayDims(strings.GetCount() + (isTiff ? 2 : 1))};
    keyed[0] = String(scene.header.format);
    std::copy(strings.begin(), strings.end(), keyed.begin() + 1);
    if (isTiff) keyed[keyed.GetCount() - 1] = "GEOREF_SOURCES=NONE";  // read whether needed or not
    const DataConnectionPtr source = Connect(keyed, thread, place);
    if (source) return source;
    TakeFault();
  }
  return Connect(strings, thread);
}

/// The pyramid file beside a scene, where it is of the scene as that is now.
DataConnectionPtr ConnectPyramidOf(const MosaicScene& scene, const DataConnectionPtr& source,
                                   SceneThread thread) {
  const std::string path = scene.file + ".pyr";
  std::error_code fault;
  if (!scene.options.empty() || !std::filesystem::is_regular_file(path, fault)) return {};
  const DataConnectionPtr pyramid = Connect(ConnStrings({"Pyramid", String(path)}), thread);
  TakeFault();
  const RasterDataConnectionPtr raster(source), levels(pyramid);
  return raster && levels && FindMismatch(*raster, *levels).empty() ? pyramid : DataConnectionPtr();
}

bool IsEightType(unsigned dataType) {
  return DispatchType(EightTypes{}, dataType, []<typename T>() { return true; });
}

/// True when the raster is what the header of a scene says.
bool Fits(const BasicRaster& raster, const MosaicSceneHeader& header) {
  return raster.Samples() == header.samples && raster.Lines() == header.lines &&
         raster.Bands() == header.bands && raster.DataType() == header.dataType;
}

/// The scene at the front of a fault, unless that names it.
std::string Blame(const std::string& file, const std::string& fault) {
  return fault.find(file) != fault.npos ? fault : file + ": " + fault;
}

}  // namespace

std::string SceneFileOf(const String& key) {
  std::string file = PathOfFileURI(URI(key));
  file.resize(std::min(file.find("//scene"), file.size()));
  return file;
}

BasicRasterPtr OpenScene(const MosaicScene& scene, SceneThread thread) {
  TakeFault();
  const DataConnectionPtr source = ConnectScene(scene, thread);
  if (!source) {
    SetFault(Blame(scene.file, TakeFaultOr("can't be opened").ToUTF8()));
    return {};
  }
  BasicRasterPtr raster = MakeReaderRaster(source, ConnectPyramidOf(scene, source, thread));
  if (raster && !IsEightType(raster->DataType())) {
    SetFault(fmt::format("{}: pixels of type {} are in no mosaic", scene.file,
                         DataTypeName(raster->DataType()).ToUTF8()));
    raster = BasicRasterPtr();
  }
  return raster;
}

bool ReadSceneHeader(const BasicRaster& raster, const MosaicScene& scene, MosaicSceneHeader& header,
                     std::string& fault) {
  const RasterDef def = raster.GetRasterDef();
  header = {};
  header.samples = raster.Samples();
  header.lines = raster.Lines();
  header.bands = raster.Bands();
  header.dataType = raster.DataType();
  header.tileWidth = def.tileWidth;
  header.tileHeight = def.tileHeight;
  header.interleave = def.interleave;
  header.format = FindFormat(def.format) != nullptr ? def.format.ToUTF8() : std::string();
  const PyramidDef levels = raster.GetPyramidDef();
  if (raster.PyramidExists() && levels.levelMax != 0) {
    header.levelMin = levels.levelMin;
    header.levelMax = levels.levelMax;
  }
  for (unsigned band = 0; band < header.bands; ++band) {
    if (raster.HasPalette(band)) header.palettes.push_back(band);
  }
  constexpr std::size_t kLongest = 1U << 16U;  // longer ones are for the scenes to tell
  for (const std::string& name : DetailNames(def.metadata)) {
    const std::string text = FindDetail(def.metadata, DetailPath(name));
    const bool isOfBand = name.starts_with("Bands/") && !name.ends_with("/NoDataValue");
    if (isOfBand && text.size() <= kLongest) header.details[name] = text;
  }
  header.noData.resize(header.bands);
  for (const auto& [band, value] : def.noData) {
    if (band < header.bands && raster.HasNoDataValue(band)) header.noData[band] = value;
  }
  header.geoRef = CloneOf(def.geoRef);
  header.state = StateOfScene(scene);
  if (!header.geoRef) {
    fault = scene.file + ": the raster has no geo-reference";
    return false;
  }
  if (header.geoRef->CoordinateSystem().IsEmpty()) {
    fault = scene.file + ": the raster has no coordinate system";
    return false;
  }
  header.geoRef->SetDimensions(header.samples, header.lines);
  return true;
}

template <typename T>
SceneRaster<T>::SceneRaster(const MosaicScene& scene, unsigned number,
                            std::shared_ptr<OpenScenes> open)
    : scene_(scene), number_(number), open_(std::move(open)) {
  const MosaicSceneHeader& header = scene_.header;
  def_.samples = header.samples;
  def_.lines = header.lines;
  def_.bands = header.bands;
  def_.dataType = header.dataType;
  def_.tileWidth = header.tileWidth;
  def_.tileHeight = header.tileHeight;
  def_.interleave = header.interleave;
  for (unsigned band = 0; band < header.noData.size(); ++band) {
    if (header.noData[band]) def_.noData[band] = *header.noData[band];
  }
  def_.SetGeoRef(header.geoRef);
  for (const auto& [name, text] : header.details) {
    def_.metadata.Set(DetailPath(name), String(text));
  }
}

template <typename T>
SceneRaster<T>::SceneRaster(const SceneRaster& base, unsigned level)
    : scene_(base.scene_), number_(base.number_), level_(level), open_(base.open_) {
  const RasterPtr<T> source = Source();
  if (!source) return;
  def_ = source->GetRasterDef();
  if (def_.geoRef && def_.geoRef->CoordinateSystem().IsEmpty()) {
    def_.geoRef->SetCoordinateSystem(scene_.header.geoRef->CoordinateSystem());
  }
  def_.samples = source->Samples();
  def_.lines = source->Lines();
  def_.bands = source->Bands();
}

/// The open source, or its level.
template <typename T>
RasterPtr<T> SceneRaster<T>::Source() const {
  const BasicRasterPtr opened = open_->Get(number_, [this]() -> BasicRasterPtr {
    BasicRasterPtr raster = OpenScene(scene_);
    if (raster && !Fits(*raster, scene_.header)) {
      SetFault(scene_.file + ": the raster has another size, bands or pixel type by now");
      raster = BasicRasterPtr();
    }
    return raster;
  });
  const RasterPtr<T> source(opened);
  if (!source || level_ == 0) return source;
  const ExactLevels exactly(true);
  return source->PyramidLevel(level_);
}

template <typename T>
URI SceneRaster<T>::GetURI() const {
  if (level_ != 0) return this->DefaultURI("SceneRaster");
  std::string text = FileURI(scene_.file).ToUTF8();
  for (const std::string& option : scene_.options) text.append("|").append(option);
  return URI(String(text + "//scene"));
}

template <typename T>
PyramidDef SceneRaster<T>::GetPyramidDef() const {
  PyramidDef def;
  if (!PyramidExists()) return def;
  def.pyramidType = PyramidType::kDriver;
  def.levelMin = scene_.header.levelMin;
  def.levelMax = scene_.header.levelMax;
  return def;
}

template <typename T>
bool SceneRaster<T>::HasNoDataValue(unsigned band) const {
  const auto at = def_.noData.find(band);
  return at != def_.noData.end() && ToPixel<T>(at->second).has_value();
}

template <typename T>
T SceneRaster<T>::NoDataValue(unsigned band) const {
  return HasNoDataValue(band) ? *ToPixel<T>(def_.noData.at(band)) : T();
}

template <typename T>
PalettePtr SceneRaster<T>::Palette(unsigned band) const {
  const RasterPtr<T> source = Source();
  return source ? source->Palette(band) : PalettePtr();
}

template <typename T>
TileDimensions SceneRaster<T>::TileDimensions() const {
  lumo::TileDimensions tiles;
  tiles.width = def_.tileWidth;
  tiles.height = def_.tileHeight;
  return tiles;
}

template <typename T>
RasterPtr<T> SceneRaster<T>::PyramidLevel(unsigned level) {
  if (level == 0 || level_ != 0 || level < scene_.header.levelMin ||
      level > scene_.header.levelMax) {
    return {};
  }
  const RasterPtr<T> shown(new SceneRaster(*this, level));
  return shown->IsValid() ? shown : RasterPtr<T>();
}

template <typename T>
bool SceneRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                Interleave interleave, Array<T>& pixels,
                                Array<unsigned char>& state) {
  const RasterPtr<T> source = Source();
  return source && source->GetSubRect(rect, bands, interleave, pixels, state);
}

VEXG_INSTANCES(EIGHT, SceneRaster);

}  // namespace lumo
