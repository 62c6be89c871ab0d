#pragma once

#include "foundation/string.h"

namespace lumo {

/// Answers for a raster on a source of its own whether it still shows the source, and what stands
/// beside that.
class SourceRaster {
 public:
  virtual ~SourceRaster() = default;

  /// True while the files of the source are the ones that were opened. Files that this raster has
  /// written to are, whatever they hold; any others must not have changed.
  virtual bool IsUpToDate() const = 0;
  /// The source that the pyramid was opened from; no text when it is the raster's own, or none.
  virtual URI PyramidURI() const = 0;
};

}  // namespace lumo
