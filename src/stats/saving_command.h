#pragma once

#include "raster/raster_command.h"

namespace lumo {

/// A command that has the data source of the raster "URI" store something that the raster knows of
/// itself. Its outputs are "Return", false as well when the source has no place for it, and "Fault"
/// with the reason when there is one.
class SavingCommand : public RasterCommand {
 protected:
  /// Stores it; false when it is not stored, with a fault when that went wrong.
  virtual bool Save(BasicRaster& raster) = 0;

 private:
  CommandResult Execute() final;
};

}  // namespace lumo
