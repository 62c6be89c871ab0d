#pragma once

#include "commands/command.h"
#include "raster/raster.h"

namespace lumo {

/// Base of the commands that work on rasters of the catalog.
class VEXG_EXPORT RasterCommand : public Command {
 protected:
  /// The valid raster whose URI the input `name` holds; else empty, with the fault text told, so
  /// that Fail() says it.
  BasicRasterPtr FindRaster(const char* name = "URI") const;

  /// FindRaster as a Raster<T>; the command has found the pixel type before.
  template <typename T>
  RasterPtr<T> FindTyped(const char* name = "URI") const {
    return RasterPtr<T>(FindRaster(name));
  }

  /// True when the array names bands, all of them the raster's; else tells the fault.
  static bool CheckBands(const BasicRaster& raster, const Array<unsigned>& bands);
};

}  // namespace lumo
