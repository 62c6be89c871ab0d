#pragma once

#include <algorithm>
#include <cmath>
#include <cstring>

#include "foundation/fault.h"
#include "foundation/type_code.h"
#include "georef/affine_link.h"
#include "mosaic/colour_table.h"
#include "mosaic/mosaic_masks.h"
#include "mosaic/mosaic_raster.h"
#include "mosaic/raster_outline.h"
#include "mosaic/scene_tables.h"
#include "pyramid/exact_levels.h"
#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "raster/pixel_states.h"
#include "raster/pixel_value.h"
#include "raster/raster_details.h"
#include "warp/projected_raster.h"

namespace lumo {

namespace detail {

/// Scenes whose views on the grid are kept.
inline constexpr std::size_t kKeptViews = 32;
/// Side of the squares of the grid that are feathered, each by itself.
inline constexpr unsigned kFeatherSide = 256;

/// The definition of a level of a mosaic: its scenes are the scenes' levels, or the scenes
/// themselves where they have none; the rest is that of the mosaic.
template <typename T>
class LevelMosaicRasterDef final : public MosaicRasterDef<T> {
 public:
  LevelMosaicRasterDef(const MosaicRasterDefPtr<T>& base, const Array<RasterPtr<T>>& levels)
      : MosaicRasterDef<T>(levels, SettingsOf(*base, *base->SideFiles())), base_(base) {}

  std::recursive_mutex& Lock() const override { return base_->Lock(); }
  String SceneKey(unsigned scene) const override { return base_->SceneKey(scene); }
  String TablesInUse() const override { return base_->TablesInUse(); }
  bool IsUpToDate() const override { return base_->IsUpToDate(); }
  bool Keep(std::string& reason) override {
    return base_->Keep(reason) && MosaicRasterDef<T>::Keep(reason);
  }

 private:
  /// The settings, with the files as they were last stored, whatever a command changes now.
  static MosaicSettings SettingsOf(const MosaicRasterDef<T>& base, const MosaicSideFiles& files) {
    const MosaicSettings& given = base.Settings();
    MosaicSettings settings;
    settings.resampling = given.resampling;
    settings.reference = given.reference;
    settings.colourMatchMode = given.colourMatchMode;
    settings.matchFlags = given.matchFlags;
    settings.lutPath = files.lutPath;
    settings.footprints = files.footprints;
    settings.seamFiles = files.seamFiles;
    settings.workingDirectory = given.workingDirectory;
    settings.bins = given.bins;
    settings.featherWidth = given.featherWidth;
    settings.noData = given.noData;
    return settings;
  }

