#include "data/raster_reader_body.h"

namespace lumo {

Array<unsigned> BandsOfBlock(const Array<unsigned>& bands, Interleave interleave) {
  Array<unsigned> kept(bands);
  if (interleave == Interleave::None && kept.GetCount() > 1) kept.Resize(ArrayDims(1));
  return kept;
}

VEXG_INSTANCES(TWELVE, RasterReader);

}  // namespace lumo
