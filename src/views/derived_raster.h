#pragma once

#include <string>
#include <vector>

#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// A raster whose pixels are computed from those of one or several rasters of one size, pixel by
/// pixel: the base of views whose type is another one than that of their rasters, which may be any
/// of TenTypes.
///
/// Place and size are those of the first raster. Statistics are its own, and no-data values there
/// are none, since the states carry them. Levels of a pyramid are computed from those of the
/// rasters, where all have them. It can't be written. Exists for EightTypes.
///
/// Ownership: shares the rasters, which do not know the view.
/// Failure:   IsValid() is false until Describe was called, and where a raster isn't valid any
///            more; operations then give false, 0 or empty.
template <typename T>
class DerivedRaster : public ComputedRaster<T> {
 public:
  bool IsValid() const override;
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return def_.bands; }

  bool PyramidExists() const override;
  PyramidDef GetPyramidDef() const override;
  RasterPtr<T> PyramidLevel(unsigned level) override;

  void SetTileDimensions(const lumo::TileDimensions& tiles) override;
  lumo::TileDimensions TileDimensions() const override;
  std::uint64_t WriteCount() const override;

 protected:
  explicit DerivedRaster(std::vector<BasicRasterPtr> rasters) : rasters_(std::move(rasters)) {}

  const std::vector<BasicRasterPtr>& GetRasters() const { return rasters_; }
  /// Describes the view: as its first raster, of whose details those of the place stay.
  /// @param bandNames  one for each band; empty for none.
  void Describe(const std::vector<std::string>& bandNames);
  /// Gives it other details than Describe has.
  void SetDetails(const Metadata& details) { def_.metadata = details; }

 private:
  /// The same view on levels of its rasters.
  virtual RasterPtr<T> MakeOn(const std::vector<BasicRasterPtr>& levels) const = 0;

  const std::vector<BasicRasterPtr> rasters_;
  RasterDef def_;  // empty until it is described
};

VEXG_EXTERN(EIGHT, DerivedRaster);

}  // namespace lumo
