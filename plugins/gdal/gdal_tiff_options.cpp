#include "gdal_tiff_options.h"

#include <algorithm>
#include <string>

#include "raster/pixel_types.h"

namespace lumo::gdal {
namespace {

/// The lines of strips that are large enough to be packed well.
std::string StripLines(const RasterDef& def, bool byPixel) {
  constexpr double kStripBytes = 256 << 10;
  const double row = BytesOf(def) / def.lines / (byPixel ? 1 : def.bands);
  return std::to_string(std::clamp(static_cast<unsigned>(kStripBytes / row), 1U, def.lines));
}

}  // namespace

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
    if (IsPacked(def)) options.SetNameValue("BLOCKYSIZE", StripLines(def, byPixel).c_str());
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
