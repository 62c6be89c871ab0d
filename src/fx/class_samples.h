#pragma once

#include <string>
#include <vector>

#include "foundation/run_controls.h"
#include "geometry/geometry.h"
#include "regions/scan_rules.h"

namespace lumo {

/// Samples of known classes out of a vector file.
struct ClassSamples {
  GeometryPtr shapes;                ///< on a map
  std::vector<std::string> classes;  ///< the name of the class of each
};

/// Where samples are, and which.
struct SampleSource {
  std::string path;
  std::string layer;  ///< by its name or its number from 0; the first when empty
  std::string where;  ///< FIELD=VALUE of those that count; all when empty
  std::string field;  ///< with the class
};

/// Reads samples; those without a shape or a class are left out. False, with the fault set, which
/// names the file, when there is none.
VEXG_EXPORT bool ReadClassSamples(const SampleSource& source, const IPC& ipc,
                                  ClassSamples& samples);

/// How samples become pixels: those whose centre a polygon holds, those that a line goes through,
/// and the pixel of a point.
VEXG_EXPORT ScanOptions SampleScan();

/// Gives each of some names of classes once, in order: numbers by value, in front of texts.
VEXG_EXPORT std::vector<std::string> OrderClassNames(std::vector<std::string> names);

}  // namespace lumo
