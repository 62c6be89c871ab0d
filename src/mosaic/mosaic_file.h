#pragma once

#include <array>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "georef/georef.h"
#include "platform/export.h"
#include "platform/file_identity.h"
#include "raster/raster_def.h"
#include "raster/raster_enums.h"

namespace lumo {

/// Holds what a definition keeps of the header of a scene, so that the mosaic opens without it.
struct MosaicSceneHeader {
  unsigned samples = 0;
  unsigned lines = 0;
  unsigned bands = 0;
  unsigned dataType = 0;  ///< code
  unsigned tileWidth = 0;
  unsigned tileHeight = 0;
  Interleave interleave = Interleave::None;
  std::string format;     ///< key; the scene is opened by it, or else detected
  unsigned levelMin = 0;  ///< of the pyramid; 0 without one
  unsigned levelMax = 0;
  std::vector<std::optional<double>> noData;  ///< of each band
  std::vector<unsigned> palettes;             ///< numbers of the bands that have one
  std::map<std::string, std::string>
      details;  ///< of the bands: "Bands/0/Unit", see raster_details.h
  GeoRefPtr geoRef;
  std::string state;  ///< of the scene's files, see StateOfScene
};

/// A scene of a definition.
struct MosaicScene {
  std::string file;                  ///< path, or another name of a source
  std::vector<std::string> options;  ///< further pieces of its connection strings, format first
  bool matches = true;               ///< takes part in colour matching
  std::string footprint;             ///< path of its footprint file; empty for none
  std::string seam;                  ///< path of its seam file; empty for none
  MosaicSceneHeader header;
};

/// The content of a definition file. Paths are absolute here, and relative to the file in it.
struct MosaicDocument {
  GeoRefPtr grid;  ///< with its size set
  unsigned bands = 0;
  unsigned dataType = 0;  ///< code
  std::optional<double> noData;
  PyramidResamplingMethod resampling = PyramidResamplingMethod::kNearest;
  double featherWidth = 0;  ///< pixels of the mosaic
  unsigned reference = 0;   ///< number of the scene
  unsigned matchMode = 0;   ///< 0: overlaps, 1: whole scenes
  Form bins = Form::kExact;
  std::string tables;            ///< base of the table files; empty while there are none
  std::string workingDirectory;  ///< ends with the separator
  std::vector<MosaicScene> scenes;
};

/// The name ending of definition files.
inline constexpr const char* kMosaicEnding = ".vmosaic";

/// The connection strings of a scene.
VEXG_EXPORT Array<String> ConnStringsOf(const MosaicScene& scene);

/// The sizes and times of a scene's file, and of the files of levels beside it, in a text. No text
/// when the scene is no file, or there is none.
VEXG_EXPORT std::string StateOfScene(const MosaicScene& scene);

/// True when the file at `path` looks like a definition: it has the ending, and the right word in
/// its first bytes.
VEXG_EXPORT bool IsMosaicFile(const std::string& path);

/// Reads a definition. A text that isn't JSON, breaks off, has a field that isn't known, lacks one
/// or has one that can't be, or a scene twice, is refused.
/// @param fault  [out] one line: the file, the line, and the field.
/// @return false with the fault.
VEXG_EXPORT bool ReadMosaicFile(const std::string& path, MosaicDocument& document,
                                std::string& fault);

/// Puts a definition in the place of the file at `path`, whole or not at all.
/// @param place  the path that it will have once somebody has moved it; `path` when empty.
/// @return false with the fault, one line.
VEXG_EXPORT bool WriteMosaicFile(const std::string& path, const MosaicDocument& document,
                                 std::string& fault, const std::string& place = {});

/// Reads the definition, lets `change` alter it, and puts it in its place, while no other process
/// does the same. A file "<path>.lock" names the process that does; one whose process is gone is
/// taken over.
/// @param change  gives false, with the fault, when there is nothing to store.
VEXG_EXPORT bool UpdateMosaicFile(const std::string& path,
                                  const std::function<bool(MosaicDocument&, std::string&)>& change,
                                  std::string& fault);

}  // namespace lumo
