#pragma once

#include "foundation/pointer.h"
#include "raster/raster.h"

namespace lumo {

/// Says which pixels of a label raster count, line by line. Threads: one at a time.
class VEXG_EXPORT LabelMask : public Object {
 public:
  /// Marks the pixels that do not count, in the states of whole lines.
  /// @param line    the first one.
  /// @param states  a byte for each pixel; those that don't count get PixelValueState::Masked.
  /// @return false when the mask can't be read; TakeFault may say why.
  virtual bool Apply(unsigned line, unsigned lines, unsigned char* states) = 0;
};

using LabelMaskPtr = Pointer<LabelMask>;

/// The mask that the first band of a raster is: pixels count where it is valid and not 0. Empty for
/// a raster of a type that isn't one of EightTypes.
VEXG_EXPORT LabelMaskPtr MakeLabelMask(const BasicRasterPtr& raster);

}  // namespace lumo
