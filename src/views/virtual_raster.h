#pragma once

#include "raster/raster_view.h"

namespace lumo {

/// Stands for a raster under the raster's own identifier, and forwards everything. Exists for
/// EightTypes.
template <typename T>
class LocalRaster final : public RasterView<T> {
 public:
  using RasterView<T>::RasterView;
  URI GetURI() const override {
    return this->Parent() ? this->Parent()->GetURI() : this->DefaultURI("LocalRaster");
  }
  std::uint64_t PixelCount(unsigned band, const IPC& ipc) override {
    return this->Parent() ? this->Parent()->PixelCount(band, ipc) : 0;
  }
};

/// Gives a raster a second identity: an identifier of its own in the catalog, under which it can be
/// held, viewed and closed apart from its source. It forwards everything. Exists for EightTypes.
///
/// Ownership: keeps the source alive.
template <typename T>
class VirtualRaster final : public RasterView<T> {
 public:
  explicit VirtualRaster(const RasterPtr<T>& source)
      : RasterView<T>(RasterPtr<T>(new LocalRaster<T>(source))) {}
  URI GetURI() const override { return this->DefaultURI("VirtualRaster"); }
  std::uint64_t PixelCount(unsigned band, const IPC& ipc) override {
    return this->Parent()->PixelCount(band, ipc);
  }
};

}  // namespace lumo
