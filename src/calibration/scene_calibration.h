#pragma once

#include <optional>
#include <vector>

#include "metadata/metadata.h"

namespace lumo {

/// Holds what calibration needs of the metadata of a scene. Fields that these lack are empty; what
/// they lack for some bands only is NaN for those.
struct SceneCalibration {
  std::vector<String> bandNames;           ///< of the bands below, in their order; may be empty
  std::vector<double> gains;               ///< radiance of one count, W/(m2 sr um)
  std::vector<double> offsets;             ///< radiance of count 0, W/(m2 sr um)
  std::vector<double> irradiances;         ///< of the sun at 1 astronomical unit, W/(m2 um)
  std::vector<double> reflectanceGains;    ///< reflectance of one count; see isSunIn
  std::vector<double> reflectanceOffsets;  ///< reflectance of count 0
  std::vector<double> k1;                  ///< first thermal constants, W/(m2 sr um)
  std::vector<double> k2;                  ///< second thermal constants, K
  std::optional<double> sunElevation;      ///< degrees above the horizon
  std::optional<double> earthSunDistance;  ///< on the day, astronomical units
  bool isSunIn = false;  ///< the elevation of the sun is in the reflectances; else they are to be
                         ///< divided by its sine

  std::vector<String> bandFiles;  ///< the names of the files of the bands; empty where not told
  String instrument;              ///< such as "OLI_TIRS"; empty unless metadata describe each band
  String fault;  ///< why the pixels of the scene are no counts that the constants are for
};

/// Reads metadata as Metadata::Open leaves them; see docs/metadata.md for the paths. Bands come in
/// the order in which the metadata list them, or, where these name a selection, in its order.
VEXG_EXPORT SceneCalibration ReadSceneCalibration(const Metadata& metadata);

/// Gives the radiances of counts of a scene whose metadata have reflectances alone:
/// L = rho E sin(elevation) / (pi d^2), by the definition of reflectance. Nothing changes where
/// radiances are there already, or something is missing.
VEXG_EXPORT void DeriveRadiances(SceneCalibration& scene);

/// The distance between earth and sun at a time, in astronomical units, to within 0.0001 for the
/// years 1900 to 2100: R = 1.00014 - 0.01671 cos g - 0.00014 cos 2g, with the mean anomaly
/// g = 357.529 + 0.98560028 D degrees and D the days since 2000-01-01 12:00 (U.S. Naval
/// Observatory, Computing Approximate Solar Coordinates).
/// @param time  in UTC: "2010-04-01T12:00:00.5Z", or no more than its date.
/// @return nothing for a text that is no such time.
VEXG_EXPORT std::optional<double> EarthSunDistance(const String& time);

}  // namespace lumo
