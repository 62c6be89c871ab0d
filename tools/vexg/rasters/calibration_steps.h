#pragma once

#include <optional>
#include <set>
#include <string>
#include <vector>

#include "jobs/raster_job.h"
#include "rasters/metadata_source.h"

namespace lumo::host {

/// A calibration that a user asks for: of which quantity, and by which constants.
struct CalibrationRequest {
  std::string quantity;                                    ///< radiance, reflectance or temperature
  std::vector<double> gain, offset, irradiance, k1, k2;    ///< for each band, or one for all
  std::vector<double> reflectanceGain, reflectanceOffset;  ///< in the place of the first three
  std::optional<double> sunElevation;                      ///< degrees
  std::optional<double> distance;                          ///< astronomical units
  std::string metadata;                    ///< FILE or FORMAT:FILE; empty: all constants are given
  std::vector<std::string> metadataBands;  ///< the bands of the metadata that those of the raster
                                           ///< are; empty: what tells it is looked for
  std::set<std::string> taken;             ///< the options whose values the metadata gave
  std::vector<std::string> takenBands;     ///< of the metadata, whose values were taken
  std::string doubt;                       ///< why the metadata gave none for bands
  std::string unit = "kelvin";             ///< of temperature: kelvin or celsius
  double scale = 1.0;
  std::string type = "Single";

  /// Refuses constants that the quantity has no use for, by a HostError.
  void RefuseUseless() const;
  /// Throws HostError where constants are missing or give no image; tells of odd ones.
  void CheckConstants() const;
  /// Throws HostError for a scale that the result's type would cut.
  void CheckScale() const;
  /// The type of the result.
  unsigned TypeCode() const;
  /// Whether that is a floating-point type.
  bool IsReal() const;
  /// Whether gains and offsets that make reflectance are used, and not those that make radiance.
  bool UsesReflectances() const;
};

/// Adds the commands that read the constants of metadata.
/// @param raster  a variable: the raster that the constants are for.
void AddConstants(JobDraft& draft, const CalibrationRequest& request, const MetadataSource& source,
                  const String& raster);
/// Takes what isn't given from what the commands of AddConstants said.
/// @return lines for the user that say what was taken.
std::vector<std::string> TakeConstants(CalibrationRequest& request, const JobResults& results);

/// Adds the commands that calibrate what is shown into "$target".
/// @param step   name of the one that takes the time, which also counts the valid pixels.
/// @param bands  of what is shown.
void AddCalibration(JobDraft& draft, const char* step, const CalibrationRequest& request,
                    const String& shown, unsigned bands);

}  // namespace lumo::host
