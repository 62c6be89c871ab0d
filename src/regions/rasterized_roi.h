#pragma once

#include <cstdint>

#include "regions/region_window.h"
#include "regions/roi_def.h"

namespace lumo {

/// Kinds of hits.
enum ROIHitKind : std::int32_t { kNoHit = -1, kPixelHit = 0, kGeometryHit = 2 };

/// Names the region that a pixel lies in.
class VEXG_EXPORT ROIHitInfo : public Object {
 public:
  static const unsigned TypeCode;
  ROIHitInfo() = default;
  ROIHitInfo(const ROIDefPtr& definition, std::int32_t kind)
      : definition_(definition), kind_(kind) {}
  bool IsA(unsigned typeCode) const override;

  /// The region that was hit; of a group the child.
  const ROIDefPtr& ROIDef() const { return definition_; }
  void SetROIDef(const ROIDefPtr& definition) { definition_ = definition; }
  std::int32_t Kind() const { return kind_; }  ///< an ROIHitKind

 private:
  ROIDefPtr definition_;
  std::int32_t kind_ = kNoHit;
};

using ROIHitInfoPtr = Pointer<ROIHitInfo>;

/// Names the shape of a region that a pixel lies in.
class VEXG_EXPORT GeometryROIHitInfo final : public ROIHitInfo {
 public:
  static const unsigned TypeCode;
  GeometryROIHitInfo(const ROIDefPtr& definition, std::uint32_t record, std::uint32_t part)
      : ROIHitInfo(definition, kGeometryHit), record_(record), part_(part) {}
  bool IsA(unsigned typeCode) const override;

  std::uint32_t Record() const { return record_; }
  std::uint32_t Part() const { return part_; }

 private:
  std::uint32_t record_;
  std::uint32_t part_;
};

/// Marks the pixels of a region in blocks of any pyramid level, which all masks are made of.
class VEXG_EXPORT RegionPainter {
 public:
  virtual ~RegionPainter() = default;

  /// Marks the pixels of the window of `marks` that lie in the region.
  /// @return false, with the fault set, when the region can't be carried to the grid.
  virtual bool Mark(RegionMarks& marks) = 0;

  /// Says, in a small part of the time of Mark, whether a window lies wholly inside or outside.
  virtual RegionCover Cover(const RegionWindow& window) = 0;
};

/// A region on the grid of one raster. It says whether a pixel is inside, and marks the pixels of a
/// rectangle that are.
///
///     const RasterizedROIPtr region = RasterizeOn(definition, samples, lines, geoRef);
///     Array<unsigned char> mask;
///     std::uint64_t count = 0;
///     if (!region->Mask({0, 0, 511, 511}, mask, count)) return false;
///     const bool inside = mask[y * 512 + x] != 0;
///
/// A change of the definition shows at the next call.
///
/// Threads: any number may ask at once, the caches guard themselves; SetOffset stands alone.
/// Failure: false; where shapes can't be carried to the grid TakeFault says which.
class VEXG_EXPORT RasterizedROI : public Object, public RegionPainter {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// True when a pixel of the grid is in the region.
  /// @param info  [out] the hit; empty when there is none.
  virtual bool HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) = 0;
  /// Gives the region in a rectangle.
  /// @param mask   [out] height by width; 1 inside, 0 outside.
  /// @param count  [out] pixels that the call has set.
  virtual bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) = 0;
  /// The definition.
  virtual ROIDefPtr ROIDef() const = 0;

  unsigned Samples() const { return samples_; }            ///< of the grid
  unsigned Lines() const { return lines_; }                ///< of the grid
  const GeoRefPtr& GridGeoRef() const { return geoRef_; }  ///< null for a grid of pixels

  /// Says that pixel (0, 0) of the raster is pixel (x, y) of the region's grid, as for a raster
  /// that is a spatial subset. Only for a region without a geo-reference, which needs no other way.
  void SetOffset(std::int32_t x, std::int32_t y);
  bool HasOffset() const { return hasOffset_; }      ///< SetOffset was called
  std::int32_t OffsetX() const { return offsetX_; }  ///< pixels; 0 without one
  std::int32_t OffsetY() const { return offsetY_; }

 protected:
  /// @param geoRef  where it isn't null the size is the one that it has.
  RasterizedROI(unsigned samples, unsigned lines, const GeoRefPtr& geoRef);

  /// A mask of zeros for a rectangle, then Mark.
  bool FreshMask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count);
  /// The window on the region's grid: moved by the offset, when there is one.
  RegionWindow Offset(const RegionWindow& window) const;

  GeoRefPtr geoRef_;
  unsigned samples_;
  unsigned lines_;
  bool projected_ = false;
  RasterizedROIPtr inner_;  // which answers when `projected_`
  bool hasOffset_ = false;
  std::int32_t offsetX_ = 0;
  std::int32_t offsetY_ = 0;
};

/// Gives a mask the shape of a rectangle. One that has it keeps its marks where `keep` is set, all
/// others are zeroed.
VEXG_EXPORT bool ShapeMask(const SubRect& rect, Array<unsigned char>& mask, bool keep = false);

}  // namespace lumo
