#pragma once

#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows every n-th pixel of every m-th line of its parent: pixel (x, y) of the view is pixel (x *
/// skipX, y * skipY) of the parent. A rest at the right and at the bottom is not shown. Statistics
/// are the view's own. Exists for EightTypes.
///
///     const RasterPtr<float> small(new SkipRaster<float>(raster, 10, 10, false));
///
/// A read asks the parent for the lines that it shows, each from the first pixel to the last, and
/// for those between where the parent is stored in tiles or strips; a write leaves the pixels
/// between as they are.
///
/// Ownership: shares the parent, which does not know the view.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   over an empty parent, or with a skip of 0, IsValid() is false and operations give
///            false, 0 or empty.
template <typename T>
class SkipRaster final : public ComputedRaster<T> {
 public:
  /// @param skipX,skipY  1 or more; 1 shows every pixel.
  /// @param topLevel     offer the parent's pyramid.
  SkipRaster(const RasterPtr<T>& parent, unsigned skipX, unsigned skipY, bool topLevel);
  ~SkipRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("SkipRaster"); }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }

  PyramidDef GetPyramidDef() const override { return pyramidDef_; }
  AsyncPtr PyramidBuild(const PyramidDef&, const lumo::TileDimensions&,
                        const AsyncCallbackPtr&) override {
    return {};
  }
  AsyncPtr PyramidAsync() const override { return {}; }
  bool PyramidDelete() override { return false; }
  bool PyramidRefresh() override { return false; }
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }

  void SetTileDimensions(const lumo::TileDimensions&) override {}
  /// Whole lines, one at a time.
  lumo::TileDimensions TileDimensions() const override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;

 private:
  SubRect LineInParent(const SubRect& rect, unsigned line) const;
  SubRect ReadAtOnce(const SubRect& rect, unsigned x, unsigned y, unsigned bands) const;

  RasterDef def_;
  unsigned skipX_;
  unsigned skipY_;
  PyramidDef pyramidDef_;
};

VEXG_EXTERN(EIGHT, SkipRaster);

}  // namespace lumo
