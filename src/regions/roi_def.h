#pragma once

#include <cstdint>

#include "foundation/containers.h"
#include "foundation/point.h"
#include "foundation/pointer.h"
#include "foundation/sub_rect.h"
#include "geometry/geometry.h"
#include "georef/georef.h"
#include "regions/scan_rules.h"

namespace lumo {

class RasterizedROI;
using RasterizedROIPtr = Pointer<RasterizedROI>;
class ROIDef;
using ROIDefPtr = Pointer<ROIDef>;

/// Describes a region of interest once, for many rasters: addresses of pixels, shapes, or a group
/// of both. Rasterize makes it usable on the grid of one raster.
///
///     const ROIDefPtr fields(new GeometryROIDef(shapes));
///     const RasterPtr<float> masked(new ROIRaster<float>(raster, fields));
///
/// Threads: any number of readers, as the derived class says.
class VEXG_EXPORT ROIDef : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// Makes the form of the region on one grid.
  /// @param self    a Pointer to this definition, which the form keeps.
  /// @param geoRef  of the raster, with its size; where it is null, `samples` and `lines` count and
  ///                coordinates are pixels.
  virtual RasterizedROIPtr Rasterize(const ROIDefPtr& self, unsigned samples, unsigned lines,
                                     const GeoRefPtr& geoRef) const = 0;
};

/// The form of a region on a raster's grid; empty for an empty definition.
VEXG_EXPORT RasterizedROIPtr RasterizeOn(const ROIDefPtr& definition, unsigned samples,
                                         unsigned lines, const GeoRefPtr& geoRef);

/// A region that is a set of pixels of a grid of its own.
class VEXG_EXPORT PixelBasedROIDef : public ROIDef {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// True when a pixel of the definition's grid is in the region.
  virtual bool Contains(const Point2D<unsigned>& point) const = 0;
  /// Gives the region in a rectangle of the definition's grid.
  /// @param mask   [out] height by width; 1 inside, 0 outside.
  /// @param count  [out] pixels inside.
  /// @return false when there is no memory.
  virtual bool Mask(const SubRect& rect, Array<unsigned char>& mask,
                    std::uint64_t& count) const = 0;
  /// Where the definition's grid lies; null where it is that of any raster.
  virtual GeoRefPtr GeoRef() const = 0;
  virtual unsigned Lines() const = 0;    ///< of the definition's grid
  virtual unsigned Samples() const = 0;  ///< of the definition's grid
};

using PixelBasedROIDefPtr = Pointer<PixelBasedROIDef>;

/// A region that is a set of shapes. Threads: as the geometry.
class VEXG_EXPORT GeometryROIDef final : public ROIDef {
 public:
  static const unsigned TypeCode;
  /// @param options  how the shapes become pixels.
  explicit GeometryROIDef(const GeometryPtr& geometry, const ScanOptions& options = {})
      : geometry_(geometry), options_(options) {}
  bool IsA(unsigned typeCode) const override;

  RasterizedROIPtr Rasterize(const ROIDefPtr& self, unsigned samples, unsigned lines,
                             const GeoRefPtr& geoRef) const override;

  /// The shapes, which the definition shares.
  const GeometryPtr& Geometry() const { return geometry_; }
  const ScanOptions& Options() const { return options_; }

 private:
  GeometryPtr geometry_;
  ScanOptions options_;
};

using GeometryROIDefPtr = Pointer<GeometryROIDef>;

/// A region that is all of several regions of any kind. Threads: any number.
class VEXG_EXPORT GroupROIDef final : public ROIDef {
 public:
  static const unsigned TypeCode;
  explicit GroupROIDef(const Array<ROIDefPtr>& children) : children_(children) {}
  bool IsA(unsigned typeCode) const override;

  RasterizedROIPtr Rasterize(const ROIDefPtr& self, unsigned samples, unsigned lines,
                             const GeoRefPtr& geoRef) const override;

  /// A copy of the list of children.
  Array<ROIDefPtr> Children() const;
  /// Replaces the children.
  void SetChildren(const Array<ROIDefPtr>& children);
  /// How often the list of children has changed.
  std::uint32_t Revision() const;

 private:
  Array<ROIDefPtr> children_;
  std::uint32_t revision_ = 0;
  mutable QueuingRWMutex mutex_;
};

using GroupROIDefPtr = Pointer<GroupROIDef>;

}  // namespace lumo
