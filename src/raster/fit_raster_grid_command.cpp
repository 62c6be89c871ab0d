#include "foundation/fault.h"
#include "georef/covering_grid.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

const CommandDeclaration kFit{
    "FitRasterGridCommand",
    "Coordinates",
    "Finds the grid of a coordinate system that shows all of a raster, for "
    "CreateProjectedRasterCommand. A command of this library's own.",
    {RasterURIInput(),
     {"CoordSys", Presence::kRequired, ValueKind::kText,
      "the coordinate system: EPSG:n, WKT or PROJ text"},
     {"PixelSize", Presence::kOptional, ValueKind::kNumber,
      "side of a pixel; about as many pixels as the raster has when absent",
      "units of the system"}},
    {{"GeoRef", ValueKind::kGeoRef, "the grid, with its size"},
     {"Samples", ValueKind::kInteger, "of the grid"},
     {"Lines", ValueKind::kInteger, "of the grid"}}};

class FitRasterGridCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto pixelSize = Read<double>("PixelSize");
    if (HasInput("PixelSize") && !(pixelSize > 0)) return Fail("PixelSize: a size is above 0");
    CoordSys system;
    TakeFault();
    if (!system.SetFromString(Read<String>("CoordSys"))) {
      return Fail(TakeFaultOr("CoordSys: there is no such coordinate system"));
    }
    const GeoRefPtr model = raster->GetRasterDef().geoRef;
    if (!model) return Fail("the raster has no geo-reference");
    if (model->CoordinateSystem().IsEmpty()) return Fail("the raster has no coordinate system");
    model->SetDimensions(raster->Samples(), raster->Lines());
    const GeoRefPtr grid = CoveringGrid(*model, system, pixelSize);
    if (!grid) {
      return Fail("the raster can't be carried to that system with pixels of that size");
    }
    Write("GeoRef", grid);
    Write("Samples", grid->Samples());
    Write("Lines", grid->Lines());
    return Succeed();
  }
};

const CommandFactoryT<FitRasterGridCommand> fitRasterGridFactory(kFit);

}  // namespace
}  // namespace lumo
