#pragma once

#include "raster/state_runs.h"
#include "views/computed_raster.h"
#include "views/raster_mask.h"

namespace lumo {

/// Shows its parent with the pixels masked that a mask marks: state bit Masked is set there, and
/// cleared elsewhere, whatever the parent says. Pixels stay as they are. Its statistics and
/// histograms are its own. Exists for EightTypes.
///
/// Ownership: shares the parent and the masks.
/// Threads:   every operation may run on many threads at once.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty. Bands
///            without a mask have no pixel masked.
///
///     RasterMaskDef<float> clouds;
///     clouds.values = Array<float>(ArrayDims(1));
///     clouds.values[0] = 255;
///     Array<RasterMaskDef<float>> defs(ArrayDims(1));
///     defs[0] = clouds;
///     const RasterMaskPtr mask(new RasterMask(quality, defs));
///     const RasterPtr<float> clear(new MaskedRaster<float>(raster, mask));
template <typename T>
class MaskedRaster final : public ComputedRaster<T> {
 public:
  /// @param mask  of all bands.
  MaskedRaster(const RasterPtr<T>& parent, const RasterMaskPtr& mask);
  /// @param masks  one for each band.
  MaskedRaster(const RasterPtr<T>& parent, const Array<RasterMaskPtr>& masks);
  ~MaskedRaster() override { this->StopComputing(); }

  bool IsValid() const override { return ComputedRaster<T>::IsValid() && masks_.IsValid(); }
  URI GetURI() const override { return this->DefaultURI("MaskedRaster"); }
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  /// With the changes of the masks, so that statistics at hand go when one is inversed.
  std::uint64_t WriteCount() const override;

 private:
  const RasterMask* MaskOf(unsigned band) const {
    return band < masks_.GetCount() ? masks_[band].Get() : nullptr;
  }

  Array<RasterMaskPtr> masks_;
};

VEXG_EXTERN(EIGHT, MaskedRaster);

}  // namespace lumo
