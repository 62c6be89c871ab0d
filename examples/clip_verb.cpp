// A verb of the command line as a whole: `vexg clip scene.tif out.tif --by fields.gpkg`. In the
// folder tools/vexg/verbs it would be one of vexg; here it makes a host of its own.

#include "rasters/raster_verb.h"

namespace lumo::host {
namespace {

/// Leaves out what lies outside the shapes of a file.
class ClipVerb final : public RasterVerb {
 public:
  explicit ClipVerb(OptionSet& line) : RasterVerb(line, "The clipped raster") {
    line.Add("--by", shapes_, "The shapes").IsFile().Required();
  }

 private:
  std::vector<std::string> GetFurtherInputs() const override { return {shapes_}; }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& /*opened*/,
                        const RasterInfo& source) override {
    return source;  // of the same size, bands and pixel type
  }

  void AddViews(RasterChain& chain) const override {
    JobWriterCommand& region = chain.GetDraft().Open("region", "CreateGeometryROIDefCommand");
    region.AddInput("Vectors", String(AbsoluteName(shapes_)));
    region.AddInput("Coordinates", String("Map"));
    chain.AddView("clipped", "CreateROIRasterCommand").AddVariableInput("ROIDefURI", "$region");
    chain.GetDraft().Close("close.region", "$region");
  }

  std::string shapes_;
};

const VerbRegistration clipVerbRegistration("clip", "Leaves out what is not in shapes",
                                            &SetUp<ClipVerb>);

}  // namespace
}  // namespace lumo::host
