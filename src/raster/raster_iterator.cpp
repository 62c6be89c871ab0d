#include "raster/raster_iterator.h"

#include <cmath>

#include "foundation/type_code.h"
#include "raster/raster_def.h"
#include "raster/raster_iterator_impl.h"

namespace lumo {
namespace {

TileDimensions AllBands(const BasicRaster& raster, unsigned width, unsigned height,
                        unsigned border) {
  return {
      std::max(width, 1U), std::max(height, 1U), raster.Bands(), border, border, border, border, 0};
}

unsigned DividedBy(unsigned number, unsigned divisor) {
  return divisor == 0 ? number : number / divisor;
}

/// Tiles of `size` pixels that cover `extent`.
unsigned TilesIn(unsigned extent, unsigned size) {
  return extent == 0 || size == 0 ? 0 : (extent - 1) / size + 1;
}

/// A stretch of the tiles of one axis: where it starts, and what lies in front and behind.
struct Stretch {
  unsigned start;
  unsigned size;
  unsigned before;  ///< border of the tile
  unsigned behind;
  unsigned padBefore;  ///< what the raster has of it
  unsigned padBehind;
};

Stretch PlaceOnAxis(unsigned index, unsigned extent, unsigned tileSize, unsigned before,
                    unsigned behind, bool clamp) {
  Stretch s{};
  s.start = index * tileSize;  // the index is on the grid, so this is below the extent
  s.size = std::min(tileSize, extent - s.start);
  s.padBefore = std::min(before, s.start);
  s.padBehind = std::min(behind, extent - s.start - s.size);
  s.before = clamp ? s.padBefore : before;
  s.behind = clamp ? s.padBehind : behind;
  return s;
}

}  // namespace

TileDimensions WideTiles(const BasicRaster* raster, std::size_t elementBytes, unsigned budget,
                         unsigned border) {
  if (raster == nullptr) return {};
  const auto units = static_cast<unsigned>(budget / elementBytes);
  const unsigned lines = DividedBy(DividedBy(units, raster->Bands()), raster->Samples());
  return AllBands(*raster, raster->Samples(), lines, border);
}

TileDimensions SquareTiles(const BasicRaster* raster, std::size_t elementBytes, unsigned budget,
                           unsigned border) {
  if (raster == nullptr) return {};
  const auto units = static_cast<unsigned>(budget / elementBytes);
  const auto side = static_cast<unsigned>(std::sqrt(DividedBy(units, raster->Bands())));
  return AllBands(*raster, side, side, border);
}

TileDimensions SmartTiles(const BasicRaster* raster, std::size_t elementBytes, unsigned budget,
                          unsigned border) {
  if (raster == nullptr || raster->Samples() == 0) return {};
  return raster->GetRasterDef().tileHeight > 1 ? SquareTiles(raster, elementBytes, budget, border)
                                               : WideTiles(raster, elementBytes, budget, border);
}

const unsigned BasicRasterIterator::TypeCode = GloballyUniqueObjectTypeCode("BasicRasterIterator");

bool BasicRasterIterator::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

unsigned BasicRasterIterator::Columns() const {
  return grid_ == nullptr ? 0 : TilesIn(grid_->Samples(), dimensions_.width);
}

unsigned BasicRasterIterator::Rows() const {
  return grid_ == nullptr ? 0 : TilesIn(grid_->Lines(), dimensions_.height);
}

SubRect BasicRasterIterator::Placement::ReadRect() const {
  const unsigned left = x - padLeft;
  const unsigned top = y - padTop;
  return {left, top, x + tile.width - 1 + padRight, y + tile.height - 1 + padBottom};
}

void BasicRasterIterator::SetUp(const BasicRaster* raster, const TileDimensions& dimensions,
                                const Array<unsigned>* bands) {
  ClearErrorState();
  const auto exists = [&](unsigned band) { return band < raster->Bands(); };
  if (raster == nullptr || !raster->IsValid() ||
      (bands != nullptr && !std::ranges::all_of(*bands, exists))) {
    SetErrorState(ObjectErrorNotConstructed());
    return;
  }
  if (bands != nullptr) {
    bands_ = *bands;
  } else if (bands_.Resize(ArrayDims(raster->Bands()))) {
    for (unsigned i = 0; i < bands_.GetCount(); ++i) bands_[i] = i;
  }
  if (!bands_.IsValid()) {
    SetErrorState(ObjectErrorNotConstructed());
    return;
  }
  grid_ = raster;
  dimensions_ = dimensions;
  if (dimensions_.bands == 0) dimensions_.bands = raster->Bands();
}

bool BasicRasterIterator::Place(unsigned column, unsigned row, Placement& placement) const {
  if (column >= Columns() || row >= Rows()) return false;
  const TileDimensions& d = dimensions_;
  const bool clamp = d.borderClamp == 1;
  const Stretch x =
      PlaceOnAxis(column, grid_->Samples(), d.width, d.borderLeft, d.borderRight, clamp);
  const Stretch y = PlaceOnAxis(row, grid_->Lines(), d.height, d.borderTop, d.borderBottom, clamp);
  placement.tile = {x.size,   y.size,   BandCount(), x.before,
                    x.behind, y.before, y.behind,    d.borderClamp};
  placement.x = x.start;
  placement.y = y.start;
  placement.padLeft = x.padBefore;
  placement.padRight = x.padBehind;
  placement.padTop = y.padBefore;
  placement.padBottom = y.padBehind;
  return true;
}

template <typename T>
const unsigned RasterIterator<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("RasterIterator<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template class RasterIterator<std::uint8_t>;
template class RasterIterator<std::int8_t>;
template class RasterIterator<std::uint16_t>;
template class RasterIterator<std::int16_t>;
template class RasterIterator<std::uint32_t>;
template class RasterIterator<std::int32_t>;
template class RasterIterator<float>;
template class RasterIterator<double>;
template class RasterIterator<std::uint64_t>;
template class RasterIterator<std::int64_t>;
template class RasterIterator<Complex<float>>;
template class RasterIterator<Complex<double>>;

}  // namespace lumo
