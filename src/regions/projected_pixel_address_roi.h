#pragma once

#include "regions/pixel_address_roi_def.h"
#include "regions/projected_geometry_roi.h"

namespace lumo {

/// A tile of a pixel-based region, traced into polygons that are carried to the grid of a raster.
///
/// Threads: any number; the tile's lock guards its polygons.
class VEXG_EXPORT ProjectedPixelBasedTile : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// The tile's rectangle on the definition's grid.
  virtual SubRect SourceRect() const = 0;
  /// Forgets the polygons where the tile has changed since they were made. Under the lock, for
  /// writing.
  /// @return false when there is nothing to forget.
  virtual bool CheckRevision() = 0;

  /// The tile on the grid of a raster, made when it is first asked for.
  /// @param region  [out] empty for a tile without pixels.
  /// @return false, with the fault set, when it can't be carried.
  bool Region(const PixelBasedROIDef& definition, const GeoRefPtr& geoRef,
              RasterizedGeometryROIPtr& region);

 protected:
  void Forget() {
    region_ = RasterizedGeometryROIPtr();
    isEmpty_ = false;
  }

 private:
  bool Trace(const PixelBasedROIDef& definition, const GeoRefPtr& geoRef);

  RasterizedGeometryROIPtr region_;
  bool isEmpty_ = false;
  QueuingRWMutex mutex_;
};

using ProjectedPixelBasedTilePtr = Pointer<ProjectedPixelBasedTile>;

/// A PixelAddressTile that is carried.
class VEXG_EXPORT ProjectedPixelAddressTile final : public ProjectedPixelBasedTile {
 public:
  static const unsigned TypeCode;
  explicit ProjectedPixelAddressTile(const PixelAddressTilePtr& tile)
      : tile_(tile), seenRevision_(tile->Revision()) {}
  bool IsA(unsigned typeCode) const override;

  SubRect SourceRect() const override { return tile_->Rect(); }
  bool CheckRevision() override;

 private:
  PixelAddressTilePtr tile_;
  std::uint32_t seenRevision_;
};

using ProjectedPixelAddressTilePtr = Pointer<ProjectedPixelAddressTile>;

/// A pixel-based region whose grid is another than the raster's. Its pixels aren't carried one at a
/// time: each tile is traced into polygons, which are scanned on the raster's grid.
class VEXG_EXPORT ProjectedPixelBasedROI : public ProjectedROI {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// Tiles in a row of the definition's grid.
  virtual unsigned TileColumns() const = 0;
  /// Tiles in a column of it.
  virtual unsigned TileRows() const = 0;
  /// The carried form of a tile; empty for one that isn't there.
  virtual ProjectedPixelBasedTilePtr Tile(unsigned column, unsigned row) const = 0;
  /// Makes a tile for each of the definition's.
  virtual void BuildTiles() = 0;
  /// Makes the tiles that the definition's grid has got since.
  virtual void RefreshTiles() = 0;

 protected:
  using ProjectedROI::ProjectedROI;
};

/// The projected form of a PixelAddressROIDef.
class VEXG_EXPORT ProjectedPixelAddressROI final : public ProjectedPixelBasedROI {
 public:
  static const unsigned TypeCode;
  ProjectedPixelAddressROI(const PixelAddressROIDefPtr& definition, const GeoRefPtr& geoRef);
  bool IsA(unsigned typeCode) const override;

  bool HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) override;
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) override;
  ROIDefPtr ROIDef() const override { return definition_; }

  unsigned TileColumns() const override;
  unsigned TileRows() const override;
  ProjectedPixelBasedTilePtr Tile(unsigned column, unsigned row) const override;
  void BuildTiles() override;
  void RefreshTiles() override;

  bool Mark(RegionMarks& marks) override;
  RegionCover Cover(const RegionWindow& window) override;

 private:
  std::vector<ProjectedPixelAddressTilePtr> TilesIn(const MapRect& pixels);
  bool BoundsInDefinition(const RegionWindow& window, MapRect& bounds) const;

  PixelAddressROIDefPtr definition_;
  mutable QueuingRWMutex mutex_;
  std::uint32_t seenGrid_ = 0;
  Array<ProjectedPixelAddressTilePtr> tiles_;  // rows by columns
};

}  // namespace lumo
