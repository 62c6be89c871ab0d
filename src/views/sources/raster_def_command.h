#pragma once

#include "raster/raster_def.h"
#include "views/publish_raster.h"

namespace lumo {

/// Base of the commands that make a raster from a description in their inputs: a template raster in
/// "SrcURI", each of whose fields the further inputs replace.
class VEXG_EXPORT RasterDefCommand : public PublishCommand {
 protected:
  /// Puts the description together; false, with the fault set, for one that makes no sense.
  bool ReadRasterDef(RasterDef& def) const;

 private:
  bool ReadNoData(RasterDef& def) const;
  bool ReadGeoRef(RasterDef& def) const;
};

/// Declares the inputs that ReadRasterDef reads, with `own` in front. Only a command that lets the
/// source choose them has the inputs "Format" and "Interleave".
VEXG_EXPORT std::vector<InputDeclaration> RasterDefInputs(std::vector<InputDeclaration> own);

}  // namespace lumo
