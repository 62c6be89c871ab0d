#pragma once

#include "fx/label_census.h"
#include "fx/region_kinds.h"
#include "raster/raster.h"

namespace lumo {

/// Says which values a pass gives.
struct RegionPassValues {
  bool spectral = false;
  bool texture = false;
  bool means = false;
  bool entropy = false;

  bool Sums() const { return spectral || means; }
  bool Windows() const { return texture || entropy; }
};

/// Names the files that a pass over an image and its labels fills; null leaves one out.
struct RegionPassPlan {
  Pointer<SpectralRegionAttributesFile> spectral;
  Pointer<TextureRegionAttributesFile> texture;
  Pointer<RegionMeansFile> means;
  /// The mean over a region of the entropy of windows, over the number of their values.
  Pointer<RegionMeansFile> entropy;
  unsigned kernel = 1;         ///< side of the windows of texture, in pixels
  RegionPassValues ofShare{};  ///< the values of a share, which fills none of the files
};

/// Computes values of regions in one pass over an image and its labels, from exact sums: in
/// integers, or in doubles whose order depends on the place in the raster alone. The results have
/// the same bits for any storage of the rasters and any number of threads.
///
/// A region is finished with its last line, which a census knows beforehand; so memory follows the
/// regions that cross the lines of a tile, not all of them. Values that aren't finite count for
/// nothing in their band. Exists for EightTypes.
///
///     RegionPass<float> pass(image, labels, census, plan);
///     if (!pass.Run(ipc) || !plan.spectral->Close()) return false;
///
/// Where a ShareScope lives, the sums of a share of the strips go to its file, or files are filled
/// out of the sums of all shares.
///
/// Failure: false, with the fault set, when a raster or a file fails, and at an abort. Files then
///          hold some regions.
template <typename T>
class VEXG_EXPORT RegionPass {
 public:
  /// @param labels  of a type of LabelTypes and the image's size; the first band counts.
  /// @param census  of the labels; outlives the pass.
  RegionPass(const RasterPtr<T>& image, const BasicRasterPtr& labels, const LabelCensus& census,
             const RegionPassPlan& plan)
      : image_(image), labels_(labels), census_(census), plan_(plan) {}

  bool Run(const IPC& ipc);

 private:
  template <typename L>
  bool RunTyped(const RasterPtr<L>& labels, const IPC& ipc);

  RasterPtr<T> image_;
  BasicRasterPtr labels_;
  const LabelCensus& census_;
  const RegionPassPlan& plan_;
};

VEXG_EXTERN(EIGHT, RegionPass);

}  // namespace lumo
