#include "raster/raster_command.h"
#include "raster/raster_description.h"

namespace lumo {
namespace {

const CommandDeclaration kDescribe{
    "DescribeRasterCommand",
    "Rasters",
    "Tells all that a raster says of itself in one text. A command of this library's own.",
    {RasterURIInput()},
    {{"Description", ValueKind::kText,
      "a JSON object, as vexg_describe of the C interface gives it"}}};

class DescribeRasterCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    Write("Description", String(DescribeRaster(*raster)));
    return Succeed();
  }
};

const CommandFactoryT<DescribeRasterCommand> describeRasterFactory(kDescribe);

}  // namespace
}  // namespace lumo
