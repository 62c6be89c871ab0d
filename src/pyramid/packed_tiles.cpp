#include "pyramid/packed_tiles.h"

#include <algorithm>

#include "raster/raster_enums.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

constexpr unsigned char kMasks = PixelValueState::NotValid & ~PixelValueState::NoData;

/// Packs bytes, and gives those to store.
std::span<const unsigned char> Packed(std::span<const unsigned char> plain, Packing packing,
                                      RawBytes& packed) {
  PackBytes(packing, plain, packed);
  return packed.Count() != 0 ? packed.All() : plain;
}

void PackTile(const PlainTiles& tiles, unsigned index, Packing packing, TileToStore& tile) {
  // The tiles in front are as wide as they come.
  const std::uint64_t before = index * tiles.ValuesOf(0), values = tiles.ValuesOf(index);
  tile.pixels = Packed({tiles.pixels + before * tiles.valueBytes, values * tiles.valueBytes},
                       packing, tile.packedPixels);
  const std::span<const unsigned char> states(tiles.states + before, values);
  if (std::ranges::any_of(states, [](unsigned char state) { return (state & kMasks) != 0; })) {
    tile.maskStates.Resize(values);
    std::ranges::transform(states, tile.maskStates.Get(),
                           [](unsigned char s) -> unsigned char { return s & kMasks; });
    tile.states = Packed(tile.maskStates.All(), packing, tile.packedStates);
  }
  tile.entry = {static_cast<std::uint32_t>(tile.pixels.size()),
                static_cast<std::uint32_t>(tile.states.size()),
                tile.states.empty() ? Checksum(tile.pixels.data(), tile.pixels.size())
                                    : Checksum(tile.pixels.data(), tile.pixels.size(),
                                               tile.states.data(), tile.states.size())};
}

}  // namespace

std::vector<TileToStore> PackTiles(const PlainTiles& tiles, Packing packing) {
  std::vector<TileToStore> packed(tiles.columns);
  ParallelFor(tiles.columns, nullptr, [&](unsigned i) { PackTile(tiles, i, packing, packed[i]); });
  return packed;
}

}  // namespace lumo
