#pragma once

#include "raster/block_states.h"
#include "raster/raster_def.h"
#include "raster/raster_view.h"

namespace lumo {

/// Shows bands of its parent in an order of its own; one may come twice. Its statistics and
/// histograms are the parent's, with the numbers of the bands translated. Exists for EightTypes.
///
/// Ownership: shares the parent, which does not know the view.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty. A band
///            that the view doesn't have reads as the parent's first.
template <typename T>
class SpectralSubsetRaster final : public RasterView<T>, public StatesOnDemand<T> {
 public:
  /// @param bands  of the parent, in the order wanted.
  SpectralSubsetRaster(const RasterPtr<T>& parent, const Array<unsigned>& bands);

  URI GetURI() const override { return this->DefaultURI("SpectralSubsetRaster"); }
  RasterDef GetRasterDef() const override { return def_; }
  /// The same bands of the parent's level; empty where it has none.
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }
  bool GetBlock(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                Array<T>& pixels, BlockStates& states) override;

 protected:
  const Array<unsigned>* BandOrder() const override { return &order_; }

 private:
  Array<unsigned> order_;
  RasterDef def_;
};

VEXG_EXTERN(EIGHT, SpectralSubsetRaster);

}  // namespace lumo
