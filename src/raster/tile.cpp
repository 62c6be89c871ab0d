#include "raster/tile.h"

#include <mutex>
#include <new>

#include "foundation/type_code.h"
#include "platform/zero_memory.h"
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
  if (!Size(dimensions, Interleave::BIP, true)) return false;
  std::ranges::fill(state_, static_cast<unsigned char>(PixelValueState::Valid));
  return true;
}

bool BasicTile::ResizeForOverwrite(const TileDimensions& dimensions, Interleave order) {
  return Size(dimensions, order, true);
}

bool BasicTile::ResizeAllValid(const TileDimensions& dimensions, Interleave order) {
  return Size(dimensions, order, false);
}

bool BasicTile::Size(const TileDimensions& dimensions, Interleave order, bool hasStates) {
  ClearErrorState();
  dimensions_ = dimensions;
  order_ = order;
  hasNoStates_ = false;
  constexpr std::size_t kMost = 0x7FFFFFFF;  // tile coordinates are int
  const bool possible = dimensions.width != 0 && dimensions.height != 0 && dimensions.bands != 0 &&
                        FullWidth() <= kMost && FullHeight() <= kMost;
  const ArrayDims dims = BlockDims(order, static_cast<unsigned>(FullWidth()),
                                   static_cast<unsigned>(FullHeight()), dimensions.bands);
  if (possible && ResizePixels(dims) && (hasStates ? state_.Resize(dims) : ShareStates(dims))) {
    return true;
  }
  ResizePixels(ArrayDims());
  state_.Resize(ArrayDims());
  noStates_ = Array<unsigned char>();
  origin_ = {};
  index_ = {};
  dimensions_ = {};
  order_ = Interleave::BIP;
  SetErrorState(ObjectErrorNotConstructed());
  return false;
}

/// Shows zeros for states; has an array of them where there are none to share.
bool BasicTile::ShareStates(const ArrayDims& dims) {
  const unsigned char* const zeros = platform::GetZeros(dims.count);
  if (zeros == nullptr) {
    if (!state_.Resize(dims)) return false;
    std::ranges::fill(state_, static_cast<unsigned char>(PixelValueState::Valid));
    return true;
  }
  noStates_ = Array<unsigned char>(const_cast<unsigned char*>(zeros), dims);
  hasNoStates_ = true;
  return true;
}

/// Gives the tile a state array of its own. Threads that work on parts of it may be here at once.
void BasicTile::MakeStates() {
  static std::mutex lock;
  const std::lock_guard locked(lock);
  if (!HasNoStates()) return;
  const ArrayDims dims = noStates_.GetDims();
  if (dims.count > state_.GetCapacity()) state_ = Array<unsigned char>();  // nothing to keep
  if (!state_.Resize(dims)) throw std::bad_alloc();
  std::ranges::fill(state_, static_cast<unsigned char>(PixelValueState::Valid));
  std::atomic_ref(hasNoStates_).store(false, std::memory_order_release);
}

bool BasicTile::HoldStates() {
  if (state_.GetDims() != BlockDims(order_, static_cast<unsigned>(FullWidth()),
                                    static_cast<unsigned>(FullHeight()), Bands())) {
    return false;
  }
  hasNoStates_ = false;
  return true;
}

bool BasicTile::AllHave(int x, int y, PixelValueState::Code bit) const {
  return AllHaveState(StateArray().GetData() + Offset(x, y), Bands(), bit);
}

bool BasicTile::AnyHas(int x, int y, PixelValueState::Code bit) const {
  return AnyHasState(StateArray().GetData() + Offset(x, y), Bands(), bit);
}

void BasicTile::Set(int x, int y, unsigned band, PixelValueState::Code bit, bool on) {
  SetState(StateArray()[Offset(x, y) + band], bit, on);
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
