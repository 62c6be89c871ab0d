#include "regions/pixel_address_roi_def.h"

#include <algorithm>

#include "foundation/type_code.h"
#include "regions/rasterized_pixel_address_roi.h"

namespace lumo {
namespace {

/// The bounds of points, of which there is at least one.
SubRect BoundsOf(const Array<Point2D<unsigned>>& points) {
  SubRect bounds(points[0].x, points[0].y, points[0].x, points[0].y);
  for (const Point2D<unsigned>& point : points) {
    bounds.left = std::min(bounds.left, point.x);
    bounds.top = std::min(bounds.top, point.y);
    bounds.right = std::max(bounds.right, point.x);
    bounds.bottom = std::max(bounds.bottom, point.y);
  }
  return bounds;
}

bool Overlap(const SubRect& a, const SubRect& b) {
  return a.left <= b.right && b.left <= a.right && a.top <= b.bottom && b.top <= a.bottom;
}

bool Overlap(const SubRect& rect, const RegionWindow& window) {
  return rect.left <= window.Right() && rect.right >= window.left && rect.top <= window.Bottom() &&
         rect.bottom >= window.top;
}

constexpr std::uint64_t kMostTiles = 1U << 22;
constexpr std::uint64_t kMostPixels = 0xFFFFFF00;  // of a side, in whole tiles

/// How many tiles a side of `size` pixels takes.
unsigned TilesFor(unsigned size) {
  return size == 0 ? 0 : (size - 1) / PixelAddressROIDef::kTileSize + 1;
}

}  // namespace

const unsigned PixelAddressTile::TypeCode = GloballyUniqueObjectTypeCode("PixelAddressTile");
const unsigned PixelAddressROIDef::TypeCode = GloballyUniqueObjectTypeCode("PixelAddressROIDef");

bool PixelAddressTile::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool PixelAddressROIDef::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || PixelBasedROIDef::IsA(typeCode);
}

PixelAddressTile::~PixelAddressTile() {
  const QueuingRWMutexLock lock(mutex_);
}

void PixelAddressTile::SetAddresses(const Array<Point2D<unsigned>>& points,
                                    const SubRect& rectangle) {
  if (points.GetCount() == 0) return;
  const QueuingRWMutexLock lock(mutex_);
  const bool held = !points_.empty();
  points_.clear();
  if (Overlap(rectangle, Rect())) {
    detail::Guarded(*this, [&] {
      for (const Point2D<unsigned>& point : points) {
        if (Holds(point)) points_.push_back(point);
      }
    });
    std::sort(points_.begin(), points_.end());
    points_.erase(std::unique(points_.begin(), points_.end()), points_.end());
  }
  if (!points_.empty()) {
    const auto count = static_cast<unsigned>(points_.size());
    bounds_ = BoundsOf(Array<Point2D<unsigned>>(points_.data(), ArrayDims(count)));
  }
  if (held || !points_.empty()) ++revision_;
}

void PixelAddressTile::Clear() {
  const QueuingRWMutexLock lock(mutex_);
  if (points_.empty()) return;
  points_.clear();
  ++revision_;
}

bool PixelAddressTile::Contains(const Point2D<unsigned>& point) const {
  const QueuingRWMutexLock lock(mutex_, false);
  return std::binary_search(points_.begin(), points_.end(), point);
}

void PixelAddressTile::Mark(RegionMarks& marks) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const RegionWindow& window = marks.Window();
  if (points_.empty() || !Overlap(bounds_, window)) return;
  const auto top = static_cast<unsigned>(std::max<std::int64_t>(window.top, 0));
  auto point = std::lower_bound(points_.begin(), points_.end(), Point2D<unsigned>{0, top});
  while (point != points_.end() && point->y <= window.Bottom()) {
    auto last = point;  // of a run of neighbours
    while (last + 1 != points_.end() && (last + 1)->y == point->y && (last + 1)->x == last->x + 1) {
      ++last;
    }
    marks.MarkSpan(point->y, point->x, last->x);
    point = last + 1;
  }
}

SubRect PixelAddressTile::Bounds() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return bounds_;
}

std::size_t PixelAddressTile::PointCount() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return points_.size();
}

std::uint32_t PixelAddressTile::Revision() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return revision_;
}

PixelAddressROIDef::PixelAddressROIDef(unsigned samples, unsigned lines) : growable_(false) {
  MakeGrid(samples, lines);
}

PixelAddressROIDef::~PixelAddressROIDef() {
  const QueuingRWMutexLock lock(mutex_);
}

/// Makes the grid anew; tiles that are there keep their place. Nothing changes where it can't be
/// had.
bool PixelAddressROIDef::MakeGrid(unsigned samples, unsigned lines) {
  const unsigned columns = TilesFor(samples);
  const unsigned rows = TilesFor(lines);
  if (columns == 0 || rows == 0) return true;
  return detail::Guarded(*this, [&] {
    if (std::uint64_t{columns} * rows > kMostTiles) throw std::bad_alloc();
    Array<PixelAddressTilePtr> tiles{ArrayDims(rows, columns)};
    if (!tiles.IsValid()) throw std::bad_alloc();
    for (unsigned row = 0; row < rows; ++row) {
      for (unsigned column = 0; column < columns; ++column) {
        const unsigned left = column * kTileSize;
        const unsigned top = row * kTileSize;
        PixelAddressTilePtr& tile = tiles[std::size_t{row} * columns + column];
        tile = row < tileRows_ && column < tileColumns_
                   ? TileAt(row, column)
                   : PixelAddressTilePtr(new PixelAddressTile(left, top,
                                                              std::min(kTileSize, samples - left),
                                                              std::min(kTileSize, lines - top)));
      }
    }
    tiles_ = std::move(tiles);
    tileColumns_ = columns;
    tileRows_ = rows;
    samples_ = samples;
    lines_ = lines;
  });
}

