#include "rasters/shape_options.h"

#include <filesystem>

#include "options/option_values.h"
#include "rasters/raster_source.h"

namespace lumo::host {

LayerName SplitLayer(const std::string& text) {
  const auto isThere = [](const std::string& file) {
    std::error_code ignored;
    return std::filesystem::exists(file, ignored);
  };
  const std::size_t colon = text.rfind(':');
  if (colon == text.npos || isThere(text) || !isThere(text.substr(0, colon))) return {text, {}};
  return {text.substr(0, colon), text.substr(colon + 1)};
}

void ShapeOptions::AddTo(OptionSet& line) {
  line.Add("shapes", file, "The file of shapes").IsFile("SHAPES").Required();
  line.Add("--layer", layer, "A layer of it, by name or number; the first by default")
      .Shows("NAME|N");
  line.Add("--where", where, "Only records whose field has this value").Shows("FIELD=VALUE");
  line.Add("--rule", rule,
           "Which pixels a polygon has: center, those whose centre lies inside; touched, those "
           "whose area it touches; told, those of the scan of regions, which is inclusive")
      .Takes(OneOf({"told", "center", "touched"}))
      .ShowsDefault();
}

void ShapeOptions::AddInputs(JobWriterCommand& command) const {
  command.AddInput("Vectors", String(AbsoluteName(file)));
  if (!layer.empty()) command.AddInput("Layer", String(layer));
  if (!where.empty()) command.AddInput("Where", String(where));
  command.AddInput("Pixels", String(rule == "told"     ? "Told"
                                    : rule == "center" ? "Center"
                                                       : "Touched"));
  command.AddInput("ScanRules", String("Steady"));
  command.AddInput("Coordinates", String("Map"));
}

}  // namespace lumo::host
