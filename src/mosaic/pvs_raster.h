#pragma once

#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows where a raster has pixels: one band, 1 for a pixel that counts and 0 for one that is no
/// data in all bands. A pixel that a mask or a region leaves out counts. All pixels of the view are
/// valid; statistics and histograms are its own. Exists for EightTypes.
///
/// Ownership: shares the raster, which does not know the view.
/// Threads:   every operation may run on many threads at once, where the raster allows it; nothing
///            is stored per call.
/// Cost:      reads all bands of the block; nothing at all where one of them has no no-data value,
///            since every pixel counts then.
/// Failure:   without a raster IsValid() is false, and operations give false, 0 or empty. A block
///            without one of the three interleaves, or that the raster can't deliver, reports
///            false. Nothing can be written.
template <typename T>
class PVSRaster final : public ComputedRaster<T> {
 public:
  /// @param raster  whose pixels are looked at; an empty one makes a view that is not valid.
  explicit PVSRaster(const RasterPtr<T>& raster);
  ~PVSRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("PVSRaster"); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Bands() const override { return def_.bands; }
  bool HasNoDataValue(unsigned) const override { return false; }
  T NoDataValue(unsigned) const override { return T(); }
  bool HasPalette(unsigned) const override { return false; }
  PalettePtr Palette(unsigned) const override { return {}; }
  bool WritePalette(unsigned, const PalettePtr&) override { return false; }
  bool DeletePalette(unsigned) override { return false; }

  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned level) override;

  /// @param bands  how many; the first one of the block has the pixels, others are 1.
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }

 private:
  bool EveryBandHasNoData() const;

  RasterDef def_;
};

VEXG_EXTERN(EIGHT, PVSRaster);

}  // namespace lumo
