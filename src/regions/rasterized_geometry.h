#pragma once

#include <functional>
#include <memory>
#include <mutex>

#include "regions/rasterized_geometry_part.h"
#include "regions/record_index.h"

namespace lumo {

/// One record of a geometry on the grid of a raster. Threads: any number.
class VEXG_EXPORT RasterizedGeometryRecord final : public Object {
 public:
  static const unsigned TypeCode;
  RasterizedGeometryRecord(const GeometryPtr& geometry, std::uint32_t record,
                           const ScanOptions& options)
      : geometry_(geometry), record_(record), options_(options) {}
  bool IsA(unsigned typeCode) const override;

  /// The first part that holds a pixel and isn't a hole.
  /// @param generation  changes with every change of the geometry.
  bool HitTest(const GeoRefPtr& geoRef, std::uint64_t generation, const RegionWindow& pixel,
               std::int64_t rowLimit, std::uint32_t& part);
  /// The pixels of all parts, holes taken out.
  /// @param rowLimit  the rows wanted end below it.
  /// @return null, with the fault set, when a part can't be carried to the grid.
  std::shared_ptr<const SpanRows> Rows(const GeoRefPtr& geoRef, std::uint64_t generation,
                                       std::int64_t rowLimit);

 private:
  void Refresh(std::uint64_t generation);
  std::shared_ptr<const SpanRows> PreparePart(const GeoRefPtr& geoRef, int part);
  void WantRows(std::int64_t rowLimit);

  GeometryPtr geometry_;
  std::uint32_t record_;
  ScanOptions options_;
  std::mutex mutex_;
  bool isFresh_ = false;
  std::uint64_t generation_ = 0;
  std::uint32_t seenRevision_ = 0;
  Map<int, RasterizedGeometryPartPtr> parts_;
  std::int64_t rowLimit_ = 0;
  std::shared_ptr<const SpanRows> rows_;
};

using RasterizedGeometryRecordPtr = Pointer<RasterizedGeometryRecord>;

/// A geometry on the grid of a raster. Records are scanned when a window first touches them; at
/// most kCacheLimit stay scanned.
///
/// Cost: an index over the boxes of all records is made at the first call, and after a change.
/// Threads: any number; the caches guard themselves.
///
///     RasterizedGeometry shapes(geometry, geoRef, samples, lines);
///     Array<unsigned char> mask;
///     std::uint64_t count = 0;
///     if (!shapes.Mask(rect, mask, count)) return false;  // TakeFault() says why
class VEXG_EXPORT RasterizedGeometry final : public Object {
 public:
  static const unsigned TypeCode;
  static constexpr unsigned kCacheLimit = 10000;  ///< records

  /// @param geoRef  of the grid, with its size; null for a grid of `samples` by `lines` pixels, on
  ///                which coordinates are pixels.
  RasterizedGeometry(const GeometryPtr& geometry, const GeoRefPtr& geoRef, unsigned samples,
                     unsigned lines, const ScanOptions& options = {});
  bool IsA(unsigned typeCode) const override;

  /// The first record, and its first part, that a pixel lies in.
  bool HitTest(const Point2D<unsigned>& point, std::uint32_t& record, std::uint32_t& part);
  /// Adds the geometry to the mask of a rectangle: one of its size keeps its marks, another becomes
  /// one of zeros.
  /// @param count  [out] pixels that were set now.
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count);

  /// The records that may have pixels in a window, ascending by id.
  std::vector<std::int32_t> FindRecords(const RegionWindow& window);
  /// The pixels of a record, of all rows down to those of a window at least.
  /// @return null, with the fault set, when the record can't be carried to the grid.
  std::shared_ptr<const SpanRows> RowsOf(std::int32_t record, const RegionWindow& window);
  /// Calls `take` with the records that may have pixels in a window, ascending by id, each with its
  /// rows. @return false, with the fault set, when a record can't be carried to the grid.
  bool ForEachRecord(const RegionWindow& window,
                     const std::function<void(std::int32_t, const SpanRows&)>& take);
  /// Marks the pixels of all records in a window. False, with the fault set, when one can't be
  /// carried.
  bool Mark(RegionMarks& marks);
  /// Says whether a window lies wholly inside one record or outside of all.
  RegionCover Cover(const RegionWindow& window);
  /// HitTest of the only pixel of a window.
  bool HitTest(const RegionWindow& pixel, std::uint32_t& record, std::uint32_t& part);

 private:
  struct Sight {
    std::shared_ptr<const RecordIndex> index;
    std::uint64_t generation;
  };
  Sight Refresh();
  std::shared_ptr<const SpanRows> RowsOf(std::int32_t record, const RegionWindow& window,
                                         const Sight& sight);
  std::uint64_t CountChanges() const;
  RecordBox BoxOf(int record) const;
  RasterizedGeometryRecordPtr Record(int record);
  std::int64_t RowLimitFor(const RegionWindow& window) const;

  GeometryPtr geometry_;
  GeoRefPtr geoRef_;
  unsigned samples_;
  unsigned lines_;
  ScanOptions options_;
  std::mutex mutex_;
  Sight sight_{};
  std::uint64_t seenChanges_ = 0;
  Map<int, RasterizedGeometryRecordPtr> records_;
};

using RasterizedGeometryPtr = Pointer<RasterizedGeometry>;

/// True when shapes have to be carried to the coordinate system of a grid.
VEXG_EXPORT bool AreProjected(const Geometry& geometry, const GeoRefPtr& geoRef,
                              const ScanOptions& options);

/// A geometry in the coordinate system of a grid, itself where it needs no carrying.
VEXG_EXPORT GeometryPtr ShownOnGrid(const GeometryPtr& geometry, const GeoRefPtr& geoRef,
                                    const ScanOptions& options);

}  // namespace lumo
