#include "raster/pixel_value.h"
#include "views/view_command.h"
#include "warp/projected_raster.h"

namespace lumo {
namespace {

const CommandDeclaration kProjected{
    "CreateProjectedRasterCommand",
    "Views",
    "Shows a raster in the grid of another geo-reference.",
    {SourceInput(),
     {"GeoRef", Presence::kRequired, ValueKind::kGeoRef, "of type Std: the grid"},
     {"ReprojectionMethod", Presence::kRequired, ValueKind::kWord,
      "Polynomial: fitted to each block, or on an exact grid to its fixed squares; Rigorous: a "
      "transform of every pixel; Triangulation runs as Polynomial",
      "", &WordsIn<ReprojectionMethod>},
     {"ResamplingMethod", Presence::kRequired, ValueKind::kWord,
      "Nearest, Linear or Cubic; others run as Nearest", "", &WordsIn<PyramidResamplingMethod>},
     {"PyramidURI", Presence::kOptional, ValueKind::kURI, "has no effect"},
     {"PyramidLevel", Presence::kOptional, ValueKind::kInteger, "has no effect"},
     {"Grid", Presence::kOptional, ValueKind::kWord,
      "Told: all of the raster, with pixels as large as its own, and its statistics; Exact: the "
      "GeoRef with its own size, where a pixel is the same in every block, and statistics of the "
      "pixels there",
      "", &WordsIn<ProjectedGrid>},
     {"Sampling", Presence::kOptional, ValueKind::kWord,
      "Told: linear and cubic weigh from the corners of pixels and round toward zero; Centred: "
      "they "
      "weigh from the centres, round to the nearest, and leave out pixels that aren't valid",
      "", &WordsIn<WarpSampling>},
     {"Kernel", Presence::kOptional, ValueKind::kWord,
      "in place of ResamplingMethod and Sampling, on an exact grid. Told: those; Nearest; Linear, "
      "Cubic (-0.5) and Lanczos are stretched over the area that a pixel covers; Average, Mode, "
      "Min, "
      "Max and Median are of the pixels in it",
      "", &WordsIn<WarpKernel>},
     {"NoData", Presence::kOptional, ValueKind::kNumber,
      "the no-data value of all bands, outside the raster too; the raster's own when absent"}},
    PublishedOutputs()};

class CreateProjectedRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto target = Read<GeoRefPtr>("GeoRef");
    if (!target) return Fail("GeoRef: the text isn't a geo-reference");
    const auto method = Read<ReprojectionMethod>("ReprojectionMethod");
    const auto resampling = Read<PyramidResamplingMethod>("ResamplingMethod");
    ProjectedRasterOptions options;
    if (HasInput("Grid")) options.grid = Read<ProjectedGrid>("Grid");
    if (HasInput("Sampling")) options.sampling = Read<WarpSampling>("Sampling");
    if (HasInput("Kernel")) options.kernel = Read<WarpKernel>("Kernel");
    if (options.kernel != WarpKernel::kTold && options.grid != ProjectedGrid::kExact) {
      return Fail("Kernel: only on an exact grid");
    }
    if (HasInput("NoData")) options.noData = Read<double>("NoData");
    const BasicRasterPtr parent = options.noData ? FindRaster("SrcURI") : BasicRasterPtr();
    if (parent && !FitsPixel(parent->DataType(), *options.noData)) {
      return Fail("NoData: the pixel type can't hold this value");
    }
    return PublishView<ProjectedRaster>(target, method, resampling, options);
  }
};

const CommandFactoryT<CreateProjectedRasterCommand> projectedFactory(kProjected);

}  // namespace
}  // namespace lumo
