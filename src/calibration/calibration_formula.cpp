#include "calibration/calibration_formula.h"

#include <algorithm>
#include <cmath>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

constexpr std::size_t kValuesAtOnce = 1024;  // 8 KiB of values, and as much of each constant

// The digits of pi that the two places have; they differ on purpose.
constexpr double kPiOfFormula = 3.141592653589;
constexpr double kPiOfDegrees = 3.141592653589793;

VEXG_VECTOR_CLONES
void ComputeRadiance(double* values, std::size_t count, const double* gains, const double* offsets,
                     double scale) {
  for (std::size_t i = 0; i < count; ++i) {
    const double r = values[i] * gains[i] + offsets[i];
    values[i] = scale * (r > 0.0 ? r : 0.0);
  }
}

VEXG_VECTOR_CLONES
void ComputeReflectance(double* values, std::size_t count, const double* gains,
                        const double* offsets, const double* divisors, double distance,
                        double scale) {
  for (std::size_t i = 0; i < count; ++i) {
    const double r = values[i] * gains[i] + offsets[i];
    const double reflectance = (r * kPiOfFormula * distance * distance * scale) / divisors[i];
    values[i] = r > 0.0 ? reflectance : 0.0;
  }
}

class RadianceFormula final : public CalibrationFormula {
 public:
  RadianceFormula(const Array<double>& gains, const Array<double>& offsets, double scale)
      : CalibrationFormula(gains, offsets), scale_(scale) {}

 private:
  void Compute(double* values, std::size_t count) const override {
    ComputeRadiance(values, count, Gains(), Offsets(), scale_);
  }

  const double scale_;
};

class ReflectanceFormula final : public CalibrationFormula {
 public:
  ReflectanceFormula(const Array<double>& gains, const Array<double>& offsets,
                     const Array<double>& solarIrradiance, double sunElevationDegrees,
                     double earthSunDistance, double scale)
      : CalibrationFormula(gains, offsets),
        divisors_(Repeat(solarIrradiance)),
        distance_(earthSunDistance),
        scale_(scale) {
    const double sine = std::sin(sunElevationDegrees * kPiOfDegrees / 180.0);
    for (double& divisor : divisors_) divisor = sine * divisor;
  }

 private:
  void Compute(double* values, std::size_t count) const override {
    ComputeReflectance(values, count, Gains(), Offsets(), divisors_.data(), distance_, scale_);
  }

  std::vector<double> divisors_;
  const double distance_;
  const double scale_;
};

VEXG_VECTOR_CLONES
void ComputeRescaled(double* values, std::size_t count, const double* gains, const double* offsets,
                     double sine, double scale) {
  for (std::size_t i = 0; i < count; ++i) {
    const double r = values[i] * gains[i] + offsets[i];
    values[i] = r > 0.0 ? r * scale / sine : 0.0;
  }
}

class RescaledReflectanceFormula final : public CalibrationFormula {
 public:
  RescaledReflectanceFormula(const Array<double>& gains, const Array<double>& offsets,
                             double sunElevationDegrees, double scale)
      : CalibrationFormula(gains, offsets),
        sine_(std::sin(sunElevationDegrees * kPiOfDegrees / 180.0)),
        scale_(scale) {}

 private:
  void Compute(double* values, std::size_t count) const override {
    ComputeRescaled(values, count, Gains(), Offsets(), sine_, scale_);
  }

  const double sine_;
  const double scale_;
};

class TemperatureFormula final : public CalibrationFormula {
 public:
  TemperatureFormula(const Array<double>& gains, const Array<double>& offsets,
                     const Array<double>& k1, const Array<double>& k2, double scale, double shift)
      : CalibrationFormula(gains, offsets),
        k1_(Repeat(k1)),
        k2_(Repeat(k2)),
        scale_(scale),
        shift_(shift),
        ofNone_(shift == 0.0 ? 0.0 : shift * scale) {}

 private:
  void Compute(double* values, std::size_t count) const override {
    for (std::size_t i = 0; i < count; ++i) {
      const double r = values[i] * Gains()[i] + Offsets()[i];
      values[i] = r > 0.0 ? (k2_[i] / std::log(k1_[i] / r + 1.0) + shift_) * scale_ : ofNone_;
    }
  }

  const std::vector<double> k1_;
  const std::vector<double> k2_;
  const double scale_;
  const double shift_;
  const double ofNone_;  // the result for 0 K
};

}  // namespace

CalibrationFormula::CalibrationFormula(const Array<double>& gains, const Array<double>& offsets)
    : bands_(gains.GetCount()),
      pixelsAtOnce_(std::max<std::size_t>(1, kValuesAtOnce / std::max(1u, gains.GetCount()))),
      gains_(Repeat(gains)),
      offsets_(Repeat(offsets)) {}

std::vector<double> CalibrationFormula::Repeat(const Array<double>& ofBands) const {
  std::vector<double> values;
  values.reserve(pixelsAtOnce_ * ofBands.GetCount());
  for (std::size_t pixel = 0; pixel < pixelsAtOnce_; ++pixel) {
    values.insert(values.end(), ofBands.begin(), ofBands.end());
  }
  return values;
}

void CalibrationFormula::Apply(double* values, std::size_t pixels) const {
  while (pixels != 0) {
    const std::size_t now = std::min(pixels, pixelsAtOnce_);
    Compute(values, now * bands_);
    values += now * bands_;
    pixels -= now;
  }
}

std::unique_ptr<CalibrationFormula> MakeRadianceFormula(const Array<double>& gains,
                                                        const Array<double>& offsets,
                                                        double scale) {
  return std::make_unique<RadianceFormula>(gains, offsets, scale);
}

std::unique_ptr<CalibrationFormula> MakeReflectanceFormula(const Array<double>& gains,
                                                           const Array<double>& offsets,
                                                           const Array<double>& solarIrradiance,
                                                           double sunElevationDegrees,
                                                           double earthSunDistance, double scale) {
  return std::make_unique<ReflectanceFormula>(gains, offsets, solarIrradiance, sunElevationDegrees,
                                              earthSunDistance, scale);
}

std::unique_ptr<CalibrationFormula> MakeTemperatureFormula(const Array<double>& gains,
                                                           const Array<double>& offsets,
                                                           const Array<double>& k1,
                                                           const Array<double>& k2, double scale,
                                                           double shift) {
  return std::make_unique<TemperatureFormula>(gains, offsets, k1, k2, scale, shift);
}

std::unique_ptr<CalibrationFormula> MakeRescaledReflectanceFormula(const Array<double>& gains,
                                                                   const Array<double>& offsets,
                                                                   double sunElevationDegrees,
                                                                   double scale) {
  return std::make_unique<RescaledReflectanceFormula>(gains, offsets, sunElevationDegrees, scale);
}

}  // namespace lumo
