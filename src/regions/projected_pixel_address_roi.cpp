#include "regions/projected_pixel_address_roi.h"

#include <algorithm>
#include <cmath>

#include "foundation/fault.h"
#include "foundation/type_code.h"
#include "geometry/label_vectorizer.h"
#include "geometry/memory_geometry_writer.h"
#include "geometry/polygon_batch.h"
#include "raster/tile.h"

namespace lumo {

const unsigned ProjectedPixelBasedTile::TypeCode =
    GloballyUniqueObjectTypeCode("ProjectedPixelBasedTile");
const unsigned ProjectedPixelAddressTile::TypeCode =
    GloballyUniqueObjectTypeCode("ProjectedPixelAddressTile");
const unsigned ProjectedPixelBasedROI::TypeCode =
    GloballyUniqueObjectTypeCode("ProjectedPixelBasedROI");
const unsigned ProjectedPixelAddressROI::TypeCode =
    GloballyUniqueObjectTypeCode("ProjectedPixelAddressROI");

bool ProjectedPixelBasedTile::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool ProjectedPixelAddressTile::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ProjectedPixelBasedTile::IsA(typeCode);
}
bool ProjectedPixelBasedROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ProjectedROI::IsA(typeCode);
}
bool ProjectedPixelAddressROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || ProjectedPixelBasedROI::IsA(typeCode);
}

bool ProjectedPixelAddressTile::CheckRevision() {
  const std::uint32_t revision = tile_->Revision();
  if (revision == seenRevision_) return false;
  seenRevision_ = revision;
  Forget();
  return true;
}

bool ProjectedPixelBasedTile::Region(const PixelBasedROIDef& definition, const GeoRefPtr& geoRef,
                                     RasterizedGeometryROIPtr& region) {
  const QueuingRWMutexLock lock(mutex_);
  CheckRevision();
  if (!region_ && !isEmpty_ && !Trace(definition, geoRef)) return false;
  region = region_;
  return true;
}

/// Traces the tile's pixels into polygons on the definition's map.
bool ProjectedPixelBasedTile::Trace(const PixelBasedROIDef& definition, const GeoRefPtr& geoRef) {
  const SubRect rect = SourceRect();
  Array<unsigned char> mask;
  std::uint64_t count = 0;
  if (!definition.Mask(rect, mask, count)) return false;
  isEmpty_ = count == 0;
  if (isEmpty_) return true;

  const GeoRefPtr own = definition.GeoRef();
  const MemoryGeometryPtr geometry(new MemoryGeometry(own->CoordinateSystem()));
  MemoryGeometryPolygonWriter<std::uint8_t> writer(geometry, rect.left, rect.top, own, {});
  PolygonBatch polygons;
  LabelVectorizer<std::uint8_t> vectorizer(rect.Width(), polygons);
  Array<unsigned char> states(mask.GetDims());
  std::transform(mask.begin(), mask.end(), states.begin(), [](unsigned char inside) {
    return inside != 0 ? PixelValueState::Valid : PixelValueState::Masked;
  });
  bool isTraced = true;
  for (unsigned line = 0; line < rect.Height() && isTraced; ++line) {
    const std::size_t at = std::size_t{line} * rect.Width();
    isTraced = vectorizer.AddLine(mask.GetData() + at, states.GetData() + at);
  }
  LabelCounts counts;
  if (!isTraced || !vectorizer.Finish() || !polygons.WriteTo<std::uint8_t>(writer, counts)) {
    SetFault("the region's pixels can't be carried to the raster");
    return false;
  }
  const ScanOptions onMap{ScanRules::kTold, ShapeCoordinates::kMap};
  region_.Reset(new RasterizedGeometryROI(GeometryROIDefPtr(new GeometryROIDef(geometry, onMap)), 0,
                                          0, geoRef));
  return true;
}

ProjectedPixelAddressROI::ProjectedPixelAddressROI(const PixelAddressROIDefPtr& definition,
                                                   const GeoRefPtr& geoRef)
    : ProjectedPixelBasedROI(geoRef), definition_(definition) {
  BuildTiles();
}

unsigned ProjectedPixelAddressROI::TileColumns() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return tiles_.GetCount() != 0 ? tiles_.GetExtent(1) : 0;
}

unsigned ProjectedPixelAddressROI::TileRows() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return tiles_.GetCount() != 0 ? tiles_.GetExtent(0) : 0;
}

ProjectedPixelBasedTilePtr ProjectedPixelAddressROI::Tile(unsigned column, unsigned row) const {
  const QueuingRWMutexLock lock(mutex_, false);
  if (tiles_.GetCount() == 0 || row >= tiles_.GetExtent(0) || column >= tiles_.GetExtent(1)) {
    return {};
  }
  return tiles_[std::size_t{row} * tiles_.GetExtent(1) + column];
}

void ProjectedPixelAddressROI::BuildTiles() {
  {
    const QueuingRWMutexLock lock(mutex_);
    tiles_.Resize(ArrayDims());
    seenGrid_ = ~definition_->GridRevision();
  }
  RefreshTiles();
}

