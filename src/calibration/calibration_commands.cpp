#include "calibration/calibration_process.h"
#include "calibration/value_conversion.h"
#include "foundation/fault.h"
#include "raster/raster_command.h"

namespace lumo {
namespace {

const char* const kGroup = "Calibration";

std::vector<InputDeclaration> Inputs(std::vector<InputDeclaration> own) {
  std::vector<InputDeclaration> inputs{
      {"SourceURI", Presence::kRequired, ValueKind::kURI, "the raster of digital numbers"},
      {"CalibratedURI", Presence::kRequired, ValueKind::kURI,
       "the raster to write, of the same size and bands"},
      {"Gain", Presence::kRequired, ValueKind::kNumberArray, "for each band"},
      {"Offset", Presence::kRequired, ValueKind::kNumberArray, "for each band"}};
  inputs.insert(inputs.end(), own.begin(), own.end());
  inputs.push_back({"ScaleFactor", Presence::kOptional, ValueKind::kNumber,
                    "factor on the result; 1 when absent"});
  return inputs;
}

/// Does the work of all three commands but for the formula.
class CalibrateCommand : public RasterCommand {
 protected:
  CommandResult Execute() final {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SourceURI");
    if (!source) return Fail();
    const BasicRasterPtr target = FindRaster("CalibratedURI");
    if (!target) return Fail();
    bands_ = source->Bands();
    gains_ = ReadOfBands("Gain");
    offsets_ = ReadOfBands("Offset");
    scale_ = HasInput("ScaleFactor") ? Read<double>("ScaleFactor") : 1.0;
    bool known = false;
    const bool done = DispatchType(EightTypes{}, source->DataType(), [&]<typename TIn>() {
      return DispatchType(EightTypes{}, target->DataType(), [&]<typename TOut>() {
        known = true;
        const auto formula = MakeFormula(FromDouble<TOut>(scale_));
        return fits_ && Calibrate(ProcessName(), *formula, RasterPtr<TIn>(source),
                                  RasterPtr<TOut>(target), GetIPC());
      });
    });
    if (!known) return Fail("a raster has a pixel type that can't be calibrated");
    return done ? Succeed() : Fail(TakeFaultOr("the raster could not be calibrated"));
  }

  /// @param scale  the scale factor in the precision of the output.
  virtual std::unique_ptr<CalibrationFormula> MakeFormula(double scale) = 0;
  virtual const char* ProcessName() const = 0;

  /// An array with a value for each band; another one keeps the command from computing.
  Array<double> ReadOfBands(const char* name) {
    auto values = Read<Array<double>>(name);
    if (values.IsValid() && values.GetCount() == bands_) return values;
    if (fits_) {
      SetFault(std::string(name).append(": the raster has ").append(std::to_string(bands_)) +
               " bands, and needs a value for each");
    }
    fits_ = false;
    return Array<double>(ArrayDims(bands_));
  }

  const Array<double>& Gains() const { return gains_; }
  const Array<double>& Offsets() const { return offsets_; }
  double ScaleFactor() const { return scale_; }

 private:
  unsigned bands_ = 0;
  bool fits_ = true;
  Array<double> gains_;
  Array<double> offsets_;
  double scale_ = 1.0;
};

const CommandDeclaration kRadiance{
    "CalibrateRasterRadianceCommand", kGroup, "Computes at-sensor radiance.", Inputs({}), {}};

class CalibrateRasterRadianceCommand final : public CalibrateCommand {
  std::unique_ptr<CalibrationFormula> MakeFormula(double scale) override {
    return MakeRadianceFormula(Gains(), Offsets(), scale);
  }
  const char* ProcessName() const override { return "RasterCalibrateRadianceProcess"; }
};

const CommandFactoryT<CalibrateRasterRadianceCommand> radianceFactory(kRadiance);

const CommandDeclaration kReflectance{
    "CalibrateRasterTOAReflectanceCommand",
    kGroup,
    "Computes top-of-atmosphere reflectance.",
    Inputs(
        {{"SolarIrradiance", Presence::kRequired, ValueKind::kNumberArray, "for each band"},
         {"SunElevation", Presence::kRequired, ValueKind::kNumber, "above the horizon", "degrees"},
         {"EarthSunDistance", Presence::kRequired, ValueKind::kNumber, "on the day",
          "astronomical units"}}),
    {}};

class CalibrateRasterTOAReflectanceCommand final : public CalibrateCommand {
  std::unique_ptr<CalibrationFormula> MakeFormula(double) override {
    return MakeReflectanceFormula(Gains(), Offsets(), ReadOfBands("SolarIrradiance"),
                                  Read<double>("SunElevation"), Read<double>("EarthSunDistance"),
                                  ScaleFactor());
  }
  const char* ProcessName() const override { return "RasterCalibrateTOAReflectanceProcess"; }
};

const CommandFactoryT<CalibrateRasterTOAReflectanceCommand> reflectanceFactory(kReflectance);

const CommandDeclaration kTemperature{
    "CalibrateRasterBrightnessTemperatureCommand",
    kGroup,
    "Computes brightness temperature.",
    Inputs({{"K1", Presence::kRequired, ValueKind::kNumberArray,
             "first thermal constant of each band, in the unit of radiance"},
            {"K2", Presence::kRequired, ValueKind::kNumberArray,
             "second thermal constant of each band", "K"}}),
    {}};

class CalibrateRasterBrightnessTemperatureCommand final : public CalibrateCommand {
  std::unique_ptr<CalibrationFormula> MakeFormula(double scale) override {
    return MakeTemperatureFormula(Gains(), Offsets(), ReadOfBands("K1"), ReadOfBands("K2"), scale);
  }
  const char* ProcessName() const override { return "RasterCalibrateBrightnessTemperatureProcess"; }
};

const CommandFactoryT<CalibrateRasterBrightnessTemperatureCommand> temperatureFactory(kTemperature);

}  // namespace
}  // namespace lumo
