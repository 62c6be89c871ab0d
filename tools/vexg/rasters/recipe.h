#pragma once

#include <optional>
#include <string>
#include <vector>

#include "rasters/attribute_steps.h"
#include "rasters/calibration_steps.h"
#include "rasters/class_steps.h"
#include "rasters/json_file.h"
#include "rasters/segment_steps.h"

namespace lumo::host {

/// How a scene becomes a map of classes, as a JSON file tells it; resources/schemas has
/// recipe.schema.json for it. Names of files in it start from its folder.
struct Recipe {
  std::optional<CalibrationRequest> calibration;
  std::string calibrationPlace;  ///< where it stands, for messages
  SegmentRequest segments;
  bool keepsTree = false;                 ///< the tree of the segments is one of the results
  std::optional<JsonField> segmentBands;  ///< all when absent
  AttributeRequest attributes;
  std::optional<JsonField> attributeBands;
  ClassRequest classes;            ///< without names of classes where they come from samples
  std::optional<JsonField> rules;  ///< where there are no samples
  std::vector<std::string> used;   ///< attributes that examples are compared by; all when empty
  std::optional<JsonField> use;    ///< where they stand
  std::vector<std::pair<std::string, JsonField>> colors;  ///< of some classes of samples
  std::string polygons;                                   ///< name of a file; empty for none
  SampleSet check;  ///< samples to compare the map with; none without a file

  std::string classFile;  ///< with the rules or the samples; empty where rules stand here
};

/// Reads a recipe. Throws HostError, which names the line.
Recipe ReadRecipe(const std::string& file);

/// The bands that a list names, all for none. Throws HostError for one that the raster lacks.
Array<unsigned> BandsOf(const std::optional<JsonField>& list, unsigned bands);

}  // namespace lumo::host
