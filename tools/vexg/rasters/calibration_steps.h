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
  std::string quantity;                                  ///< radiance, reflectance or temperature
  std::vector<double> gain, offset, irradiance, k1, k2;  ///< for each band, or one for all
  std::optional<double> sunElevation;                    ///< degrees
  std::optional<double> distance;                        ///< astronomical units
  std::string metadata;         ///< FILE or FORMAT:FILE; empty: all constants are given
  std::set<std::string> taken;  ///< the options whose values the metadata gave
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
};

/// Adds the commands that read the constants of metadata.
void AddConstants(JobDraft& draft, const MetadataSource& source);
/// Takes what isn't given from what the commands of AddConstants said.
/// @return a line for the user that says so.
std::string TakeConstants(CalibrationRequest& request, const JobResults& results);

/// Adds the command that calibrates what is shown into "$target".
/// @param bands  of what is shown.
void AddCalibration(JobDraft& draft, const char* step, const CalibrationRequest& request,
                    const String& shown, unsigned bands);

}  // namespace lumo::host
