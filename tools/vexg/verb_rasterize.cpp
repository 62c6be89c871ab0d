#include <optional>

#include <CLI/CLI.hpp>

#include "option_values.h"
#include "raster_verb.h"
#include "shape_options.h"

namespace lumo::host {
namespace {

class RasterizeVerb final : public RasterVerb {
 public:
  explicit RasterizeVerb(CLI::App& app) {
    app.footer(
        "Where shapes overlap, the last one shows. Lines are drawn a pixel wide, points are the "
        "pixel that they lie in. Shapes of another coordinate system are carried to the raster's; "
        "without one they lie on its map.\n"
        "Example: vexg rasterize parcels.gpkg crops.tif --like scene.tif --field crop\n");
    shapes_.AddTo(app);
    AddOutputTo(app, "The raster of shapes");
    app.add_option("--like", GetSource().file, "A raster whose grid it gets")
        ->type_name("RASTER")
        ->required();
    CLI::Option* const value =
        app.add_option("--value", value_, "Value of all shapes; 1 by default")->type_name("N");
    app.add_option("--field", field_, "Field of numbers that are their values")
        ->type_name("NAME")
        ->excludes(value);
    CLI::Option* const background =
        app.add_option("--background", background_, "Value of the pixels outside; 0 by default")
            ->type_name("N");
    app.add_option("--no-data", noData_, "Value of the pixels outside, which are not valid")
        ->type_name("N")
        ->excludes(background);
    app.add_option("--type", type_, "Pixel type; the smallest that holds all values by default")
        ->type_name("TYPE")
        ->transform(PixelTypeName());
  }

 private:
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

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& /*opened*/,
                        const RasterInfo& source) override {
    return source;
  }

  ShapeOptions shapes_;
  std::optional<double> value_, background_, noData_;
  std::string field_, type_;
};

const VerbRegistration registration("rasterize", "Draws the shapes of a vector file into a raster",
                                    &SetUp<RasterizeVerb>);

}  // namespace
}  // namespace lumo::host
