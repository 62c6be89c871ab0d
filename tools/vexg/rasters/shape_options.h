#pragma once

#include <string>

#include "jobs/raster_job.h"
#include "options/option.h"

namespace lumo::host {

/// A file of shapes, and a layer of it.
struct LayerName {
  std::string file;
  std::string layer;  ///< empty where none is named
};

/// Splits FILE:LAYER; a file that is there needs no layer.
LayerName SplitLayer(const std::string& text);

/// Shapes as the command line names them.
struct ShapeOptions {
  std::string file;
  std::string layer;
  std::string where;
  std::string rule = "center";

  /// Adds the file of shapes, and the options that choose among them.
  void AddTo(OptionSet& line);
  /// Gives a command its inputs "Vectors", "Layer", "Where", "Pixels", "ScanRules" and
  /// "Coordinates".
  void AddInputs(JobWriterCommand& command) const;
};

}  // namespace lumo::host
