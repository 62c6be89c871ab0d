#pragma once

#include "mosaic/mosaic_raster_def.h"
#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows the scenes of a mosaic as one raster on a grid of its own. Exists for EightTypes.
///
/// A pixel is that of the first scene, in the order of the definition, that has it. A scene has a
/// pixel unless that is not valid in all bands.
///
/// Ownership: shares the definition.
/// Threads:   every operation may run on many threads at once, where the scenes allow it.
/// Failure:   a scene that can't be read makes the blocks fail that need it. Without scenes, or
///            with a grid without size, IsValid() is false.
template <typename T>
class MosaicRaster final : public ComputedRaster<T> {
 public:
  static const unsigned TypeCode;

  /// @param grid  the size, the geo-reference and the number of bands of the mosaic.
  MosaicRaster(const MosaicRasterDefPtr<T>& definition, const RasterDef& grid);
  ~MosaicRaster() override { this->StopComputing(); }

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || ComputedRaster<T>::IsA(typeCode);
  }
  const MosaicRasterDefPtr<T>& Definition() const { return definition_; }

  bool IsValid() const override { return Object::IsValid() && def_.samples != 0; }
  URI GetURI() const override { return this->DefaultURI("MosaicRaster"); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return def_.bands; }
  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }
  std::uint64_t WriteCount() const override;

 private:
  MosaicRasterDefPtr<T> definition_;
  RasterDef def_;
  Array<RasterPtr<T>> onGrid_;  // the scenes in the grid of the mosaic
};

VEXG_EXTERN(EIGHT, MosaicRaster);

template <typename T>
using MosaicRasterPtr = Pointer<MosaicRaster<T>>;

}  // namespace lumo
