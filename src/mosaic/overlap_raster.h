#pragma once

#include <memory>
#include <optional>

#include "raster/raster_def.h"
#include "views/computed_raster.h"
#include "warp/warp_map.h"

namespace lumo {

/// Shows the area that two geo-referenced rasters have in common, as pixels of the first one on its
/// grid, moved to the corner of the area. Of a first raster that is turned, or has a camera alone,
/// the grid stays where it is, and the area's pixels are cut out of it. A pixel is valid where it
/// is in both. Statistics and histograms are the view's own, of the pixels valid in both. Exists
/// for pairs of one type of EightTypes.
///
/// Both rasters are read to the nearest pixel. A pixel that isn't valid may have any value.
///
///     const RasterPtr<float> overlap(new OverlapRaster<float, float>(left, right));
///     if (overlap->Samples() == 0) return false;  // they have no area in common
///
/// Ownership: shares both rasters, which do not know the view.
/// Threads:   every operation may run on many threads at once, where the rasters allow it; nothing
///            is stored per call.
/// Failure:   without geo-references, or where the rasters have no area in common, the view is
///            empty: no samples, lines or bands, and reads report false. A block that one of the
///            rasters can't deliver reports false. Nothing can be written.
template <typename T, typename U>
class OverlapRaster final : public ComputedRaster<T> {
 public:
  OverlapRaster(const RasterPtr<T>& first, const RasterPtr<U>& second);
  ~OverlapRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("OverlapRaster"); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return def_.bands; }
  /// How many pixels of the band are valid in both; computed when it isn't known.
  std::uint64_t PixelCount(unsigned band, const IPC& ipc) override;

  bool WritePalette(unsigned, const PalettePtr&) override { return false; }
  bool DeletePalette(unsigned) override { return false; }

  /// The overlap of both rasters' levels; empty where one has none.
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned level) override;

  /// The rectangle is cut to the view.
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }
  std::uint64_t WriteCount() const override;

 private:
  bool SetUp();
  bool CutInMap(const RasterDef& second);
  bool CutInPixels(const RasterDef& second);

  RasterPtr<U> second_;
  RasterDef def_;
  std::optional<SubRect> part_;         // pixels of the first raster, where the view has just these
  std::shared_ptr<const WarpMap> map_;  // to the second raster, where one has a camera alone
};

VEXG_EXTERN(EIGHT, OverlapRaster, std::type_identity_t);

}  // namespace lumo
