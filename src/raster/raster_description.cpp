#include "raster/raster_description.h"

#include <cmath>

#include <nlohmann/json.hpp>

#include "foundation/color.h"
#include "raster/level_reduction.h"
#include "raster/pixel_types.h"
#include "raster/raster_def.h"
#include "raster/raster_details.h"
#include "raster/raster_storage.h"

namespace lumo {
namespace {

using Json = nlohmann::ordered_json;

/// A number, or one of the words "nan", "inf" and "-inf" that JSON has no numbers for.
Json NumberOf(double value) {
  if (std::isnan(value)) return "nan";
  if (std::isinf(value)) return value > 0 ? "inf" : "-inf";
  return value;
}

/// The no-data value of each band, null for none. Those of 64-bit integers have all their digits in
/// a detail of the band.
Json NoDataOf(const BasicRaster& raster, const RasterDef& def) {
  Json values = Json::array();
  for (unsigned band = 0; band < raster.Bands(); ++band) {
    const auto at = def.noData.find(band);
    if (!raster.HasNoDataValue(band)) {
      values.push_back(nullptr);
      continue;
    }
    const std::string exact = FindDetail(def.metadata, BandDetailPath(band, "NoDataValue"));
    const Json number = Json::parse(exact, nullptr, false);
    values.push_back(number.is_number()       ? number
                     : at != def.noData.end() ? NumberOf(at->second)
                                              : Json());
  }
  return values;
}

Json PaletteOf(const BasicRaster& raster, unsigned band) {
  if (!raster.HasPalette(band)) return nullptr;
  const PalettePtr palette = raster.Palette(band);
  if (!palette) return nullptr;
  Json colors = Json::array();
  for (unsigned i = 0; i < palette->GetCount(); ++i) {
    const ColorPtr color = palette->At(i);
    colors.push_back({color->r, color->g, color->b, color->isNull ? 0 : color->a});
  }
  return colors;
}

Json PalettesOf(const BasicRaster& raster) {
  Json palettes = Json::array();
  for (unsigned band = 0; band < raster.Bands(); ++band) {
    palettes.push_back(PaletteOf(raster, band));
  }
  return palettes;
}

Json PyramidOf(const BasicRaster& raster) {
  if (!raster.PyramidExists()) return nullptr;
  const PyramidDef def = raster.GetPyramidDef();
  const LevelReduction reduction = ReductionOf(def.resamplingMethod);
  const String method = reduction == LevelReduction::kTold ? FormatValue(def.resamplingMethod)
                                                           : FormatValue(reduction);
  return {{"type", FormatValue(def.pyramidType).ToUTF8()},
          {"method", method.ToUTF8()},
          {"min", def.levelMin},
          {"max", def.levelMax}};
}

/// The six numbers of an affine model: x = t0 + t1 * sample + t2 * line, y = t3 + t4 * sample + t5
/// * line, with (0, 0) the upper left corner of the first pixel; null for other models.
Json TransformOf(const GeoRef& model) {
  if (model.GetType() == GeoRef::kRpc || model.PixelSizeX() == 0 || model.PixelSizeY() == 0) {
    return nullptr;
  }
  constexpr double kRadiansPerDegree = 3.14159265358979323846 / 180;
  const double angle = model.Rotation() * kRadiansPerDegree;
  const double cosine = model.Rotation() == 0 ? 1 : std::cos(angle);
  const double sine = model.Rotation() == 0 ? 0 : std::sin(angle);
  const double xx = cosine * model.PixelSizeX(), xy = sine * model.PixelSizeY();
  const double yx = sine * model.PixelSizeX(), yy = -cosine * model.PixelSizeY();
  const double x = model.TiePixelX(), y = model.TiePixelY();
  return {model.TieMapX() - x * xx - y * xy, xx, xy, model.TieMapY() - x * yx - y * yy, yx, yy};
}

Json GeoRefOf(const RasterDef& def) {
  if (!def.geoRef) return nullptr;
  const CoordSys& system = def.geoRef->CoordinateSystem();
  String text;
  system.ToString(text);
  const CoordSysInfo& info = *system.Info();
  return {{"text", FormatValue(def.geoRef).ToUTF8()},
          {"transform", TransformOf(*def.geoRef)},
          {"crs", system.IsEmpty() ? Json() : Json(text.ToUTF8())},
          {"epsg", system.IsEmpty() ? 0 : std::lround(info.value)},
          {"crsName", info.name.ToUTF8()},
          {"isGeographic", system.Type() == 1}};
}

/// How the pixels lie in the file below, where its reader knows.
Json StorageOf(const RasterDef& def) {
  const std::optional<RasterStorage> storage = FindStorage(def.metadata);
  if (!storage) return nullptr;
  return {{"blocks", {storage->blockWidth, storage->blockHeight}},
          {"compression", storage->compression.empty() ? Json() : Json(storage->compression)}};
}

Json DetailsOf(const RasterDef& def) {
  Json details = Json::object();
  for (const std::string& name : DetailNames(def.metadata)) {
    details[name] = FindDetail(def.metadata, DetailPath(name));
  }
  return details;
}

}  // namespace

std::string DescribeRaster(const BasicRaster& raster) {
  const RasterDef def = raster.GetRasterDef();
  const TileDimensions tiles = raster.TileDimensions();
  const Json description{{"uri", raster.GetURI().ToUTF8()},
                         {"samples", raster.Samples()},
                         {"lines", raster.Lines()},
                         {"bands", raster.Bands()},
                         {"type", DataTypeName(raster.DataType()).ToUTF8()},
                         {"code", raster.DataType()},
                         {"interleave", FormatValue(def.interleave).ToUTF8()},
                         {"format", def.format.ToUTF8()},
                         {"tiles", {tiles.width, tiles.height}},
                         {"storage", StorageOf(def)},
                         {"canWrite", raster.CanWrite()},
                         {"noData", NoDataOf(raster, def)},
                         {"palettes", PalettesOf(raster)},
                         {"pyramid", PyramidOf(raster)},
                         {"geoRef", GeoRefOf(def)},
                         {"details", DetailsOf(def)}};
  return description.dump(-1, ' ', false, Json::error_handler_t::replace);
}

}  // namespace lumo
