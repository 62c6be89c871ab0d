#include <fmt/format.h>

#include "raster/pixel_value.h"
#include "views/band_stack_raster.h"
#include "views/complex_raster.h"
#include "views/skip_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"
#include "views/view_command.h"
#include "views/virtual_raster.h"

// The commands that make views. The view stays in the catalog with count 1.

namespace lumo {
namespace {

const CommandDeclaration kSpatial{"CreateSpatialSubsetRasterCommand",
                                  "Views",
                                  "Shows a rectangle of a raster as a raster.",
                                  {SourceInput(),
                                   {"SubRect", Presence::kRequired, ValueKind::kRectangle,
                                    "pixels of the source; cut to its extent"},
                                   {"Placing", Presence::kOptional, ValueKind::kWord,
                                    "Told: the tie pixel of the geo-reference stays where it was; "
                                    "Exact: the view lies where its pixels lie in the source",
                                    "", &WordsIn<Form>}},
                                  PublishedOutputs()};

class CreateSpatialSubsetRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    const auto rect = Read<SubRect>("SubRect");
    const Form form = HasInput("Placing") ? Read<Form>("Placing") : Form::kTold;
    return PublishView<SpatialSubsetRaster>(rect, form);
  }
};

const CommandFactoryT<CreateSpatialSubsetRasterCommand> spatialFactory(kSpatial);

const CommandDeclaration kSpectral{"CreateSpectralSubsetRasterCommand",
                                   "Views",
                                   "Shows bands of a raster, in any order, as a raster.",
                                   {SourceInput(),
                                    {"Bands", Presence::kRequired, ValueKind::kIntegerArray,
                                     "bands of the source, from 0; one may come twice"}},
                                   PublishedOutputs()};

class CreateSpectralSubsetRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto bands = Read<Array<unsigned>>("Bands");
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source || !CheckBands(*source, bands)) return Fail();
    return PublishView<SpectralSubsetRaster>(bands);
  }
};

const CommandFactoryT<CreateSpectralSubsetRasterCommand> spectralFactory(kSpectral);

const CommandDeclaration kSkip{
    "CreateSkipRasterCommand",
    "Views",
    "Shows every n-th pixel and line of a raster as a raster.",
    {SourceInput(),
     {"SkipX", Presence::kRequired, ValueKind::kInteger, "step along a line, from 1", "pixels"},
     {"SkipY", Presence::kRequired, ValueKind::kInteger, "step from line to line, from 1",
      "lines"}},
    PublishedOutputs()};

class CreateSkipRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto skipX = Read<unsigned>("SkipX");
    const auto skipY = Read<unsigned>("SkipY");
    if (skipX == 0 || skipY == 0) return Fail("SkipX and SkipY start at 1");
    return PublishView<SkipRaster>(skipX, skipY, true);
  }
};

const CommandFactoryT<CreateSkipRasterCommand> skipFactory(kSkip);

const CommandDeclaration kStack{
    "CreateBandStackRasterCommand",
    "Views",
    "Shows the bands of several rasters of one pixel type as one raster.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURIArray, "the rasters, in order"},
     {"Bands", Presence::kOptional, ValueKind::kWord,
      "Told: names, units and further details are those of the first raster; Exact: each band "
      "keeps "
      "its own, and rasters of another size than the first are refused",
      "", &WordsIn<Form>}},
    CombinedOutputs()};

class CreateBandStackRasterCommand final : public CombineCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const std::vector<BasicRasterPtr> sources = FindRasters("SrcURI");
    if (sources.empty()) return Fail();
    for (const BasicRasterPtr& source : sources) {
      if (source->DataType() != sources[0]->DataType()) {
        return Fail("SrcURI: the pixel types differ");
      }
    }
    const Form form = HasInput("Bands") ? Read<Form>("Bands") : Form::kTold;
    if (form == Form::kExact) {
      for (const BasicRasterPtr& source : sources) {
        if (source->Samples() == sources[0]->Samples() && source->Lines() == sources[0]->Lines()) {
          continue;
        }
        return Fail(fmt::format("SrcURI: {} has {} x {} pixels, the first raster {} x {}",
                                source->GetURI().ToUTF8(), source->Samples(), source->Lines(),
                                sources[0]->Samples(), sources[0]->Lines()));
      }
      WriteApart(sources);
    }
    BasicRasterPtr stack;
    const bool typed = DispatchType(EightTypes{}, sources[0]->DataType(), [&]<typename T>() {
      Array<RasterPtr<T>> members{ArrayDims(static_cast<unsigned>(sources.size()))};
      for (unsigned i = 0; i < members.GetCount(); ++i) members[i] = RasterPtr<T>(sources[i]);
      stack.Reset(new BandStackRaster<T>(members, form));
      return true;
    });
    return typed ? Publish(stack) : Fail("SrcURI: there is no such view on this pixel type");
  }
};

const CommandFactoryT<CreateBandStackRasterCommand> stackFactory(kStack);

const CommandDeclaration kVirtual{"CreateVirtualRasterCommand",
                                  "Views",
                                  "Gives a raster a second identifier.",
                                  {SourceInput()},
                                  PublishedOutputs()};

class CreateVirtualRasterCommand final : public ViewCommand {
  CommandResult Execute() override { return PublishView<VirtualRaster>(); }
};

const CommandFactoryT<CreateVirtualRasterCommand> virtualFactory(kVirtual);

/// Shows a complex raster as a real one.
template <ComplexPart kPart>
class CreateComplexRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    BasicRasterPtr view;
    DispatchType(TypeList<Complex<float>, Complex<double>>{}, source->DataType(),
                 [&]<typename C>() {
                   using T = decltype(C().real);
                   view.Reset(new ComplexRaster<T>(RasterPtr<C>(source), kPart));
                   return true;
                 });
    return view ? Publish(view) : Fail("SrcURI: the raster isn't complex");
  }
};

CommandDeclaration ComplexDeclaration(const char* name, const char* meaning) {
  return {name, "Views", meaning, {SourceInput()}, PublishedOutputs()};
}

const CommandDeclaration kReal =
    ComplexDeclaration("CreateComplexRealRasterCommand",
                       "Shows each band of a complex raster as real part, real and imaginary.");
const CommandDeclaration kImag = ComplexDeclaration(
    "CreateComplexImagRasterCommand",
    "Shows each band of a complex raster as imaginary part, real and imaginary.");
const CommandDeclaration kMagnitude = ComplexDeclaration(
    "CreateComplexMagnitudeRasterCommand",
    "Shows each band of a complex raster as magnitude, real and imaginary part.");
const CommandDeclaration kPower = ComplexDeclaration(
    "CreateComplexPowerRasterCommand",
    "Shows each band of a complex raster as logarithm of the magnitude, real and imaginary part.");
const CommandDeclaration kPhase =
    ComplexDeclaration("CreateComplexPhaseRasterCommand",
                       "Shows each band of a complex raster as phase, real and imaginary part.");

const CommandFactoryT<CreateComplexRasterCommand<ComplexPart::kReal>> realFactory(kReal);
const CommandFactoryT<CreateComplexRasterCommand<ComplexPart::kImag>> imagFactory(kImag);
const CommandFactoryT<CreateComplexRasterCommand<ComplexPart::kMagnitude>> magnitudeFactory(
    kMagnitude);
const CommandFactoryT<CreateComplexRasterCommand<ComplexPart::kPower>> powerFactory(kPower);
const CommandFactoryT<CreateComplexRasterCommand<ComplexPart::kPhase>> phaseFactory(kPhase);

}  // namespace
}  // namespace lumo
