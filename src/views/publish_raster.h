#pragma once

#include <vector>

#include "raster/raster_command.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo {

/// Helps commands that put a raster into the catalog and give its URI and DataType:
///
///     CommandResult Execute() override {
///       if (!CheckInputs()) return Fail();
///       return Publish(BasicRasterPtr(new TempRaster<float>(samples, lines, bands, {})));
///     }
class VEXG_EXPORT PublishCommand : public RasterCommand {
 protected:
  /// The valid rasters whose URIs the input `name` holds, in order; none, with the fault text set,
  /// where it names none, or one is not open.
  std::vector<BasicRasterPtr> FindRasters(const char* name) const;

  /// Gives the raster that was entered, when there is a valid one; else takes it out again and
  /// fails with the fault text.
  CommandResult Publish(const CatalogRasterRef& entered);

  /// Enters a raster with count 1 and gives it.
  CommandResult Publish(const BasicRasterPtr& raster) {
    return Publish(CatalogRasterRef(raster, false));
  }
};

/// Helps commands that show several rasters as one, pixel for pixel.
class VEXG_EXPORT CombineCommand : public PublishCommand {
 protected:
  /// Gives the output Warning when rasters lie elsewhere than the first one, as far as grids of one
  /// coordinate system tell.
  void WriteApart(const std::vector<BasicRasterPtr>& rasters);
};

/// The words of the types of EightTypes, for an input that chooses one.
VEXG_EXPORT std::vector<const char*> EightTypeWords();

/// The outputs of a PublishCommand.
VEXG_EXPORT std::vector<OutputDeclaration> PublishedOutputs();

/// The outputs of a CombineCommand.
VEXG_EXPORT std::vector<OutputDeclaration> CombinedOutputs();

}  // namespace lumo
