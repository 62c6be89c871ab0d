#include "foundation/fault.h"
#include "regions/roi_def.h"
#include "views/masked_raster.h"
#include "views/no_data_raster.h"
#include "views/roi_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"
#include "views/view_command.h"

// The commands that say which pixels of a raster count: by a mask, a region, or no-data values. The
// rasters and masks that they make stay in the catalog with count 1.

namespace lumo {
namespace {

const CommandDeclaration kMask{
    "CreateRasterMaskCommand",
    "Views",
    "Makes a mask of the pixels of a raster that have one of some values.",
    {SourceInput(),
     {"MaskBands", Presence::kRequired, ValueKind::kIntegerArray,
      "the bands whose values are looked at, from 0"},
     {"MaskValues", Presence::kRequired, ValueKind::kText,
      "an array of arrays, one for each of MaskBands, such as 1:2 [1:2 [0 255]  1:1 [7] ]: the "
      "values that are marked"},
     {"Inversed", Presence::kOptional, ValueKind::kBoolean,
      "whether each plane marks what has none of its values; there is a plane for each band of the "
      "raster, and one that marks a pixel is enough; not when absent"}},
    {{"URI", ValueKind::kURI, "the mask"}}};

class CreateRasterMaskCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    RasterMaskPtr mask;
    const bool isMade = DispatchType(EightTypes{}, source->DataType(), [&]<typename T>() {
      Array<RasterMaskDef<T>> defs;
      if (!ReadDefs(*source, defs)) return false;
      mask.Reset(new RasterMask(RasterPtr<T>(source), defs, GetIPC()));
      return true;
    });
    if (!isMade) return Fail(TakeFaultOr("SrcURI: there is no mask of this pixel type"));
    if (GetIPC().abort->IsSet()) return Fail("the making of the mask was aborted");
    if (!mask->IsValid()) return Fail(TakeFaultOr("the pixels could not be read"));
    mask->SetInversed(Read<bool>("Inversed"));
    CatalogAdd(mask);
    Write("URI", mask->GetURI());
    return Succeed();
  }

  template <typename T>
  bool ReadDefs(const BasicRaster& source, Array<RasterMaskDef<T>>& defs) const {
    const auto bands = Read<Array<unsigned>>("MaskBands");
    const auto values = Read<Array<Array<T>>>("MaskValues");
    if (bands.GetCount() != 0 && !CheckBands(source, bands)) return false;
    if (!bands.IsValid() || !values.IsValid()) {
      SetFault(bands.IsValid() ? "MaskValues: the text is no array of arrays of such pixels"
                               : "MaskBands: the text is no array of bands");
      return false;
    }
    if (bands.GetCount() != values.GetCount()) {
      SetFault("MaskBands and MaskValues have different lengths");
      return false;
    }
    if (!defs.Resize(bands.GetDims())) return false;
    for (unsigned i = 0; i < defs.GetCount(); ++i) defs[i] = {bands[i], values[i]};
    return true;
  }
};

const CommandFactoryT<CreateRasterMaskCommand> maskFactory(kMask);

const InputDeclaration kMaskInput{"MaskURI", Presence::kRequired, ValueKind::kURI,
                                  "a mask of CreateRasterMaskCommand"};

const CommandDeclaration kMasked{"CreateMaskedRasterCommand",
                                 "Views",
                                 "Shows a raster with the pixels masked that a mask marks.",
                                 {SourceInput(), kMaskInput},
                                 PublishedOutputs()};

class CreateMaskedRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const RasterMaskPtr mask(CatalogFind(Read<URI>("MaskURI")));
    return mask ? PublishView<MaskedRaster>(mask) : Fail("MaskURI: there is no such mask");
  }
};

const CommandFactoryT<CreateMaskedRasterCommand> maskedFactory(kMasked);

const CommandDeclaration kRegion{
    "CreateROIRasterCommand",
    "Views",
    "Shows a raster with what lies outside a region of interest marked so.",
    {SourceInput(), {"ROIDefURI", Presence::kRequired, ValueKind::kURI, "the region"}},
    PublishedOutputs()};

class CreateROIRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const ROIDefPtr region(CatalogFind(Read<URI>("ROIDefURI")));
    return region ? PublishView<ROIRaster>(region) : Fail("ROIDefURI: there is no such region");
  }
};

const CommandFactoryT<CreateROIRasterCommand> regionFactory(kRegion);

const CommandDeclaration kNoData{
    "CreateNoDataRasterCommand",
    "Views",
    "Shows a raster with values of its pixels as no data.",
    {SourceInput(),
     {"NoDataValues", Presence::kRequired, ValueKind::kNumberArray,
      "the values; the first is the view's no-data value, and is written where pixels are no data"},
     {"Replace", Presence::kOptional, ValueKind::kBoolean,
      "whether only these values are no data, and not what the source says; not when absent"},
     {"RemoveAll", Presence::kOptional, ValueKind::kBoolean,
      "whether no pixel is no data, and the values have no effect; not when absent"},
     {"Description", Presence::kOptional, ValueKind::kWord,
      "Told: what is made like the view has the no-data values of the source; Exact: those of the "
      "view",
      "", &WordsIn<Form>}},
    PublishedOutputs()};

class CreateNoDataRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    const Form description = HasInput("Description") ? Read<Form>("Description") : Form::kTold;
    BasicRasterPtr view;
    const bool isMade = DispatchType(EightTypes{}, source->DataType(), [&]<typename T>() {
      const RasterPtr<T> parent(source);
      if (Read<bool>("RemoveAll")) {
        view.Reset(new NoDataRaster<T>(parent, true, description));
        return true;
      }
      const auto values = Read<Array<T>>("NoDataValues");
      if (!values.IsValid()) {
        SetFault("NoDataValues: the text is no array of values that the pixels can have");
        return false;
      }
      view.Reset(new NoDataRaster<T>(parent, values, Read<bool>("Replace"), description));
      return true;
    });
    return isMade ? Publish(view)
                  : Fail(TakeFaultOr("SrcURI: there is no such view on this pixel type"));
  }
};

const CommandFactoryT<CreateNoDataRasterCommand> noDataFactory(kNoData);

const CommandDeclaration kSubset{
    "CreateSubsetRasterCommand",
    "Views",
    "Shows bands of a raster, masked, in a rectangle: each of these only where it is given.",
    {SourceInput(),
     {"SubRect", Presence::kOptional, ValueKind::kRectangle,
      "pixels of the source; cut to its extent"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray,
      "bands of the source, from 0; one may come twice"},
     {"MaskURI", Presence::kOptional, ValueKind::kURI, "a mask of CreateRasterMaskCommand"},
     {"Placing", Presence::kOptional, ValueKind::kWord, "see CreateSpatialSubsetRasterCommand", "",
      &WordsIn<Form>}},
    PublishedOutputs()};

class CreateSubsetRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    const RasterMaskPtr mask =
        HasInput("MaskURI") ? RasterMaskPtr(CatalogFind(Read<URI>("MaskURI"))) : RasterMaskPtr();
    if (HasInput("MaskURI") && !mask) return Fail("MaskURI: there is no such mask");
    const auto bands = Read<Array<unsigned>>("Bands");
    if (HasInput("Bands") && !CheckBands(*source, bands)) return Fail();
    BasicRasterPtr view;
    const bool isMade = DispatchType(EightTypes{}, source->DataType(), [&]<typename T>() {
      RasterPtr<T> top(source);
      if (HasInput("Bands")) top.Reset(new SpectralSubsetRaster<T>(top, bands));
      if (mask) top.Reset(new MaskedRaster<T>(top, mask));
      if (HasInput("SubRect")) {
        const Form form = HasInput("Placing") ? Read<Form>("Placing") : Form::kTold;
        top.Reset(new SpatialSubsetRaster<T>(top, Read<SubRect>("SubRect"), form));
      }
      view = BasicRasterPtr(top);
      return true;
    });
    return isMade ? Publish(view) : Fail("SrcURI: there is no such view on this pixel type");
  }
};

const CommandFactoryT<CreateSubsetRasterCommand> subsetFactory(kSubset);

}  // namespace
}  // namespace lumo
