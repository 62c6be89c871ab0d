#pragma once

#include <optional>
#include <string>
#include <vector>

#include "options/option.h"

namespace lumo::host {

/// Holds what the command line says of a mosaic that is to be made.
struct MosaicCreationOptions {
  std::string grid;  // coordinate system, or a raster
  std::optional<double> pixelSize;
  std::string reference;               // scene, by its name or number
  std::vector<std::string> unmatched;  // scenes that keep their colours
  std::string matchBy = "overlaps";
  std::string resampling = "nearest";
  double feather = 0;
  std::optional<double> noData;
  std::string workingDirectory;
  std::string asset;

  /// Declares the options.
  void AddTo(OptionSet& line);
};

/// Holds what the command line says of footprints.
struct MosaicFootprintOptions {
  std::optional<double> noData;
  double tolerance = 0;
  double smooth = 3.1;
  std::string mask;
  bool again = false;

  /// Declares the options.
  void AddTo(OptionSet& line);
};

}  // namespace lumo::host
