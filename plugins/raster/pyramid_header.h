#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <string>

#include "foundation/packing.h"
#include "pyramid/level_shape.h"

namespace lumo::pyramid {

static_assert(std::endian::native == std::endian::little, "the file's numbers are little endian");

/// A run of the file, and the checksum of its bytes.
struct Extent {
  std::uint64_t offset = 0;
  std::uint64_t bytes = 0;
  std::uint64_t checksum = 0;
};

/// A stored tile: pixels, then states where it has any. A part that is as long as what it stands
/// for lies there plainly.
struct TileEntry {
  std::uint64_t offset = 0;  ///< 0 while the tile isn't written
  std::uint32_t pixelBytes = 0;
  std::uint32_t stateBytes = 0;
  std::uint64_t checksum = 0;  ///< of both
};

inline constexpr unsigned kLevelCount = 32;
inline constexpr unsigned kMostTileSide = 2048;
/// Two headers lie at the beginning of a file, in sectors of their own; the valid one with the
/// higher sequence number counts.
inline constexpr std::uint64_t kHeaderPlaces[] = {0, 4096};
inline constexpr std::uint64_t kDataBegin = 8192;

/// The description of a pyramid file at its start.
struct Header {
  std::uint64_t sequence = 0;
  std::uint64_t fileBytes = 0;  ///< that are in use
  std::uint32_t samples = 0;    ///< of the raster
  std::uint32_t lines = 0;
  std::uint32_t bands = 0;
  std::uint32_t dataType = 0;  ///< code
  std::uint32_t tileSide = 0;
  std::uint32_t levelMin = 0;
  std::uint32_t levelMax = 0;
  std::uint32_t resamplingMethod = 0;
  Packing compression = Packing::kNone;
  std::uint32_t reserved = 0;
  Extent values;                           ///< text of the values of bands
  std::array<Extent, kLevelCount> levels;  ///< by level: its TileEntries, by row, column and band

  bool HasLevel(unsigned level) const { return level >= levelMin && level <= levelMax; }
  LevelTiling Tiling() const { return TilingOf(bands, tileSide); }
  LevelShape Shape(unsigned level) const { return {samples, lines, level, Tiling().side}; }
  unsigned BandGroups() const { return bands / Tiling().bands; }
  /// Tiles of a level; kTooMany when 48 bits can't count them.
  std::uint64_t TileCount(unsigned level) const;
  /// Number of a tile in its level. Of a raster that is stored band by band `band` counts.
  std::uint64_t TileNumber(unsigned level, unsigned column, unsigned row, unsigned band) const;

  static constexpr std::uint64_t kTooMany = ~std::uint64_t{0};
};

/// A header as it stands in the file.
struct StoredHeader {
  char magic[16];
  Header header;
  std::uint64_t checksum;  // of all before
};

inline constexpr char kMagic[16] = "VEXGPYRAMID01\n";

/// The bytes of a header.
StoredHeader Store(const Header& header);

/// Gives the reason why no raster and levels can be as described; null when they can.
const char* FindFault(const Header& header);

/// Takes over a header from its bytes.
/// @param fileBytes  that the file has.
/// @param fault      [out] what is wrong with it.
bool Load(const StoredHeader& stored, std::uint64_t fileBytes, Header& header, std::string& fault);

/// True when the bytes begin as a file of this kind, of whatever version.
bool HasMagic(const StoredHeader& stored);

}  // namespace lumo::pyramid
