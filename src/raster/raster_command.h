#pragma once

#include "commands/command.h"
#include "commands/declaration.h"
#include "raster/raster.h"

namespace lumo {

/// The required input URI, which names the raster that a command is about.
VEXG_EXPORT InputDeclaration RasterURIInput();

/// Helps commands that work on rasters of the catalog to find them:
///
///     CommandResult Execute() override {
///       const BasicRasterPtr raster = FindRaster();
///       if (raster.IsNull()) return Fail();  // with the reason that FindRaster gave
///       …
///     }
class VEXG_EXPORT RasterCommand : public Command {
 protected:
  /// The valid raster whose URI the input `name` holds; else empty, with the fault text set, so
  /// that Fail() says it.
  BasicRasterPtr FindRaster(const char* name = "URI") const;

  /// FindRaster as a Raster<T>; the command has found the pixel type before.
  template <typename T>
  RasterPtr<T> FindTyped(const char* name = "URI") const {
    return RasterPtr<T>(FindRaster(name));
  }

  /// True when the array names bands, all of them the raster's; else sets the fault text.
  static bool CheckBands(const BasicRaster& raster, const Array<unsigned>& bands);
};

}  // namespace lumo
