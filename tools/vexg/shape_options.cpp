#include "shape_options.h"

#include <CLI/CLI.hpp>

#include "option_values.h"
#include "raster_source.h"

namespace lumo::host {

void ShapeOptions::AddTo(CLI::App& app) {
  app.add_option("shapes", file, "The file of shapes")->type_name("SHAPES")->required();
  app.add_option("--layer", layer, "A layer of it, by name or number; the first by default")
      ->type_name("NAME|N");
  app.add_option("--where", where, "Only records whose field has this value")
      ->type_name("FIELD=VALUE");
  app.add_option(
         "--rule", rule,
         "Which pixels a polygon has: center, those whose centre lies inside; touched, those "
         "whose area it touches; told, those of the scan of regions, which is inclusive")
      ->transform(OneOf({"told", "center", "touched"}))
      ->capture_default_str();
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
