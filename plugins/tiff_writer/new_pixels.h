#pragma once

#include "tiff_writer/block_layout.h"

namespace lumo::tiff {

/// The pixels of a TIFF file that is being made. One thread at a time calls it.
/// Failure: false, with the fault set.
class NewPixels {
 public:
  virtual ~NewPixels() = default;

  /// Carries a block, inside the raster, in the interleave of the file.
  virtual bool Write(const BlockPlace& place, const void* pixels) = 0;
  virtual bool Read(const BlockPlace& place, void* pixels) = 0;

  /// Makes the file whole, and closes it. Nothing works any more after it.
  virtual bool Finish() = 0;
};

}  // namespace lumo::tiff