/// Grows the grid to cover a rectangle.
bool PixelAddressROIDef::GrowTo(const SubRect& rect) {
  const unsigned columns = rect.right / kTileSize + 1;
  const unsigned rows = rect.bottom / kTileSize + 1;
  if (columns <= tileColumns_ && rows <= tileRows_) return true;
  const std::uint64_t samples = std::uint64_t{kTileSize} * std::max(columns, tileColumns_);
  const std::uint64_t lines = std::uint64_t{kTileSize} * std::max(rows, tileRows_);
  if (std::max(samples, lines) > kMostPixels) {
    SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
  if (!MakeGrid(static_cast<unsigned>(samples), static_cast<unsigned>(lines))) return false;
  ++gridRevision_;
  return true;
}

bool PixelAddressROIDef::SetAddresses(const Array<Point2D<unsigned>>& points) {
  const QueuingRWMutexLock lock(mutex_);
  if (points.GetCount() == 0) {
    hasAddresses_ = false;
    for (const PixelAddressTilePtr& tile : tiles_) tile->Clear();
    return true;
  }
  const SubRect bounds = BoundsOf(points);
  std::vector<Point2D<unsigned>> sorted;
  if (!detail::Guarded(*this, [&] { sorted.assign(points.begin(), points.end()); })) return false;
  if (growable_ && !GrowTo(bounds)) return false;
  bounds_ = bounds;
  hasAddresses_ = true;
  // Each tile gets its own addresses alone, so that the time goes with their number.
  std::erase_if(sorted, [&](const Point2D<unsigned>& point) {
    return point.x >= samples_ || point.y >= lines_;
  });
  const auto tileOf = [&](const Point2D<unsigned>& point) {
    return std::size_t{point.y / kTileSize} * tileColumns_ + point.x / kTileSize;
  };
  std::sort(sorted.begin(), sorted.end(),
            [&](const auto& a, const auto& b) { return tileOf(a) < tileOf(b); });
  auto own = sorted.begin();
  for (std::size_t i = 0; i < tiles_.GetCount(); ++i) {
    const auto begin = own;
    while (own != sorted.end() && tileOf(*own) == i) ++own;
    if (own == begin) {
      tiles_[i]->Clear();
      continue;
    }
    const ArrayDims dims(static_cast<unsigned>(own - begin));
    tiles_[i]->SetAddresses(Array<Point2D<unsigned>>(&*begin, dims), bounds);
  }
  return true;
}

RasterizedROIPtr PixelAddressROIDef::Rasterize(const ROIDefPtr& self, unsigned samples,
                                               unsigned lines,
                                               const lumo::GeoRefPtr& geoRef) const {
  return RasterizedROIPtr(
      new RasterizedPixelAddressROI(PixelAddressROIDefPtr(self), samples, lines, geoRef));
}

bool PixelAddressROIDef::Contains(const Point2D<unsigned>& point) const {
  const QueuingRWMutexLock lock(mutex_, false);
  return point.y < lines_ && point.x < samples_ && tiles_.GetCount() != 0 &&
         TileAt(point.y / kTileSize, point.x / kTileSize)->Contains(point);
}

bool PixelAddressROIDef::Mask(const SubRect& rect, Array<unsigned char>& mask,
                              std::uint64_t& count) const {
  return Mask(rect, 0, 0, mask, count);
}

bool PixelAddressROIDef::Mask(const SubRect& rect, std::int32_t dx, std::int32_t dy,
                              Array<unsigned char>& mask, std::uint64_t& count) const {
  count = 0;
  if (!ShapeMask(rect, mask)) return false;
  RegionMarks marks(WindowOf(rect).Moved(dx, dy), mask.GetData());
  Mark(marks);
  count = marks.Count();
  return true;
}

void PixelAddressROIDef::Mark(RegionMarks& marks) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const RegionWindow& window = marks.Window();
  if (!hasAddresses_ || !Overlap(bounds_, window)) return;
  const auto tileOf = [](std::int64_t place, unsigned tiles) {
    return static_cast<unsigned>(
        std::clamp<std::int64_t>(place / kTileSize, 0, std::int64_t{tiles} - 1));
  };
  for (unsigned row = tileOf(window.top, tileRows_); row <= tileOf(window.Bottom(), tileRows_);
       ++row) {
    for (unsigned column = tileOf(window.left, tileColumns_);
         column <= tileOf(window.Right(), tileColumns_); ++column) {
      TileAt(row, column)->Mark(marks);
    }
  }
}

bool PixelAddressROIDef::Bounds(SubRect& bounds) const {
  const QueuingRWMutexLock lock(mutex_, false);
  bounds = bounds_;
  return hasAddresses_;
}

GeoRefPtr PixelAddressROIDef::GeoRef() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return geoRef_;
}

void PixelAddressROIDef::SetGeoRef(const GeoRefPtr& geoRef) {
  const QueuingRWMutexLock lock(mutex_);
  geoRef_ = geoRef;
}

unsigned PixelAddressROIDef::Lines() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return lines_;
}

unsigned PixelAddressROIDef::Samples() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return samples_;
}

unsigned PixelAddressROIDef::TileColumns() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return tileColumns_;
}

unsigned PixelAddressROIDef::TileRows() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return tileRows_;
}

PixelAddressTilePtr PixelAddressROIDef::Tile(unsigned row, unsigned column) const {
  const QueuingRWMutexLock lock(mutex_, false);
  return row < tileRows_ && column < tileColumns_ ? TileAt(row, column) : PixelAddressTilePtr();
}

std::uint32_t PixelAddressROIDef::GridRevision() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return gridRevision_;
}

}  // namespace lumo
