#pragma once

#include <vector>

#include "regions/region_window.h"
#include "regions/roi_def.h"

namespace lumo {

/// A square of a definition's grid, with the addresses in it. Threads: any number; each operation
/// holds the tile's lock.
class VEXG_EXPORT PixelAddressTile final : public Object {
 public:
  static const unsigned TypeCode;
  PixelAddressTile(unsigned left, unsigned top, unsigned width, unsigned height)
      : left_(left), top_(top), width_(width), height_(height) {}
  ~PixelAddressTile() override;
  bool IsA(unsigned typeCode) const override;

  /// Replaces the addresses by those of `points` that lie in the tile; no points at all change
  /// nothing.
  /// @param rectangle  bounds of `points`.
  void SetAddresses(const Array<Point2D<unsigned>>& points, const SubRect& rectangle);
  /// Drops the addresses.
  void Clear();

  /// True when the pixel is in the tile's part of the region.
  bool Contains(const Point2D<unsigned>& point) const;
  /// Marks the addresses that lie in a window.
  void Mark(RegionMarks& marks) const;

  /// The square, in pixels of the definition's grid.
  SubRect Rect() const { return {left_, top_, left_ + width_ - 1, top_ + height_ - 1}; }
  /// The bounds of the addresses; means nothing without any.
  SubRect Bounds() const;
  /// Number of addresses, each counted once.
  std::size_t PointCount() const;
  /// How often the addresses have changed.
  std::uint32_t Revision() const;

 private:
  bool Holds(const Point2D<unsigned>& point) const {
    return point.x >= left_ && point.x - left_ < width_ && point.y >= top_ &&
           point.y - top_ < height_;
  }

  unsigned left_;
  unsigned top_;
  unsigned width_;
  unsigned height_;
  SubRect bounds_;
  std::vector<Point2D<unsigned>> points_;  // ascending, each once
  std::uint32_t revision_ = 0;
  mutable QueuingRWMutex mutex_;
};

using PixelAddressTilePtr = Pointer<PixelAddressTile>;

/// A region of single pixels, kept in tiles of 256 by 256.
///
///     const PixelAddressROIDefPtr region(new PixelAddressROIDef(samples, lines));
///     if (!region->SetAddresses(points)) return false;  // column, row
///     const RasterizedROIPtr onRaster = RasterizeOn(region, samples, lines, geoRef);
///
/// Threads: any number; each operation holds the definition's lock, then those of its tiles.
/// Failure: ObjectErrorOutOfMemory where the tiles can't be made.
class VEXG_EXPORT PixelAddressROIDef final : public PixelBasedROIDef {
 public:
  static const unsigned TypeCode;
  static constexpr unsigned kTileSize = 256;  ///< pixels of a side

  /// An empty region, whose grid grows with the addresses.
  PixelAddressROIDef() = default;
  /// An empty region on a grid of a fixed size, which leaves out addresses outside.
  PixelAddressROIDef(unsigned samples, unsigned lines);
  ~PixelAddressROIDef() override;
  bool IsA(unsigned typeCode) const override;

  RasterizedROIPtr Rasterize(const ROIDefPtr& self, unsigned samples, unsigned lines,
                             const lumo::GeoRefPtr& geoRef) const override;

  bool Contains(const Point2D<unsigned>& point) const override;
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) const override;
  GeoRefPtr GeoRef() const override;
  unsigned Lines() const override;
  unsigned Samples() const override;

  /// Mask of the rectangle moved by (dx, dy).
  bool Mask(const SubRect& rect, std::int32_t dx, std::int32_t dy, Array<unsigned char>& mask,
            std::uint64_t& count) const;
  /// Marks the addresses in a window of the definition's grid.
  void Mark(RegionMarks& marks) const;
  /// The bounds of the addresses. @return false when there are none.
  bool Bounds(SubRect& bounds) const;

  /// Replaces the addresses. One that comes twice counts once.
  /// @return false, with nothing changed, when a grid that holds them can't be made.
  bool SetAddresses(const Array<Point2D<unsigned>>& points);
  /// Says where the grid lies; no region made from the definition may be in use.
  void SetGeoRef(const GeoRefPtr& geoRef);

  /// Tiles in a row of the grid.
  unsigned TileColumns() const;
  /// Tiles in a column of the grid.
  unsigned TileRows() const;
  /// A tile; empty for one that isn't there.
  PixelAddressTilePtr Tile(unsigned row, unsigned column) const;
  /// How often the grid has grown.
  std::uint32_t GridRevision() const;

 private:
  PixelAddressTilePtr TileAt(unsigned row, unsigned column) const {
    return tiles_[std::size_t{row} * tileColumns_ + column];
  }
  bool MakeGrid(unsigned samples, unsigned lines);
  bool GrowTo(const SubRect& rect);

  unsigned tileColumns_ = 0;
  unsigned tileRows_ = 0;
  unsigned lines_ = 0;
  unsigned samples_ = 0;
  bool growable_ = true;
  Array<PixelAddressTilePtr> tiles_;  // rows by columns
  std::uint32_t gridRevision_ = 0;
  GeoRefPtr geoRef_;
  SubRect bounds_;
  bool hasAddresses_ = false;
  mutable QueuingRWMutex mutex_;
};

using PixelAddressROIDefPtr = Pointer<PixelAddressROIDef>;

}  // namespace lumo
