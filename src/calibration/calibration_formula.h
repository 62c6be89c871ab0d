#pragma once

#include <cstddef>
#include <memory>
#include <vector>

#include "foundation/array.h"

namespace lumo {

/// A formula that makes physical values out of digital numbers, band by band. Values are double;
/// r = v * gain + offset of the band is the radiance behind the value v.
///
/// Threads: Apply may be called on many threads at once.
class VEXG_EXPORT CalibrationFormula {
 public:
  virtual ~CalibrationFormula() = default;

  /// Computes pixels with all their bands, pixel-interleaved, in place.
  void Apply(double* values, std::size_t pixels) const;

  /// How many bands it has constants for.
  unsigned Bands() const { return bands_; }
  /// Pixels that it works on best at once, so that they stay in the cache.
  std::size_t PixelsAtOnce() const { return pixelsAtOnce_; }

 protected:
  CalibrationFormula(const Array<double>& gains, const Array<double>& offsets);

  /// The constants of the bands again and again, one for each value of PixelsAtOnce() pixels.
  std::vector<double> Repeat(const Array<double>& ofBands) const;

  const double* Gains() const { return gains_.data(); }
  const double* Offsets() const { return offsets_.data(); }

 private:
  /// Computes up to PixelsAtOnce() pixels, which are `count` values.
  virtual void Compute(double* values, std::size_t count) const = 0;

  unsigned bands_;
  std::size_t pixelsAtOnce_;
  std::vector<double> gains_;
  std::vector<double> offsets_;
};

/// At-sensor radiance: S * max(r, 0).
/// @param scale  S, in the precision of the output.
VEXG_EXPORT std::unique_ptr<CalibrationFormula> MakeRadianceFormula(const Array<double>& gains,
                                                                    const Array<double>& offsets,
                                                                    double scale);

/// Top-of-atmosphere reflectance: S * pi * r * d^2 / (E * sin(elevation)); 0 where r isn't above 0
/// (Chander, Markham and Helder 2009, Remote Sensing of Environment 113, equation 2).
/// @param solarIrradiance  E of each band, in the unit of r times steradian.
/// @param sunElevationDegrees  above the horizon.
/// @param earthSunDistance     d, astronomical units.
VEXG_EXPORT std::unique_ptr<CalibrationFormula> MakeReflectanceFormula(
    const Array<double>& gains, const Array<double>& offsets, const Array<double>& solarIrradiance,
    double sunElevationDegrees, double earthSunDistance, double scale);

/// Top-of-atmosphere reflectance out of counts that are scaled as reflectance: S * r /
/// sin(elevation); 0 where r isn't above 0 (USGS, Landsat 8-9 Data Users Handbook, LSDS-1574,
/// section 5).
/// @param sunElevationDegrees  above the horizon; 90 where r is the reflectance already.
VEXG_EXPORT std::unique_ptr<CalibrationFormula> MakeRescaledReflectanceFormula(
    const Array<double>& gains, const Array<double>& offsets, double sunElevationDegrees,
    double scale);

/// Brightness temperature: S * (K2 / ln(K1 / r + 1) + shift), with 0 in place of the temperature
/// where r isn't above 0 (the source of reflectance, equation 3).
/// @param k1     of each band, in the unit of r.
/// @param k2     of each band, kelvin.
/// @param scale  S, in the precision of the output.
/// @param shift  from kelvins to the unit of the result: 0, or -273.15 for degrees Celsius.
VEXG_EXPORT std::unique_ptr<CalibrationFormula> MakeTemperatureFormula(
    const Array<double>& gains, const Array<double>& offsets, const Array<double>& k1,
    const Array<double>& k2, double scale, double shift = 0.0);

}  // namespace lumo
