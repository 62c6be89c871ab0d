#pragma once

#include <string>
#include <vector>

#include "calibration/scene_calibration.h"
#include "raster/raster.h"

namespace lumo {

/// Says which bands of a scene the bands of a raster are, or why that isn't known.
struct SceneBands {
  std::vector<std::size_t> bands;  ///< of the scene, for each of the raster; empty: not known
  std::string how;                 ///< what told it, such as "by the name of the file"
  std::string doubt;               ///< why it isn't known
  std::string warning;             ///< what is odd about it; empty for nothing
};

/// Holds the names of a raster that tell which bands it has.
struct BandsOfRaster {
  explicit BandsOfRaster(const BasicRaster& raster);
  BandsOfRaster() = default;

  std::string file;                ///< its name without folders; empty for none
  std::vector<std::string> names;  ///< one for each band; empty where it has none
};

/// Finds the bands of a raster among those of a scene. These tell it, the first that does:
///
/// 1. `chosen`, names of bands of the scene such as "4", "B4", "B04", "8A" or "6_VCID_1".
/// 2. The file's name, of a raster of one band: that of a file of the scene, or one that holds the
///    name of one band, such as "…_B4.TIF".
/// 3. The names of the bands, where each holds the name of one: "B4", "Band 4" or "B04 (665 nm)";
///    but for "Band 1", "Band 2" and so on, which only count.
/// 4. The number of bands: all of the scene, all that have thermal constants, or a set that is
/// usual
///    for the instrument: B1 to B7 of OLI, and B1 to B5 with B7 of TM and ETM.
///
/// @param isThermal  whether thermal constants are wanted.
VEXG_EXPORT SceneBands FindSceneBands(const SceneCalibration& scene, const BandsOfRaster& raster,
                                      const std::vector<std::string>& chosen, bool isThermal);

/// Gives the constants of some bands of a scene, in their order.
VEXG_EXPORT SceneCalibration ChooseSceneBands(const SceneCalibration& scene,
                                              const std::vector<std::size_t>& bands);

}  // namespace lumo
