#include "gdal_world_file.h"

#include <cpl_string.h>
#include <filesystem>

namespace lumo::gdal {

namespace fs = std::filesystem;

std::string WorldName(const std::string& path) {
  const std::string ending = fs::path(path).extension().string();
  if (ending.size() < 3) return path + ".wld";
  const std::string letters{ending[0], ending[1], ending.back(), 'w'};
  return fs::path(path).replace_extension(letters).string();
}

std::string WorldText(const RasterDef& def) {
  if (!def.geoRef || def.geoRef->GetType() == GeoRef::kRpc) return {};
  const double samples = def.samples, lines = def.lines;
  double x = 0, y = 0, right[2] = {}, below[2] = {}, middle[2] = {};
  const bool isGrid = def.geoRef->PixelToMap(0, 0, x, y) &&
                      def.geoRef->PixelToMap(samples, 0, right[0], right[1]) &&
                      def.geoRef->PixelToMap(0, lines, below[0], below[1]) &&
                      def.geoRef->PixelToMap(0.5, 0.5, middle[0], middle[1]);
  if (!isGrid) return {};
  std::string text;
  for (const double number :
       {(right[0] - x) / samples, (right[1] - y) / samples, (below[0] - x) / lines,
        (below[1] - y) / lines, middle[0], middle[1]}) {
    char line[40];
    CPLsnprintf(line, sizeof line, "%.15g\n", number);
    text += line;
  }
  return text;
}

}  // namespace lumo::gdal