  const MosaicRasterDefPtr<T> base_;
};

/// The whole number next to a shift between two grids of one kind; false when there is none.
inline bool IsWholeShift(double shift, double scale, unsigned size, std::int64_t& whole) {
  constexpr double kNoise = 1e-6;  // pixels
  const double rounded = std::floor(shift + 0.5);
  whole = static_cast<std::int64_t>(rounded);
  return std::abs(shift - rounded) < kNoise && std::abs(scale - 1) * size < kNoise;
}

/// The part of a rectangle between bounds, which may lie anywhere; false when there is none.
inline bool Cut(const SubRect& rect, std::int64_t left, std::int64_t top, std::int64_t right,
                std::int64_t bottom, SubRect& part) {
  left = std::max<std::int64_t>(left, rect.left);
  top = std::max<std::int64_t>(top, rect.top);
  right = std::min<std::int64_t>(right, rect.right);
  bottom = std::min<std::int64_t>(bottom, rect.bottom);
  if (left > right || top > bottom) return false;
  part = {static_cast<unsigned>(left), static_cast<unsigned>(top), static_cast<unsigned>(right),
          static_cast<unsigned>(bottom)};
  return true;
}

}  // namespace detail

template <typename T>
const unsigned MosaicRaster<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("MosaicRaster<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template <typename T>
MosaicRaster<T>::MosaicRaster(const MosaicRasterDefPtr<T>& definition, const RasterDef& grid,
                              const RasterPtr<T>& plain, const URI& uri)
    : ComputedRaster<T>(plain), definition_(definition), def_(grid), uri_(uri) {
  if (definition) {
    for (const RasterPtr<T>& scene : definition->Scenes()) {
      models_.push_back(scene ? CloneOf(scene->GetRasterDef().geoRef) : GeoRefPtr());
    }
  }
  SetUp();
}

template <typename T>
MosaicRaster<T>::MosaicRaster(LevelTag, const MosaicRaster& base,
                              const MosaicRasterDefPtr<T>& definition, const RasterDef& grid,
                              const RasterPtr<T>& stored)
    : definition_(definition),
      def_(grid),
      models_(base.models_),
      scaleX_(double(grid.samples) / base.def_.samples),
      scaleY_(double(grid.lines) / base.def_.lines),
      stored_(stored) {
  SetUp();
}

template <typename T>
MosaicRaster<T>::~MosaicRaster() {
  this->StopComputing();
}

template <typename T>
void MosaicRaster<T>::SetUp() {
  def_.dataType = kDataTypeOf<T>;
  const bool isUsable = definition_ && definition_->SceneCount() != 0 && def_.geoRef &&
                        def_.geoRef->GetType() == GeoRef::kStd && def_.samples != 0 &&
                        def_.lines != 0 && def_.bands != 0;
  if (!isUsable) {
    def_.Clear();
    return;
  }
  def_.SetGeoRef(def_.geoRef);  // of the size
  onGrid_ = std::make_unique<RecentScenes<RasterPtr<T>>>(detail::kKeptViews);
  bool areAllOnGrid = true;
  std::vector<RecordBox> boxes;
  for (const RasterPtr<T>& scene : definition_->Scenes()) {
    const RasterDef def = scene ? scene->GetRasterDef() : RasterDef();
    const Place place = PlaceOf(def);
    if (places_.empty()) AddBandDetails(def_.metadata, 0, def.metadata);
    KeepSharedBandDetails(def_.metadata, def.metadata);
    places_.push_back(place);
    areAllOnGrid = areAllOnGrid && place.isOnGrid;
    if (place.right < place.left || place.bottom < place.top) continue;
    boxes.push_back({static_cast<std::int32_t>(places_.size() - 1),
                     {double(place.left), double(place.top), double(place.right) + 1,
                      double(place.bottom) + 1}});
    if (def_.interleave == Interleave::None) def_.interleave = def.interleave;
    if (def_.tileWidth == 0) {
      def_.tileWidth = std::min(def.tileWidth, def_.samples);
      def_.tileHeight = std::min(def.tileHeight, def_.lines);
      if (def.tileWidth == def.samples) def_.tileWidth = def_.samples;
    }
  }
  definition_->SideFiles();  // as they are before a command changes them
  constexpr unsigned kSquares = 256;
  if (!areAllOnGrid) def_.tileWidth = def_.tileHeight = kSquares;
  index_ = std::make_unique<RecordIndex>(boxes);
}

template <typename T>
typename MosaicRaster<T>::Place MosaicRaster<T>::PlaceOf(const RasterDef& scene) const {
  Place place;
  if (!scene.geoRef) return place;
  const auto link = FindAffineLink(*def_.geoRef, *scene.geoRef);
  if (link) {
    place.isOnGrid = link->xy == 0 && link->yx == 0 &&
                     detail::IsWholeShift(link->x0, link->xx, def_.samples, place.toX) &&
                     detail::IsWholeShift(link->y0, link->yy, def_.lines, place.toY);
  }
  double low[2] = {0, 0}, high[2] = {double(def_.samples), double(def_.lines)};
  if (place.isOnGrid) {
    low[0] = static_cast<double>(-place.toX);
    low[1] = static_cast<double>(-place.toY);
    high[0] = low[0] + scene.samples;
    high[1] = low[1] + scene.lines;
  } else {
    const auto outline = OutlineIn(*def_.geoRef, scene);
    if (outline.size() == 4 * kOutlinePieces) {
      for (const unsigned axis : {0U, 1U}) {
        const auto less = [axis](const auto& a, const auto& b) { return a[axis] < b[axis]; };
        const auto [least, most] = std::ranges::minmax_element(outline, less);
        // Between the points of the outline it may bend.
        const double margin = 2 + 0.01 * ((*most)[axis] - (*least)[axis]);
        low[axis] = std::floor((*least)[axis] - margin);
        high[axis] = std::ceil((*most)[axis] + margin);
      }
    }
  }
  const auto cut = [](double value, unsigned size) {
    return static_cast<std::int64_t>(std::clamp(value, 0.0, double(size)));
  };
  place.left = cut(low[0], def_.samples);
  place.top = cut(low[1], def_.lines);
  place.right = cut(high[0], def_.samples) - 1;
  place.bottom = cut(high[1], def_.lines) - 1;
  return place;
}

template <typename T>
URI MosaicRaster<T>::GetURI() const {
  return uri_.GetLength() != 0 ? uri_ : this->DefaultURI("MosaicRaster");
}

template <typename T>
URI MosaicRaster<T>::PyramidURI() const {
  const auto* const source = dynamic_cast<const SourceRaster*>(this->Parent().Get());
  return source != nullptr ? source->PyramidURI() : URI();
}

template <typename T>
bool MosaicRaster<T>::HasNoDataValue(unsigned band) const {
  const auto at = def_.noData.find(band);
  return at != def_.noData.end() && ToPixel<T>(at->second).has_value();
}

template <typename T>
T MosaicRaster<T>::NoDataValue(unsigned band) const {
  return HasNoDataValue(band) ? *ToPixel<T>(def_.noData.at(band)) : T();
}

template <typename T>
bool MosaicRaster<T>::HasPalette(unsigned band) const {
  return IsValid() && definition_->Scenes()[0]->HasPalette(band);
}

template <typename T>
PalettePtr MosaicRaster<T>::Palette(unsigned band) const {
  return IsValid() ? definition_->Scenes()[0]->Palette(band) : PalettePtr();
}

template <typename T>
TileDimensions MosaicRaster<T>::TileDimensions() const {
  lumo::TileDimensions tiles;
  tiles.width = def_.tileWidth;
  tiles.height = def_.tileHeight;
  return tiles;
}

template <typename T>
std::uint64_t MosaicRaster<T>::WriteCount() const {
  return definition_ ? definition_->Revision() : 0;
}

template <typename T>
std::vector<std::int32_t> MosaicRaster<T>::ScenesIn(const SubRect& rect) const {
  return index_ ? index_->Find(WindowOf(rect)) : std::vector<std::int32_t>();
}

template <typename T>
std::unique_ptr<MosaicMasks> MosaicRaster<T>::MakeMasks() const {
  return std::make_unique<MosaicMasks>(*definition_, *definition_->SideFiles(), models_,
                                       def_.geoRef, scaleX_, scaleY_, kDataTypeOf<T>);
}

// Levels.

template <typename T>
bool MosaicRaster<T>::PyramidExists() const {
  return stored_.IsNull() && (HasPyramidFile() || HaveLevel(0));
}

/// True while a pyramid file shows the mosaic as it is: none does once that has changed.
template <typename T>
bool MosaicRaster<T>::HasPyramidFile() const {
  return definition_ && definition_->Revision() == 0 && ComputedRaster<T>::PyramidExists();
}

/// True when all scenes have a level; level 0 stands for any at all.
template <typename T>
bool MosaicRaster<T>::HaveLevel(unsigned level) const {
  if (!IsValid() || scaleX_ != 1) return false;
  const Array<RasterPtr<T>>& scenes = definition_->Scenes();
  return std::all_of(scenes.begin(), scenes.end(), [&](const RasterPtr<T>& scene) {
    const PyramidDef def = scene ? scene->GetPyramidDef() : PyramidDef();
    return scene && scene->PyramidExists() && def.levelMax != 0 &&
           (level == 0 || (level >= def.levelMin && level <= def.levelMax));
  });
}

template <typename T>
PyramidDef MosaicRaster<T>::GetPyramidDef() const {
  PyramidDef def = ComputedRaster<T>::GetPyramidDef();
  if (HasPyramidFile()) return def;
  def.pyramidType = PyramidType::kNone;
  def.levelMin = def.levelMax = 0;
  if (!HaveLevel(0)) return def;
  def.pyramidType = PyramidType::kDriver;
  def.levelMin = 1;
  def.levelMax = 31;
  for (const RasterPtr<T>& scene : definition_->Scenes()) {
    const PyramidDef own = scene->GetPyramidDef();
    def.levelMin = std::max(def.levelMin, own.levelMin);
    def.levelMax = std::min(def.levelMax, own.levelMax);
    def.resamplingMethod = own.resamplingMethod;
  }
  if (def.levelMin > def.levelMax) {
    def.pyramidType = PyramidType::kNone;
    def.levelMin = def.levelMax = 0;
  }
  return def;
}

template <typename T>
RasterPtr<T> MosaicRaster<T>::PyramidLevel(unsigned level) {
  if (!IsValid() || level == 0 || level > 31) return {};
  const RasterPtr<T> stored =
      HasPyramidFile() ? ComputedRaster<T>::PyramidLevel(level) : RasterPtr<T>();
  const bool haveLevel = HaveLevel(level);
  if (!stored && !haveLevel) return {};
  const ExactLevels exactly(true);
  Array<RasterPtr<T>> scenes{ArrayDims(definition_->SceneCount())};
  for (unsigned i = 0; i < scenes.GetCount(); ++i) {
    const RasterPtr<T>& scene = definition_->Scenes()[i];
    scenes[i] = haveLevel ? scene->PyramidLevel(level) : scene;
    if (!scenes[i]) return {};
  }
  RasterDef grid = def_;
  grid.samples = std::max(1U, def_.samples >> level);
  grid.lines = std::max(1U, def_.lines >> level);
  grid.interleave = Interleave::None;
  grid.tileWidth = grid.tileHeight = 0;
  const double scale = std::ldexp(1.0, static_cast<int>(level));
  grid.geoRef = CloneOf(def_.geoRef);
  grid.geoRef->SetTiePixel(grid.geoRef->TiePixelX() / scale, grid.geoRef->TiePixelY() / scale);
  grid.geoRef->SetPixelSize(grid.geoRef->PixelSizeX() * scale, grid.geoRef->PixelSizeY() * scale);
  grid.SetGeoRef(grid.geoRef);
  const MosaicRasterDefPtr<T> definition(new detail::LevelMosaicRasterDef<T>(definition_, scenes));
  const RasterPtr<T> shown(new MosaicRaster(LevelTag(), *this, definition, grid, stored));
  return shown->IsValid() ? shown : RasterPtr<T>();
}

}  // namespace lumo
