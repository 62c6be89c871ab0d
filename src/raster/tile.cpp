#include "raster/tile.h"

#include "foundation/type_code.h"
#include "raster/interleave.h"
#include "raster/tile_body.h"

namespace lumo {
namespace {

bool AnyBit(const BasicTile& tile, int x, int y, unsigned char bit) {
  const unsigned char* const states = tile.StateArray().GetData() + tile.Offset(x, y);
  return std::any_of(states, states + tile.Bands(), [bit](unsigned char s) { return s & bit; });
}

bool AllBits(const BasicTile& tile, int x, int y, unsigned char bit) {
  const unsigned char* const states = tile.StateArray().GetData() + tile.Offset(x, y);
  return std::all_of(states, states + tile.Bands(), [bit](unsigned char s) { return s & bit; });
}

void SetBit(unsigned char& state, unsigned char bit, bool on) {
  state = static_cast<unsigned char>(on ? state | bit : state & ~bit);
}

void SetBits(BasicTile& tile, int x, int y, unsigned char bit, bool on) {
  unsigned char* const states = tile.StateArray().GetData() + tile.Offset(x, y);
  for (unsigned band = 0; band < tile.Bands(); ++band) SetBit(states[band], bit, on);
}

using State = PixelValueState;

}  // namespace

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
  std::ranges::fill(state_, static_cast<unsigned char>(State::Valid));
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

bool BasicTile::AllNoData(int x, int y) const {
  return AllBits(*this, x, y, State::NoData);
}
bool BasicTile::AnyNoData(int x, int y) const {
  return AnyBit(*this, x, y, State::NoData);
}
bool BasicTile::IsNoData(int x, int y, unsigned band) const {
  return (PixelState(x, y, band) & State::NoData) != 0;
}
void BasicTile::SetNoData(int x, int y, unsigned band, bool on) {
  SetBit(state_[Offset(x, y) + band], State::NoData, on);
}
void BasicTile::SetNoDataAll(int x, int y, bool on) {
  SetBits(*this, x, y, State::NoData, on);
}

bool BasicTile::AllMasked(int x, int y) const {
  return AllBits(*this, x, y, State::Masked);
}
bool BasicTile::AnyMasked(int x, int y) const {
  return AnyBit(*this, x, y, State::Masked);
}
bool BasicTile::IsMasked(int x, int y, unsigned band) const {
  return (PixelState(x, y, band) & State::Masked) != 0;
}
void BasicTile::SetMasked(int x, int y, unsigned band, bool on) {
  SetBit(state_[Offset(x, y) + band], State::Masked, on);
}
void BasicTile::SetMaskedAll(int x, int y, bool on) {
  SetBits(*this, x, y, State::Masked, on);
}

bool BasicTile::AllOutsideROI(int x, int y) const {
  return AllBits(*this, x, y, State::OutsideROI);
}
bool BasicTile::AnyOutsideROI(int x, int y) const {
  return AnyBit(*this, x, y, State::OutsideROI);
}
bool BasicTile::IsOutsideROI(int x, int y, unsigned band) const {
  return (PixelState(x, y, band) & State::OutsideROI) != 0;
}
void BasicTile::SetOutsideROI(int x, int y, unsigned band, bool on) {
  SetBit(state_[Offset(x, y) + band], State::OutsideROI, on);
}
void BasicTile::SetOutsideROIAll(int x, int y, bool on) {
  SetBits(*this, x, y, State::OutsideROI, on);
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
      unsigned char joined = State::NoData;
      if (contains(x, y)) {
        joined = 0;
        const unsigned char* const from = shape.StateArray().GetData() + shape.Offset(x, y);
        for (unsigned band = 0; band < shape.Bands(); ++band) joined |= from[band];
        joined &= State::NotValid;
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
