#include "foundation/fault.h"
#include "geometry/raster_to_vector.h"
#include "mosaic/footprint_file.h"
#include "mosaic/pvs_raster.h"
#include "mosaic/scene_border.h"
#include "platform/temporary_file.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

const CommandDeclaration kFootPrints{
    "MosaicFootPrintsCommand",
    "Mosaics",
    "Makes the footprint of a scene: polygons around its valid pixels.",
    {{"RasterURI", Presence::kRequired, ValueKind::kURI, "the scene, of one of eight types"},
     {"Level", Presence::kRequired, ValueKind::kInteger,
      "the pyramid level whose pixels are looked at; 0, and one that there isn't, stand for the "
      "scene itself"},
     {"SmoothParameter", Presence::kRequired, ValueKind::kNumber,
      "how far the outline may lie from the pixels; 0 keeps it", "square pixels"},
     {"VectorMSCFP", Presence::kRequired, ValueKind::kURI, "the footprint file to create"},
     {"NoData", Presence::kOptional, ValueKind::kNumber,
      "pixels that hold it in all bands are outside; those of the scene's own no-data values when "
      "absent"},
     {"Tolerance", Presence::kOptional, ValueKind::kNumber,
      "values so close to no data are outside as well where they touch the outside; 0 when absent",
      "pixel values"},
     {"MaskURI", Presence::kOptional, ValueKind::kURI,
      "a raster of the scene's size; where its first band is 0 or not valid is outside"}},
    {{"Success", ValueKind::kBoolean, "the footprint was made"}}};

class MosaicFootPrintsCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster("RasterURI");
    if (!raster) return Fail();
    bool isDone = false;
    const bool isKnown = DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      isDone = MakeFootprint(RasterPtr<T>(raster));
      return true;
    });
    if (!isKnown) return Fail("RasterURI: a raster of this pixel type has no footprint");
    Write("Success", isDone);
    return isDone ? Succeed() : Fail(TakeFaultOr("the footprint could not be made"));
  }

  /// An input that stands in brackets, or plainly.
  template <typename N>
  N ReadBare(const char* name) const {
    const URI inBrackets = Read<URI>(name);
    return inBrackets.GetLength() != 0 ? ParseValue<N>(inBrackets) : Read<N>(name);
  }

  template <typename T>
  bool MakeFootprint(RasterPtr<T> scene) {
    const auto level = ReadBare<unsigned>("Level");
    const PyramidDef pyramid = scene->GetPyramidDef();
    if (level != 0 && level >= pyramid.levelMin && level <= pyramid.levelMax) {
      scene = scene->PyramidLevel(level);
      if (!scene || !scene->IsValid()) {
        SetFault("Level: the scene's level can't be read");
        return false;
      }
    }
    LabelMaskPtr mask;
    if (!FindMask<T>(scene, mask)) return false;
    const RasterPtr<T> validity(new PVSRaster<T>(scene));
    const URI path(ReadBare<String>("VectorMSCFP"));
    platform::RemoveAbandonedFiles(path.ToUTF8());
    const Pointer<MosaicFootPrintPolygonWriter<T>> writer(new MosaicFootPrintPolygonWriter<T>(
        path, kPolygonBufferSize, ReadBare<float>("SmoothParameter")));
    if (!writer->IsValid()) return false;
    RasterToVectorProcess<T> process(validity, 0, writer, GetIPC());
    process.SetMask(mask);
    const bool hasRun = process.RunProcess(process.kHere);
    const bool isAborted = GetIPC().abort->IsSet();
    if (hasRun && !isAborted) return writer->Close();
    writer->Abandon();
    SetFault(isAborted ? String("the footprint was aborted") : process.GetFault());
    return false;
  }

  /// Finds what is outside besides the scene's own no data: an empty mask when nothing is. False,
  /// with the fault set, when an input doesn't fit.
  template <typename T>
  bool FindMask(const RasterPtr<T>& scene, LabelMaskPtr& mask) {
    if (HasInput("MaskURI")) {
      const BasicRasterPtr raster = FindRaster("MaskURI");
      if (!raster) return false;
      const bool fits = raster->Samples() == scene->Samples() && raster->Lines() == scene->Lines();
      if (fits) mask = MakeLabelMask(raster);
      if (!mask) {
        SetFault(fits ? "MaskURI: a raster of this pixel type can't be a mask"
                      : "MaskURI: the mask has another size than the scene");
        return false;
      }
    }
    SceneBorder border;
    if (HasInput("NoData")) border.noData = Read<double>("NoData");
    if (HasInput("Tolerance")) border.tolerance = Read<double>("Tolerance");
    if (!border.noData && border.tolerance == 0) return true;
    if (!(border.tolerance >= 0)) {
      SetFault("Tolerance: is below 0");
      return false;
    }
    mask = MakeBorderMask(scene, border, mask, GetIPC());
    return bool(mask);
  }
};

const CommandFactoryT<MosaicFootPrintsCommand> mosaicFootPrintsFactory(kFootPrints);

}  // namespace
}  // namespace lumo
