#include "fx/pixel_attributes_process.h"

#include "fx/label_census.h"

namespace lumo {
namespace {

/// Places the stages that read an image and its labels, and gives their slots.
template <typename T>
Array<ArgID> ReadBoth(TileProcess<>& process, const RasterPtr<T>& image,
                      const BasicRasterPtr& labels, unsigned border) {
  const RasterIteratorPtr<T> tiles(new RasterIteratorSmart<T>(image, border));
  const ArgID imageSlot = process.Read(tiles).id;
  ArgID labelSlot = imageSlot;
  DispatchType(LabelTypes{}, labels->DataType(), [&]<typename L>() {
    labelSlot = process.Read(LabelTiles(RasterPtr<L>(labels), tiles->Dimensions())).id;
    return true;
  });
  return ArgIDs({imageSlot, labelSlot});
}

/// Places the stage that fills a file; none for a null one.
template <typename Stage, typename File>
void AddStage(TileProcess<>& process, const Array<ArgID>& slots, const Pointer<File>& file,
              unsigned kernel = 1) {
  if (file.IsNull()) return;
  auto* const setup = new RegionComputeSetup<File>;
  const ObjectPtr held(setup);
  setup->file = file;
  setup->kernel = kernel;
  process.AddTask<Stage>(slots, held);
}

}  // namespace

template <typename T, typename SpectralFile, typename TextureFile>
SpectralTextureRegionAttributesComputeProcess<T, SpectralFile, TextureFile>::
    SpectralTextureRegionAttributesComputeProcess(const RasterPtr<T>& image,
                                                  const BasicRasterPtr& labels,
                                                  const Pointer<SpectralFile>& spectral,
                                                  const Pointer<TextureFile>& texture,
                                                  unsigned kernel, const IPC& ipc)
    : TileProcess("SpectralTextureRegionAttributesComputeProcess", ipc) {
  const auto slots = ReadBoth(*this, image, labels, texture.IsNull() ? 0 : kernel / 2);
  AddStage<SpectralRegionAttributesComputeTask<T, SpectralFile>>(*this, slots, spectral);
  AddStage<TextureRegionAttributesComputeTask<T, TextureFile>>(*this, slots, texture, kernel);
  Close();
}

template <typename T, typename File>
RegionMeansComputeProcess<T, File>::RegionMeansComputeProcess(const RasterPtr<T>& image,
                                                              const BasicRasterPtr& labels,
                                                              const Pointer<File>& means,
                                                              const IPC& ipc)
    : TileProcess("RegionMeansComputeProcess", ipc) {
  AddStage<RegionMeansComputeTask<T, File>>(*this, ReadBoth(*this, image, labels, 0), means);
  Close();
}

VEXG_INSTANCES(EIGHT, SpectralTextureRegionAttributesComputeProcess);
VEXG_INSTANCES(EIGHT, RegionMeansComputeProcess);

}  // namespace lumo
