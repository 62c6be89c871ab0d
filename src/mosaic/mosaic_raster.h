#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "mosaic/mosaic_raster_def.h"
#include "mosaic/scene_pool.h"
#include "raster/raster_def.h"
#include "regions/record_index.h"
#include "views/computed_raster.h"
#include "views/sources/source_raster.h"

namespace lumo {

class MosaicMasks;

/// Shows the scenes of a mosaic as one raster on a grid of its own. Exists for EightTypes.
///
/// A pixel is that of the first scene, in the order of the definition, that has it. A scene has a
/// pixel where that is valid in some band, and its centre lies in the scene's seam polygon, or else
/// in its footprint. Where seam polygons leave a gap, the first scene with the pixel in its
/// footprint has it. Scenes that don't lie on the grid come through a ProjectedRaster; their colour
/// tables are applied.
///
/// With a feathering width w, a pixel nearer to a seam than w / 2 is the mean of the scenes that
/// have it, each by the weight 1/2 + d / w: d is its distance from the border of the scene's
/// polygon, below 0 outside. Towards the border of a footprint weights fall to 0 as well.
///
/// A pixel depends on nothing but its place: not on the block that it is read in.
///
/// Ownership: shares the definition, and the raster that it stands on.
/// Threads:   every operation may run on many threads at once, where the scenes allow it.
/// Cost:      a block reads the scenes that have pixels in it, each once, those along seams twice
///            with feathering. Scenes, polygons and tables are opened when they are needed; of each
///            the last few dozen stay.
/// Failure:   a scene or a side file that can't be read makes the blocks fail that need it, with
///            the fault set. Without scenes, or with a grid without size, IsValid() is false.
template <typename T>
class MosaicRaster final : public ComputedRaster<T>, public SourceRaster {
 public:
  static const unsigned TypeCode;

  /// @param grid   the size, the geo-reference and the number of bands of the mosaic.
  /// @param plain  the raster on the mosaic's source, which builds and reads its pyramid file; may
  ///               be empty.
  /// @param uri    the identifier; one by the address when empty.
  MosaicRaster(const MosaicRasterDefPtr<T>& definition, const RasterDef& grid,
               const RasterPtr<T>& plain = {}, const URI& uri = {});
  ~MosaicRaster() override;

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || ComputedRaster<T>::IsA(typeCode);
  }
  const MosaicRasterDefPtr<T>& Definition() const { return definition_; }
  bool IsUpToDate() const override { return !definition_ || definition_->IsUpToDate(); }
  URI PyramidURI() const override;

  bool IsValid() const override { return Object::IsValid() && def_.samples != 0; }
  URI GetURI() const override;
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  bool PyramidExists() const override;
  PyramidDef GetPyramidDef() const override;
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return def_.bands; }
  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  /// Palettes are those of the first scene.
  bool HasPalette(unsigned band) const override;
  PalettePtr Palette(unsigned band) const override;
  bool WritePalette(unsigned, const PalettePtr&) override { return false; }
  bool DeletePalette(unsigned) override { return false; }
  lumo::TileDimensions TileDimensions() const override;

  /// A mosaic of the scenes' levels. Where the mosaic has a pyramid file, that has its pixels.
  RasterPtr<T> PyramidLevel(unsigned level) override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }
  std::uint64_t WriteCount() const override;

  /// The numbers of the scenes that may have pixels in a rectangle, ascending.
  std::vector<std::int32_t> ScenesIn(const SubRect& rect) const;
  /// The polygons of the scenes, as the definition names their files now.
  std::unique_ptr<MosaicMasks> MakeMasks() const;
  /// True when the pixels of a scene are pixels of the mosaic as they are.
  bool IsOnGrid(unsigned scene) const { return places_[scene].isOnGrid; }

 private:
  /// The place of a scene on the grid.
  struct Place {
    std::int64_t left = 0, top = 0;  // of the pixels that it may have, all inclusive
    std::int64_t right = -1, bottom = -1;
    bool isOnGrid = false;  // its pixel (x + toX, y + toY) is the mosaic's (x, y)
    std::int64_t toX = 0, toY = 0;
  };
  struct Shown;
  struct Block;

  struct LevelTag {};
  MosaicRaster(LevelTag, const MosaicRaster& base, const MosaicRasterDefPtr<T>& definition,
               const RasterDef& grid, const RasterPtr<T>& stored);
  void SetUp();
  Place PlaceOf(const RasterDef& scene) const;
  bool HaveLevel(unsigned level) const;
  bool HasPyramidFile() const;
  std::shared_ptr<Shown> Show();
  RasterPtr<T> OnGrid(unsigned scene);

  bool ReadScene(Shown& shown, unsigned scene, const SubRect& part, const Block& block,
                 Array<T>& pixels, Array<unsigned char>& state);
  bool Compose(Shown& shown, const std::vector<std::int32_t>& scenes, Block& block);
  bool Feather(Shown& shown, Block& block);
  bool FeatherPart(Shown& shown, Block& block, const SubRect& part);
  std::vector<std::int32_t> ScenesNear(const SubRect& rect) const;

  MosaicRasterDefPtr<T> definition_;
  RasterDef def_;
  URI uri_;
  std::vector<GeoRefPtr> models_;   // of the scenes, at full resolution
  double scaleX_ = 1, scaleY_ = 1;  // below 1 for a level
  RasterPtr<T> stored_;             // has the pixels of a level that a pyramid file holds
  std::vector<Place> places_;
  std::unique_ptr<RecordIndex> index_;
  std::unique_ptr<RecentScenes<RasterPtr<T>>> onGrid_;
  std::mutex shownLock_;
  std::shared_ptr<Shown> shown_;
};

VEXG_EXTERN(EIGHT, MosaicRaster);

template <typename T>
using MosaicRasterPtr = Pointer<MosaicRaster<T>>;

}  // namespace lumo
