#pragma once

#include "regions/rasterized_roi.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows its parent with the pixels outside a region of interest marked: state bit OutsideROI is
/// set there, and cleared inside, whatever the parent says. Pixels stay as they are, and can't be
/// written. Its statistics and histograms are its own. Exists for EightTypes.
///
/// At a pyramid level a pixel is inside as soon as one of those that it stands for is.
///
/// Ownership: shares the parent and the definition, whose changes show at the next read.
/// Threads:   every operation may run on many threads at once.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty. A
///            region that can't be carried to the raster fails a read, with the fault set.
template <typename T>
class ROIRaster final : public ComputedRaster<T> {
 public:
  ROIRaster(const RasterPtr<T>& parent, const ROIDefPtr& definition);
  ~ROIRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("ROIRaster"); }
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }
  /// With the changes of the region, so that statistics at hand go when it becomes another one.
  std::uint64_t WriteCount() const override;

  /// The region on the grid of the raster at full resolution.
  const RasterizedROIPtr& Rasterized() const { return rasterized_; }

 private:
  ROIRaster(const RasterPtr<T>& parent, const ROIDefPtr& definition,
            const RasterizedROIPtr& rasterized, unsigned level)
      : ComputedRaster<T>(parent),
        definition_(definition),
        rasterized_(rasterized),
        level_(level) {}

  ROIDefPtr definition_;
  RasterizedROIPtr rasterized_;  // on the grid of level 0
  unsigned level_ = 0;           // of the parent
};

VEXG_EXTERN(EIGHT, ROIRaster);

}  // namespace lumo
