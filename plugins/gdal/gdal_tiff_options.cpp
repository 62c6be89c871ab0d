#include "gdal_tiff_options.h"

#include <algorithm>
#include <string>

#include "raster/pixel_types.h"
#include "raster/strip_lines.h"

namespace lumo::gdal {
double BytesOf(const RasterDef& def) {
  return 1.0 * def.samples * def.lines * def.bands * DataTypeBytes(def.dataType);
}

bool IsPacked(const RasterDef& def) {
  return def.creation.IsPacked() || def.creation.layout == FileLayout::kCog;
}

const char* BigTiffWord(const RasterDef& def) {
  if (IsPacked(def)) return "YES";  // of the file with the tags
  switch (def.creation.bigTiff) {
    case BigTiffChoice::kAuto:
      return "IF_NEEDED";
    case BigTiffChoice::kYes:
      return "YES";
    case BigTiffChoice::kNo:
      return "NO";
    default:
      return "IF_SAFER";
  }
}

void AddLayout(const RasterDef& def, CPLStringList& options) {
  const bool byPixel = def.interleave == Interleave::BIP || def.interleave == Interleave::BIL;
  options.SetNameValue("INTERLEAVE", byPixel ? "PIXEL" : "BAND");
  if (def.tileWidth <= 1 || def.tileHeight <= 1) {
    const std::uint64_t row =
        std::uint64_t{def.samples} * (byPixel ? def.bands : 1) * DataTypeBytes(def.dataType);
    if (IsPacked(def))
      options.SetNameValue("BLOCKYSIZE", std::to_string(StripLines(def.lines, row)).c_str());
    return;
  }
  static constexpr unsigned kStep = 16, kMaxTile = 4096;  // sides are multiples of 16
  const auto side = [](unsigned size) {
    return std::to_string((std::min(size, kMaxTile) + kStep - 1) / kStep * kStep);
  };
  options.SetNameValue("TILED", "YES");
  options.SetNameValue("BLOCKXSIZE", side(def.tileWidth).c_str());
  options.SetNameValue("BLOCKYSIZE", side(def.tileHeight).c_str());
}

}  // namespace lumo::gdal
