#pragma once

#include "fx/pixel_attributes_tasks.h"
#include "raster/tile_process.h"

// The processes that gather values of regions from an image and its labels, in float, tile after
// tile. Labels are of int or unsigned int; their first band counts. T is one of EightTypes.

namespace lumo {

/// Fills the spectral and the texture attributes of regions.
///
///     const Pointer<SpectralRegionAttributesFile> spectral(
///         new SpectralRegionAttributesFile(uri, image->Bands()));
///     SpectralTextureRegionAttributesComputeProcess<float> process(image, labels, spectral, {},
///     1); if (!process.RunProcess(process.kHere) || !spectral->Close()) return false;
template <typename T, typename SpectralFile = SpectralRegionAttributesFile,
          typename TextureFile = TextureRegionAttributesFile>
class SpectralTextureRegionAttributesComputeProcess final : public TileProcess<> {
 public:
  /// @param spectral  null leaves its stage out.
  /// @param texture   null leaves its stage out.
  /// @param kernel    side of the windows of texture, in pixels; half of it, rounded down, is their
  ///                  reach.
  SpectralTextureRegionAttributesComputeProcess(const RasterPtr<T>& image,
                                                const BasicRasterPtr& labels,
                                                const Pointer<SpectralFile>& spectral,
                                                const Pointer<TextureFile>& texture,
                                                unsigned kernel, const IPC& ipc = {});
};

/// Fills the means of regions.
template <typename T, typename File = RegionMeansFile>
class RegionMeansComputeProcess final : public TileProcess<> {
 public:
  RegionMeansComputeProcess(const RasterPtr<T>& image, const BasicRasterPtr& labels,
                            const Pointer<File>& means, const IPC& ipc = {});
};

VEXG_EXTERN(EIGHT, SpectralTextureRegionAttributesComputeProcess);
VEXG_EXTERN(EIGHT, RegionMeansComputeProcess);

}  // namespace lumo
