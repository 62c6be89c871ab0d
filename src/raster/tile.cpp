#include "raster/tile.h"

#include "foundation/type_code.h"
#include "raster/pixel_states.h"
#include "raster/tile_body.h"

namespace lumo {

const unsigned BasicTile::TypeCode = GloballyUniqueObjectTypeCode("BasicTile");

bool BasicTile::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

bool BasicTile::Resize(unsigned width, unsigned height, unsigned bands, unsigned left,
                       unsigned right, unsigned top, unsigned bottom) {
  return Resize(TileDimensions{width, height, bands, left, right, top, bottom, 0});
}

bool BasicTile::Resize(unsigned width, unsigned height, unsigned bands, unsigned border) {
  return Resize(TileDimensions{width, height, bands, border, border, border, border, 0});
}

bool BasicTile::Resize(unsigned width, unsigned height, unsigned bands) {
  return Resize(TileDimensions{width, height, bands});
}

bool BasicTile::Resize(const TileDimensions& dimensions) {
  if (!Size(dimensions, Interleave::BIP)) return false;
  std::ranges::fill(state_, static_cast<unsigned char>(PixelValueState::Valid));
  return true;
}

bool BasicTile::ResizeForOverwrite(const TileDimensions& dimensions, Interleave order) {
  return Size(dimensions, order);
}

bool BasicTile::Size(const TileDimensions& dimensions, Interleave order) {
  ClearErrorState();
  dimensions_ = dimensions;
  order_ = order;
  constexpr std::size_t kMost = 0x7FFFFFFF;  // tile coordinates are int
  const bool possible = dimensions.width != 0 && dimensions.height != 0 && dimensions.bands != 0 &&
                        FullWidth() <= kMost && FullHeight() <= kMost;
  const ArrayDims dims = BlockDims(order, static_cast<unsigned>(FullWidth()),
                                   static_cast<unsigned>(FullHeight()), dimensions.bands);
  if (possible && ResizePixels(dims) && state_.Resize(dims)) return true;
  ResizePixels(ArrayDims());
  state_.Resize(ArrayDims());
  origin_ = {};
  index_ = {};
  dimensions_ = {};
  order_ = Interleave::BIP;
  SetErrorState(ObjectErrorNotConstructed());
  return false;
}

bool BasicTile::AllHave(int x, int y, PixelValueState::Code bit) const {
  return AllHaveState(state_.GetData() + Offset(x, y), Bands(), bit);
}

bool BasicTile::AnyHas(int x, int y, PixelValueState::Code bit) const {
  return AnyHasState(state_.GetData() + Offset(x, y), Bands(), bit);
}

void BasicTile::Set(int x, int y, unsigned band, PixelValueState::Code bit, bool on) {
  SetState(state_[Offset(x, y) + band], bit, on);
}

void BasicTile::SetAll(int x, int y, PixelValueState::Code bit, bool on) {
  for (unsigned band = 0; band < Bands(); ++band) Set(x, y, band, bit, on);
}

void JoinStates(const BasicTile& shape, BasicTile& tile) {
  const auto contains = [&](std::int64_t x, std::int64_t y) {
    return x >= -std::int64_t{shape.BorderLeft()} && y >= -std::int64_t{shape.BorderTop()} &&
           x < std::int64_t{shape.Width()} + shape.BorderRight() &&
           y < std::int64_t{shape.Height()} + shape.BorderBottom();
  };
  const std::int64_t left = -std::int64_t{tile.BorderLeft()};
  const std::int64_t top = -std::int64_t{tile.BorderTop()};
  unsigned char* to = tile.StateArray().GetData();
  for (std::int64_t y = top; y < top + static_cast<std::int64_t>(tile.FullHeight()); ++y) {
    for (std::int64_t x = left; x < left + static_cast<std::int64_t>(tile.FullWidth()); ++x) {
      unsigned char joined = PixelValueState::NoData;
      if (contains(x, y)) {
        joined = 0;
        const unsigned char* const from = shape.StateArray().GetData() + shape.Offset(x, y);
        for (unsigned band = 0; band < shape.Bands(); ++band) joined |= from[band];
        joined &= PixelValueState::NotValid;
      }
      to = std::fill_n(to, tile.Bands(), joined);
    }
  }
}

template <typename T>
const unsigned Tile<T>::TypeCode =
    GloballyUniqueObjectTypeCode(String("Tile<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

VEXG_INSTANCES(TWELVE, Tile);
VEXG_INSTANCES(EIGHT, TileFromTemplate);
template class TileFromTemplateBorder<double>;

}  // namespace lumo
