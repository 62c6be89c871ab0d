#pragma once

#include <cstdlib>
#include <map>
#include <memory>

#include "views/computed_raster.h"

namespace lumo {

/// Shows a block of pixels in memory as a raster. Exists for EightTypes.
///
///     std::vector<float> block(samples * lines * bands);
///     const RasterPtr<float> raster(new MemoryRaster<float>("block", block.data(), samples, lines,
///                                                           bands, Interleave::BSQ, {}));
///
/// The block has no gaps; `interleave` gives the order of its axes. It is described in a connection
/// string and opened through the plug-in for "MemoryRaster", whose reader does all transfers.
///
/// Ownership: the block belongs to the caller and outlives the raster.
/// Threads:   reads may run on many threads; two writers of the same pixels race.
/// Failure:   IsValid() is false without a block, or when it could not be opened.
template <typename T>
class MemoryRaster : public ComputedRaster<T> {
 public:
  /// Pixel size, tie point and coordinate system are those of `geoRef`, zeros and none without it.
  MemoryRaster(const String& name, T* pixelData, unsigned samples, unsigned lines, unsigned bands,
               Interleave interleave, const GeoRefPtr& geoRef);
  /// @param tieX, tieY  map coordinates of the upper left corner of the first pixel.
  /// @param coordSys    text of the coordinate system; may be empty.
  MemoryRaster(const String& name, T* pixelData, unsigned samples, unsigned lines, unsigned bands,
               Interleave interleave, double pixelSizeX, double pixelSizeY, double tieX,
               double tieY, const String& coordSys);
  ~MemoryRaster() override;

  URI GetURI() const override { return this->DefaultURI("MemoryRaster"); }
  /// The geo-reference is the one given, whole; the connection string carries less of it.
  RasterDef GetRasterDef() const override;
  bool IsValid() const override { return valid_; }
  bool CanWrite() const override { return true; }

  bool PyramidExists() const override { return false; }
  PyramidDef GetPyramidDef() const override { return {}; }
  /// None can be built: a block in memory needs no reduced copies.
  AsyncPtr PyramidBuild(const PyramidDef&, const lumo::TileDimensions&,
                        const AsyncCallbackPtr&) override {
    return {};
  }
  AsyncPtr PyramidAsync() const override { return {}; }
  bool PyramidDelete() override { return false; }
  bool PyramidRefresh() override { return false; }
  RasterPtr<T> PyramidLevel(unsigned) override { return {}; }
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }

  void SetTileDimensions(const lumo::TileDimensions&) override {}
  /// The whole raster as one block.
  lumo::TileDimensions TileDimensions() const override;

 protected:
  MemoryRaster(const RasterPtr<T>& opened, const GeoRefPtr& geoRef);

 private:
  GeoRefPtr geoRef_;
  bool valid_ = false;
};

/// A MemoryRaster with a block of its own, whose pixels start as 0.
template <typename T>
class AutoMemoryRaster final : public MemoryRaster<T> {
 public:
  /// @param noData  by band; a value that T can't hold counts as none.
  AutoMemoryRaster(const String& name, unsigned samples, unsigned lines, unsigned bands,
                   Interleave interleave, const GeoRefPtr& geoRef,
                   const std::map<unsigned, double>& noData = {});
  ~AutoMemoryRaster() override;

  URI GetURI() const override { return this->DefaultURI("AutoMemoryRaster"); }
  RasterDef GetRasterDef() const override;

 private:
  struct Freed {
    void operator()(T* block) const { std::free(block); }
  };
  using Block = std::unique_ptr<T, Freed>;

  static Block Allocate(unsigned samples, unsigned lines, unsigned bands);
  AutoMemoryRaster(const String& name, Block block, unsigned samples, unsigned lines,
                   unsigned bands, Interleave interleave, const GeoRefPtr& geoRef,
                   const std::map<unsigned, double>& noData);

  Block block_;
};

VEXG_EXTERN(EIGHT, MemoryRaster);
VEXG_EXTERN(EIGHT, AutoMemoryRaster);

}  // namespace lumo
