#include "views/derived_raster.h"

#include <algorithm>

#include "raster/raster_details.h"

namespace lumo {
namespace {

/// Calls `body(RasterPtr<S>)` for a raster of TenTypes.
template <typename Body>
void VisitTyped(const BasicRasterPtr& raster, const Body& body) {
  if (!raster) return;
  DispatchType(TenTypes{}, raster->DataType(), [&]<typename S>() {
    body(RasterPtr<S>(raster));
    return true;
  });
}

}  // namespace

template <typename T>
void DerivedRaster<T>::Describe(const std::vector<std::string>& bandNames) {
  def_ = rasters_.front()->GetRasterDef();
  def_.dataType = kDataTypeOf<T>;
  def_.bands = static_cast<unsigned>(bandNames.size());
  def_.noData.clear();
  for (const std::string& name : DetailNames(def_.metadata)) {
    if (name.starts_with("Bands/") || name.starts_with("Items/")) {
      def_.metadata.Remove(DetailPath(name));
    }
  }
  for (unsigned band = 0; band < def_.bands; ++band) {
    const std::string& name = bandNames[band];
    if (name.empty()) continue;
    def_.metadata.Set(BandDetailPath(band, "Description"), String(name));
  }
}

template <typename T>
bool DerivedRaster<T>::IsValid() const {
  return Object::IsValid() && def_.bands != 0 &&
         std::all_of(rasters_.begin(), rasters_.end(),
                     [](const auto& raster) { return raster->IsValid(); });
}

template <typename T>
bool DerivedRaster<T>::PyramidExists() const {
  return def_.bands != 0 && std::all_of(rasters_.begin(), rasters_.end(),
                                        [](const auto& raster) { return raster->PyramidExists(); });
}

template <typename T>
PyramidDef DerivedRaster<T>::GetPyramidDef() const {
  if (!PyramidExists()) return {};
  PyramidDef common = rasters_.front()->GetPyramidDef();
  for (const BasicRasterPtr& raster : rasters_) {
    const PyramidDef def = raster->GetPyramidDef();
    common.levelMin = std::max(common.levelMin, def.levelMin);
    common.levelMax = std::min(common.levelMax, def.levelMax);
  }
  common.levelMin = std::min(common.levelMin, common.levelMax);
  return common;
}

template <typename T>
RasterPtr<T> DerivedRaster<T>::PyramidLevel(unsigned level) {
  if (def_.bands == 0) return {};
  std::vector<BasicRasterPtr> levels;
  for (const BasicRasterPtr& raster : rasters_) {
    BasicRasterPtr reduced;
    VisitTyped(raster,
               [&](const auto& typed) { reduced = BasicRasterPtr(typed->PyramidLevel(level)); });
    if (!reduced) return {};
    levels.push_back(reduced);
  }
  const RasterPtr<T> view = MakeOn(levels);
  return view->IsValid() ? view : RasterPtr<T>();
}

template <typename T>
void DerivedRaster<T>::SetTileDimensions(const lumo::TileDimensions& tiles) {
  for (const BasicRasterPtr& raster : rasters_) {
    if (raster) raster->SetTileDimensions(tiles);
  }
}

template <typename T>
lumo::TileDimensions DerivedRaster<T>::TileDimensions() const {
  return def_.bands != 0 ? rasters_.front()->TileDimensions() : lumo::TileDimensions();
}

template <typename T>
std::uint64_t DerivedRaster<T>::WriteCount() const {
  std::uint64_t writes = 0;  // no sum comes twice, since none of them ever falls
  for (const BasicRasterPtr& raster : rasters_) {
    VisitTyped(raster, [&](const auto& typed) { writes += typed->WriteCount(); });
  }
  return writes;
}

VEXG_INSTANCES(EIGHT, DerivedRaster);

}  // namespace lumo
