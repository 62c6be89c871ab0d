#include "raster/raster_iterator.h"

#include <cmath>

#include "foundation/type_code.h"
#include "raster/raster_def.h"
#include "raster/raster_iterator_body.h"

namespace lumo {
namespace {

TileDimensions AllBands(unsigned bands, unsigned width, unsigned height, unsigned border) {
  return {std::max(width, 1U), std::max(height, 1U), bands, border, border, border, border, 0};
}

unsigned DividedBy(unsigned number, unsigned divisor) {
  return divisor == 0 ? number : number / divisor;
}

/// Tiles of `size` pixels that cover `extent`.
unsigned TilesIn(unsigned extent, unsigned size) {
  return extent == 0 || size == 0 ? 0 : (extent - 1) / size + 1;
}

/// A run of the tiles of one axis: where it starts, and what lies in front and behind.
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
  return AllBands(raster->Bands(), raster->Samples(), lines, border);
}

TileDimensions SquareTiles(const BasicRaster* raster, std::size_t elementBytes, unsigned budget,
                           unsigned border) {
  if (raster == nullptr) return {};
  const auto units = static_cast<unsigned>(budget / elementBytes);
  const auto side = static_cast<unsigned>(std::sqrt(DividedBy(units, raster->Bands())));
  return AllBands(raster->Bands(), side, side, border);
}

TileDimensions SmartTiles(const BasicRaster* raster, std::size_t elementBytes, unsigned budget,
                          unsigned border) {
  if (raster == nullptr || raster->Samples() == 0) return {};
  return raster->GetRasterDef().tileHeight > 1 ? SquareTiles(raster, elementBytes, budget, border)
                                               : WideTiles(raster, elementBytes, budget, border);
}

TileDimensions StreamTiles(const BasicRaster* raster, std::size_t elementBytes, unsigned budget,
                           unsigned bands) {
  if (raster == nullptr) return {};
  RasterDef def = raster->GetRasterDef();
  def.samples = raster->Samples();
  def.lines = raster->Lines();
  def.bands = raster->Bands();
  return StreamTiles(def, elementBytes, budget, bands);
}

TileDimensions StreamTiles(const RasterDef& def, std::size_t elementBytes, unsigned budget,
                           unsigned bands) {
  if (def.samples == 0 || def.lines == 0) return {};
  const std::uint64_t pixelBytes = std::max<std::uint64_t>(elementBytes * bands, 1);
  const std::uint64_t pixels = std::max<std::uint64_t>(budget / pixelBytes, 1);
  const std::uint64_t samples = def.samples;
  const std::uint64_t lines = def.lines;

  // A block of the source that is far over the budget is read in parts: there may be none better.
  constexpr std::uint64_t kMostOver = 16;
  std::uint64_t stepX = 1;
  std::uint64_t stepY = 1;
  if (def.tileHeight > 1 && def.tileWidth != 0) {
    const std::uint64_t tileX = std::min<std::uint64_t>(def.tileWidth, samples);
    const std::uint64_t tileY = std::min<std::uint64_t>(def.tileHeight, lines);
    if (tileX * tileY <= kMostOver * pixels) {
      stepX = tileX;
      stepY = tileY;
    }
  }
  const auto steps = [](std::uint64_t room, std::uint64_t step) {
    return std::max<std::uint64_t>(room / step, 1) * step;
  };
  const std::uint64_t width = std::min(steps(pixels / stepY, stepX), samples);
  const std::uint64_t height =
      width < samples ? stepY : std::min(steps(pixels / samples, stepY), lines);
  return AllBands(def.bands, static_cast<unsigned>(width), static_cast<unsigned>(height), 0);
}

Interleave StreamOrder(const BasicRaster* raster) {
  if (raster == nullptr) return Interleave::BIP;
  const Interleave order = raster->GetRasterDef().interleave;
  return order == Interleave::None ? Interleave::BIP : order;
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

VEXG_INSTANCES(TWELVE, RasterIterator);

}  // namespace lumo
