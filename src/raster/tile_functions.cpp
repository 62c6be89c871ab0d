#include "raster/tile_functions.h"

#include "foundation/fault.h"
#include "raster/block_strides.h"

namespace lumo::detail {
namespace {

/// How the states of the inner part of a tile lie.
struct InnerStates {
  explicit InnerStates(const BasicTile& tile)
      : strides(tile.Order(), tile.FullWidth(), tile.FullHeight(), tile.Bands()) {
    const std::size_t x = tile.BorderLeft(), y = tile.BorderTop();
    first = y * strides.line + x * strides.pixel;
  }

  std::size_t first = 0;
  BlockStrides strides;
};

void JoinBands(const BasicTile& from, BasicTile& to) {
  const InnerStates in(from), out(to);
  const unsigned char* const states = from.StateArray().GetData() + in.first;
  unsigned char* const joined = to.StateArray().GetData() + out.first;
  for (std::size_t y = 0; y < to.Height(); ++y) {
    for (std::size_t x = 0; x < to.Width(); ++x) {
      unsigned char any = 0;
      for (std::size_t band = 0; band < from.Bands(); ++band) {
        any |= states[y * in.strides.line + x * in.strides.pixel + band * in.strides.band];
      }
      any &= PixelValueState::NotValid;
      for (std::size_t band = 0; band < to.Bands(); ++band) {
        joined[y * out.strides.line + x * out.strides.pixel + band * out.strides.band] = any;
      }
    }
  }
}

}  // namespace

void TakeStates(const BasicTile& from, BasicTile& to) {
  if (from.HasNoStates()) return;
  if (from.Bands() != to.Bands()) return JoinBands(from, to);
  const unsigned char* const states = from.StateArray().GetData();
  unsigned char* const taken = to.StateArray().GetData();
  if (!from.Dimensions().HasBorders()) {
    std::copy_n(states, to.StateArray().GetCount(), taken);
    return;
  }
  const std::size_t rowCount = std::size_t{to.Width()} * to.Bands();
  for (std::size_t y = 0; y < to.Height(); ++y) {
    std::copy_n(states + from.Offset(0, static_cast<std::int64_t>(y)), rowCount,
                taken + y * rowCount);
  }
}

bool CheckSize(const BasicRaster* first, const BasicRaster* other) {
  if (first == nullptr || other == nullptr) {
    SetFault("a raster is missing");
    return false;
  }
  if (first->Samples() == other->Samples() && first->Lines() == other->Lines()) return true;
  const auto sizeOf = [](const BasicRaster& raster) {
    return std::to_string(raster.Samples()) + " by " + std::to_string(raster.Lines());
  };
  SetFault("the rasters have " + sizeOf(*first) + " and " + sizeOf(*other) + " pixels");
  return false;
}

}  // namespace lumo::detail
