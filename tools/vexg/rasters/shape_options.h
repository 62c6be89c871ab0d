#pragma once

#include <string>

#include "jobs/raster_job.h"
#include "options/option.h"

namespace lumo::host {

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