void ProjectedPixelAddressROI::RefreshTiles() {
  const QueuingRWMutexLock lock(mutex_);
  const std::uint32_t grid = definition_->GridRevision();
  if (grid == seenGrid_) return;
  const unsigned columns = definition_->TileColumns();
  const unsigned rows = definition_->TileRows();
  seenGrid_ = grid;
  if (columns == 0 || rows == 0) return;
  Array<ProjectedPixelAddressTilePtr> tiles{ArrayDims(rows, columns)};
  const unsigned oldRows = tiles_.GetCount() != 0 ? tiles_.GetExtent(0) : 0;
  const unsigned oldColumns = tiles_.GetCount() != 0 ? tiles_.GetExtent(1) : 0;
  for (unsigned row = 0; row < rows; ++row) {
    for (unsigned column = 0; column < columns; ++column) {
      ProjectedPixelAddressTilePtr& tile = tiles[std::size_t{row} * columns + column];
      tile = row < oldRows && column < oldColumns
                 ? tiles_[std::size_t{row} * oldColumns + column]
                 : ProjectedPixelAddressTilePtr(
                       new ProjectedPixelAddressTile(definition_->Tile(row, column)));
    }
  }
  tiles_ = std::move(tiles);
}

/// The tiles that a rectangle of the definition's grid overlaps.
std::vector<ProjectedPixelAddressTilePtr> ProjectedPixelAddressROI::TilesIn(const MapRect& pixels) {
  RefreshTiles();
  const QueuingRWMutexLock lock(mutex_, false);
  std::vector<ProjectedPixelAddressTilePtr> found;
  for (const ProjectedPixelAddressTilePtr& tile : tiles_) {
    const SubRect rect = tile->SourceRect();
    if (pixels.minX < rect.right + 1.0 && pixels.maxX >= rect.left &&
        pixels.minY < rect.bottom + 1.0 && pixels.maxY >= rect.top) {
      found.push_back(tile);
    }
  }
  return found;
}

/// The rectangle of the definition's grid that a window comes to lie in, by points along its sides.
bool ProjectedPixelAddressROI::BoundsInDefinition(const RegionWindow& window,
                                                  MapRect& bounds) const {
  constexpr unsigned kSteps = 8;
  std::vector<double> points;
  for (unsigned i = 0; i <= kSteps; ++i) {
    const double part = static_cast<double>(i) / kSteps;
    const auto left = static_cast<double>(window.left);
    const auto top = static_cast<double>(window.top);
    const auto right = static_cast<double>(window.Right() + 1);
    const auto bottom = static_cast<double>(window.Bottom() + 1);
    const double x = left + (right - left) * part;
    const double y = top + (bottom - top) * part;
    points.insert(points.end(), {x, top, x, bottom, left, y, right, y});
  }
  Array<double> carried(points.data(), ArrayDims(4 * (kSteps + 1), 2));
  if (!geoRef_->PixelToPixel(carried, *definition_->GeoRef())) {
    SetFault("the raster's grid can't be carried to the region's");
    return false;
  }
  bounds = {points[0], points[1], points[0], points[1]};
  for (std::size_t i = 0; i < points.size(); i += 2) {
    bounds = {std::min(bounds.minX, points[i]), std::min(bounds.minY, points[i + 1]),
              std::max(bounds.maxX, points[i]), std::max(bounds.maxY, points[i + 1])};
  }
  return true;
}

bool ProjectedPixelAddressROI::HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) {
  info = ROIHitInfoPtr();
  double pixel[] = {point.x + 0.5, point.y + 0.5};
  Array<double> points(pixel, ArrayDims(1, 2));
  if (!geoRef_->PixelToPixel(points, *definition_->GeoRef())) return false;
  if (pixel[0] < 0 || pixel[0] >= definition_->Samples() || pixel[1] < 0 ||
      pixel[1] >= definition_->Lines()) {
    return false;
  }
  for (const ProjectedPixelAddressTilePtr& tile :
       TilesIn({pixel[0], pixel[1], pixel[0], pixel[1]})) {
    RasterizedGeometryROIPtr region;
    ROIHitInfoPtr inner;
    if (tile->Region(*definition_, geoRef_, region) && region && region->HitTest(point, inner)) {
      info = ROIHitInfoPtr(new ROIHitInfo(definition_, kPixelHit));
      return true;
    }
  }
  return false;
}

bool ProjectedPixelAddressROI::Mask(const SubRect& rect, Array<unsigned char>& mask,
                                    std::uint64_t& count) {
  return FreshMask(rect, mask, count);
}

bool ProjectedPixelAddressROI::Mark(RegionMarks& marks) {
  MapRect bounds;
  if (!BoundsInDefinition(marks.Window(), bounds)) return false;
  // The pixels of a scan may lie a little outside of its vertices.
  bounds = {bounds.minX - 2, bounds.minY - 2, bounds.maxX + 2, bounds.maxY + 2};
  for (const ProjectedPixelAddressTilePtr& tile : TilesIn(bounds)) {
    RasterizedGeometryROIPtr region;
    if (!tile->Region(*definition_, geoRef_, region)) return false;
    if (region && !region->Mark(marks)) return false;
  }
  return true;
}

RegionCover ProjectedPixelAddressROI::Cover(const RegionWindow&) {
  SubRect bounds;
  return definition_->Bounds(bounds) ? RegionCover::kPartly : RegionCover::kOutside;
}

}  // namespace lumo
