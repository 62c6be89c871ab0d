#include <limits>

#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "rasters/calibration_steps.h"
#include "rasters/raster_verb.h"

namespace lumo::host {
namespace {

void AddConstant(OptionSet& line, const char* name, std::vector<double>& values,
                 const char* meaning) {
  line.Add(name, values, meaning).Shows("V[,V...]");
}

class CalibrateVerb final : public RasterVerb {
 public:
  explicit CalibrateVerb(OptionSet& line) {
    line.Add("quantity", request_.quantity, "radiance, reflectance or temperature")
        .Takes(OneOf({"radiance", "reflectance", "temperature"}))
        .Required();
    AddFilesTo(line, "The calibrated raster");
    line.AddNote(
        "Constants are one value for each band, or one for all. Radiance is DN * gain + offset, 0 "
        "where that is below 0; reflectance is that at the top of the atmosphere; temperature is "
        "that of a black body, in kelvins or degrees Celsius. The result is --scale times as "
        "large. Pixels "
        "that are not valid stay so; in a result of Single or Double they are NaN.");
    line.AddExample(
        "vexg calibrate reflectance scene.tif reflectance.tif --gain 0.76,0.8,0.62 --offset "
        "-1.5,-2.8,-1.2 --irradiance 1970,1843,1555 --sun-elevation 49.6 --distance 1.012");
    line.AddExample(
        "vexg calibrate temperature LC08_B10.TIF kelvin.tif --from-metadata LC08_MTL.txt");
    AddAreaTo(line);
    line.Add("--from-metadata", request_.metadata,
             "Takes what isn't given here from the metadata of this file, and says what it "
             "took")
        .Shows("FILE|FORMAT:FILE");
    line.Add("--metadata-bands", metadataBands_,
             "Which bands of the metadata those of the raster are, where their names don't tell it")
        .Shows("B[,B...]");
    AddConstant(line, "--gain", request_.gain, "Factor on the digital numbers");
    AddConstant(line, "--offset", request_.offset, "Added to them then");
    AddConstant(line, "--irradiance", request_.irradiance,
                "Solar irradiance outside the atmosphere, in the unit of radiance (reflectance)");
    AddConstant(
        line, "--reflectance-gain", request_.reflectanceGain,
        "In the place of --gain, --irradiance and --distance: factor that makes reflectance "
        "times the sine of --sun-elevation (reflectance)");
    AddConstant(line, "--reflectance-offset", request_.reflectanceOffset,
                "Added then (reflectance)");
    line.Add("--sun-elevation", request_.sunElevation,
             "Of the sun above the horizon, in degrees (reflectance)")
        .Shows("DEG")
        .Takes(NumberWithUnit({"degrees", "degree", "deg", "\u00b0"}));
    line.Add("--distance", request_.distance,
             "From the earth to the sun, in astronomical units (reflectance)")
        .Shows("AU")
        .Takes(NumberWithUnit({"astronomical units", "au", "ua"}));
    AddConstant(line, "--k1", request_.k1, "First thermal constant (temperature)");
    AddConstant(line, "--k2", request_.k2, "Second thermal constant, in kelvins (temperature)");
    line.Add("--unit", request_.unit, "Of the result: kelvin or celsius (temperature)")
        .Takes(OneOf({"kelvin", "celsius"}))
        .ShowsDefault();
    line.Add("--scale", request_.scale, "Factor on the result").ShowsDefault();
    line.Add("--type", request_.type, "Pixel type of the result")
        .Takes(EightTypeName())
        .ShowsDefault();
  }

 private:
  bool HasMetadata() const { return !request_.metadata.empty(); }

  void CheckOptions() override {
    if (!metadataBands_.empty()) request_.metadataBands = SplitList(metadataBands_);
    request_.RefuseUseless();
    if (HasMetadata()) {
      metadata_ = ParseMetadataSource(request_.metadata);
    } else {
      request_.CheckConstants();
    }
    RasterVerb::CheckOptions();
  }

  std::vector<std::string> GetFurtherInputs() const override {
    return HasMetadata() ? std::vector{metadata_.file} : std::vector<std::string>();
  }

  void AddQuestions(JobDraft& draft) const override {
    if (HasMetadata()) AddConstants(draft, request_, metadata_, "$source");
  }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& opened,
                        const RasterInfo& source) override {
    if (HasMetadata()) {
      const std::vector<std::string> taken = TakeConstants(request_, opened);
      request_.CheckConstants();
      for (const std::string& line : taken) Say(line);
    }
    request_.CheckScale();
    RasterInfo planned = source;
    planned.dataType = request_.TypeCode();
    bands_ = planned.bands;
    return planned;
  }

  const char* GetKeptDetails() const override { return "Names"; }

  void AddToCreate(JobDraft& /*draft*/, JobWriterCommand& create) const override {
    create.AddInput("DataType", DataTypeName(request_.TypeCode()));
  }

  void AddMaking(JobDraft& draft, const Making& making) const override {
    AddCalibration(draft, kMakeStep, request_, making.shown, bands_);
  }

  /// The value is NaN for a floating-point type, which no result can be, else the source's unless
  /// another one is chosen.
  FillValues GetNoData(const FillValues& chosen) const override {
    if (!request_.IsReal()) return chosen;
    return FillValues(bands_, std::numeric_limits<double>::quiet_NaN());
  }

  RasterContents ReadWanted(const JobResults& results) const override {
    RasterContents wanted = RasterVerb::ReadWanted(results);
    wanted.info.dataType = request_.TypeCode();
    std::erase_if(wanted.details, [](const std::string& detail) {
      return detail.find("/Description=") == detail.npos;
    });
    if (request_.IsReal()) wanted.valid.clear();  // no pixel with data is NaN: nothing to compare
    return wanted;
  }

  void Compare(MadeRaster& raster, Losses& losses) const override {
    // The source's are of another quantity.
    raster.put.info.hasNoData = raster.made.info.hasNoData;
    raster.isFilled = true;
    CompareKept(raster, losses);
  }

  CalibrationRequest request_;
  std::string metadataBands_;
  MetadataSource metadata_;
  unsigned bands_ = 0;
};

const VerbRegistration calibrateRegistration(
    "calibrate", "Turns digital numbers into radiance, reflectance or temperature",
    &SetUp<CalibrateVerb>);

}  // namespace
}  // namespace lumo::host
