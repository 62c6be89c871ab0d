#include "commands/division.h"
#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/attribute_inputs.h"
#include "fx/pixel_attributes_process.h"
#include "fx/region_means_raster.h"
#include "fx/region_pass.h"

namespace lumo {
namespace {

const CommandDeclaration kRegionMeans{
    "FxComputeRegionMeansRasterCommand",
    "Feature extraction",
    "Computes the means of the regions of a label raster, and a raster that shows them.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the image"},
     {"LabelURI", Presence::kRequired, ValueKind::kURI,
      "the labels, of type Int and of the image's size"},
     {"MeansFXA", Presence::kRequired, ValueKind::kText, "the file to create of mean and count"},
     {"MeansURI", Presence::kRequired, ValueKind::kURI,
      "the raster to write, of type Single, with the image's size and bands; label 0 becomes 0"},
     SumsInput()},
    {}};

class FxComputeRegionMeansRasterCommand final : public RegionCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr image = FindImage();
    if (!image) return Fail();
    const BasicRasterPtr labels = FindLabels(image.Get(), false);
    if (!labels) return Fail();
    const BasicRasterPtr output = FindOutput(*image);
    URI uri;
    if (!output || !TakeOutput("MeansFXA", uri)) return Fail();
    LabelCensus census;
    if (!census.Run(labels, Share(1))) return Fail();
    means_.Reset(new RegionMeansFile(uri, image->Bands()));
    const bool isDone = means_->IsValid() &&
                        DispatchType(EightTypes{}, image->DataType(),
                                     [&]<typename T>() {
                                       return ComputeMeans<T>(RasterPtr<T>(image), labels, census);
                                     }) &&
                        Apply(labels, RasterPtr<float>(output)) && means_->Close();
    return isDone ? Succeed() : FailWithout("the means could not be computed", SumsForm());
  }

  BasicRasterPtr FindOutput(const BasicRaster& image) {
    BasicRasterPtr output = FindRaster("MeansURI");
    if (!output) return {};
    if (output.Get() == &image) {
      SetFault("SrcURI and MeansURI are the same raster");
    } else if (output->DataType() != kDataTypeOf<float>) {
      SetFault("MeansURI: the raster is not of type Single");
    } else if (!output->CanWrite()) {
      SetFault("MeansURI: the raster can't be written");
    } else if (output->Samples() != image.Samples() || output->Lines() != image.Lines() ||
               output->Bands() != image.Bands()) {
      SetFault("MeansURI: the raster has another size or number of bands than the image");
    } else {
      return output;
    }
    return {};
  }

  /// A report of so many of the five parts of the work that follow.
  IPC Share(double parts) const {
    return {GetIPC().abort,
            ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, 5, parts))};
  }

  template <typename T>
  bool ComputeMeans(const RasterPtr<T>& image, const BasicRasterPtr& labels,
                    const LabelCensus& census) {
    if (SumsForm() == Form::kExact) {
      RegionPassPlan plan;
      plan.means = means_;
      return RegionPass<T>(image, labels, census, plan).Run(Share(2));
    }
    RegionMeansComputeProcess<T> process(image, labels, means_, Share(2));
    return HasRun(process);
  }

  bool Apply(const BasicRasterPtr& labels, const RasterPtr<float>& output) {
    ApplyRegionMeansProcess process(labels, means_, output, Share(2));
    return HasRun(process);
  }

  Pointer<RegionMeansFile> means_;
};

const CommandFactoryT<FxComputeRegionMeansRasterCommand> fxComputeRegionMeansRasterFactory(
    kRegionMeans);
const DivisionRegistration fxComputeRegionMeansRasterDivision(
    {.command = "FxComputeRegionMeansRasterCommand", .makes = {"MeansFXA"}});

}  // namespace
}  // namespace lumo
