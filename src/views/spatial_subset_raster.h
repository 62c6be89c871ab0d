#pragma once

#include "georef/derived_georef.h"
#include "raster/block_states.h"
#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows a rectangle of its parent as a raster of its own; no pixel is copied or kept.
///
/// Pixel (0, 0) of the view is pixel (rect.left, rect.top) of the parent. Bands, data type and
/// no-data values are the parent's; the geo-reference moves with the origin. Statistics are the
/// view's own, since it covers other pixels. Exists for EightTypes.
///
///     const RasterPtr<float> corner(
///         new SpatialSubsetRaster<float>(raster, SubRect(0, 0, 511, 511), Form::kExact));
///     const double mean = corner->Mean(0, ipc);  // of these 512 by 512 pixels
///
/// Ownership: shares the parent, which does not know the view.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty.
template <typename T>
class SpatialSubsetRaster final : public ComputedRaster<T>, public StatesOnDemand<T> {
 public:
  /// @param rect  pixels of the parent, corners inclusive and in any order; cut to the parent's
  ///              extent. One wholly outside leaves the strip of the parent's last column or line.
  /// @param form  of the geo-reference, see PartGeoRef.
  SpatialSubsetRaster(const RasterPtr<T>& parent, const SubRect& rect, Form form = Form::kTold);
  ~SpatialSubsetRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("SpatialSubsetRaster"); }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }

  /// The same rectangle on a level of the parent: left and top rounded up, right and bottom down.
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }
  bool GetBlock(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                Array<T>& pixels, BlockStates& states) override;

  const SubRect& Rect() const { return rect_; }  ///< in the parent's pixels

 protected:
  SubRect PlaceInParent(const SubRect& rect) const override;

 private:
  SubRect rect_;
  Form form_;
  RasterDef def_;
};

VEXG_EXTERN(EIGHT, SpatialSubsetRaster);

}  // namespace lumo
