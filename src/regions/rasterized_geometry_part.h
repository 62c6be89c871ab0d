#pragma once

#include <memory>

#include "geometry/geometry.h"
#include "georef/georef.h"
#include "regions/shape_scan.h"

namespace lumo {

/// Carries the vertices of a part to the pixels of a grid.
/// @param geoRef    of the grid; may be null.
/// @param vertices  [out] none for a part that isn't there.
/// @return false, with the fault set, when a vertex can't be carried, is not a number, or lies too
///         far away.
VEXG_EXPORT bool CarryPart(const Geometry& geometry, std::uint32_t record, std::uint32_t part,
                           const GeoRefPtr& geoRef, ShapeCoordinates coordinates,
                           ScanVertices& vertices);

/// One part of a record on the grid of a raster: rows of column spans, made when they are first
/// asked for. A change of the part shows at the next call.
///
/// Threads: one at a time.
class VEXG_EXPORT RasterizedGeometryPart : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// A bit of the flags of Prepare: the part has pixels.
  static constexpr unsigned kHasPixels = 1;

  /// Gives the pixels of the part in a rectangle.
  /// @param mask     [out] height by width; 1 inside, 0 outside.
  /// @param count    [out] pixels of all spans; one in two spans counts twice.
  /// @param covered  [out] the smallest rectangle with all spans that were set, relative to `rect`;
  ///                 unchanged without any.
  /// @return false when the part can't be carried to the grid, or there is no memory.
  virtual bool Mask(const GeoRefPtr& geoRef, unsigned samples, unsigned lines, const SubRect& rect,
                    Array<unsigned char>& mask, std::uint64_t& count, SubRect& covered);
  /// Scans the part unless that was done already: the rows that WantRows asks for, else the first
  /// 65,536.
  /// @param flags  [out] kHasPixels or 0.
  virtual bool Prepare(const GeoRefPtr& geoRef, unsigned& flags);

  /// Asks for the rows down to below `rowLimit` at the next Prepare.
  void WantRows(std::int64_t rowLimit);
  /// The rows that Prepare has made; null before.
  const std::shared_ptr<const SpanRows>& Rows() const { return rows_; }
  /// The id of the part within its record.
  std::uint32_t PartId() const { return part_; }

 protected:
  RasterizedGeometryPart(const GeometryPtr& geometry, std::uint32_t record, std::uint32_t part,
                         const ScanOptions& options)
      : geometry_(geometry), record_(record), part_(part), options_(options) {}

  const ScanOptions& Options() const { return options_; }
  bool IsHole() const { return geometry_->IsHole(record_, part_); }

 private:
  virtual SpanRows Scan(ScanVertices vertices, std::int64_t rowLimit) const = 0;

  GeometryPtr geometry_;
  std::uint32_t record_;
  std::uint32_t part_;
  ScanOptions options_;
  std::shared_ptr<const SpanRows> rows_;
  std::int64_t rowLimit_ = 0;  // the rows that were asked for end below it
  bool isPrepared_ = false;
  std::uint32_t seenRevision_ = 0;
};

using RasterizedGeometryPartPtr = Pointer<RasterizedGeometryPart>;

/// A ring of a polygon, see ScanPolygon.
class VEXG_EXPORT RasterizedPolygon final : public RasterizedGeometryPart {
 public:
  static const unsigned TypeCode;
  RasterizedPolygon(const GeometryPtr& geometry, std::uint32_t record, std::uint32_t part,
                    const ScanOptions& options = {})
      : RasterizedGeometryPart(geometry, record, part, options) {}
  bool IsA(unsigned typeCode) const override;

 private:
  SpanRows Scan(ScanVertices vertices, std::int64_t rowLimit) const override;
};

/// A line, see ScanLine.
class VEXG_EXPORT RasterizedPolyline final : public RasterizedGeometryPart {
 public:
  static const unsigned TypeCode;
  RasterizedPolyline(const GeometryPtr& geometry, std::uint32_t record, std::uint32_t part,
                     const ScanOptions& options = {})
      : RasterizedGeometryPart(geometry, record, part, options) {}
  bool IsA(unsigned typeCode) const override;

 private:
  SpanRows Scan(ScanVertices vertices, std::int64_t rowLimit) const override;
};

/// Points, see ScanPoints.
class VEXG_EXPORT RasterizedPoints final : public RasterizedGeometryPart {
 public:
  static const unsigned TypeCode;
  RasterizedPoints(const GeometryPtr& geometry, std::uint32_t record, std::uint32_t part,
                   const ScanOptions& options = {})
      : RasterizedGeometryPart(geometry, record, part, options) {}
  bool IsA(unsigned typeCode) const override;

 private:
  SpanRows Scan(ScanVertices vertices, std::int64_t rowLimit) const override;
};

/// A part of the class that a kind of record asks for, see GeometryKind.
VEXG_EXPORT RasterizedGeometryPartPtr MakeRasterizedPart(const GeometryPtr& geometry,
                                                         std::uint32_t record, std::uint32_t part,
                                                         const ScanOptions& options);

}  // namespace lumo
