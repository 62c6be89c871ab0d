#include <optional>

#include "options/option_values.h"
#include "rasters/raster_verb.h"
#include "rasters/shape_options.h"

namespace lumo::host {
namespace {

class RasterizeVerb final : public RasterVerb {
 public:
  explicit RasterizeVerb(OptionSet& line) {
    line.AddNote(
        "Where shapes overlap, the last one shows. Lines are drawn a pixel wide, points are the "
        "pixel that they lie in. Shapes of another coordinate system are carried to the raster's; "
        "without one they lie on its map.");
    line.AddExample("vexg rasterize parcels.gpkg crops.tif --like scene.tif --field crop");
    shapes_.AddTo(line);
    AddOutputTo(line, "The raster of shapes");
    line.Add("--like", GetSource().file, "A raster whose grid it gets").IsFile("RASTER").Required();
    line.Add("--value", value_, "Value of all shapes; 1 by default").Shows("N");
    line.Add("--field", field_, "Field of numbers that are their values").Shows("NAME");
    line.Add("--background", background_, "Value of the pixels outside; 0 by default").Shows("N");
    line.Add("--no-data", noData_, "Value of the pixels outside, which are not valid").Shows("N");
    line.Add("--type", type_, "Pixel type; the smallest that holds all values by default")
        .Shows("TYPE")
        .Takes(EightTypeName());
  }

 private:
  void CheckOptions() override {
    if (value_ && !field_.empty()) {
      throw HostError(kExitUsage, "--value and --field exclude each other");
    }
    if (background_ && noData_) {
      throw HostError(kExitUsage, "--background and --no-data exclude each other");
    }
    RasterVerb::CheckOptions();
  }

  std::vector<std::string> GetFurtherInputs() const override { return {shapes_.file}; }

  void AddSource(RasterChain& chain) const override {
    AddOpen(chain.GetDraft(), "like", GetSource());
    chain.Take("like");
    JobWriterCommand& raster = chain.GetDraft().Open("shapes", "RasterizeCommand");
    raster.AddVariableInput("LikeURI", "$like");
    shapes_.AddInputs(raster);
    if (value_) raster.AddInput("Value", *value_);
    if (!field_.empty()) raster.AddInput("Field", String(field_));
    if (background_) raster.AddInput("Background", *background_);
    if (noData_) raster.AddInput("NoData", *noData_);
    if (!type_.empty()) raster.AddInput("DataType", String(type_));
    chain.Take("shapes");
  }

  std::string GetOverviewMethod() const override { return "Nearest"; }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& /*opened*/,
                        const RasterInfo& source) override {
    return source;
  }

  ShapeOptions shapes_;
  std::optional<double> value_, background_, noData_;
  std::string field_, type_;
};

const VerbRegistration rasterizeRegistration("rasterize",
                                             "Draws the shapes of a vector file into a raster",
                                             &SetUp<RasterizeVerb>);

}  // namespace
}  // namespace lumo::host
