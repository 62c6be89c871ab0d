#include "pyramid_header.h"

#include <cstring>
#include <string_view>
#include <type_traits>

#include "raster/level_reduction.h"
#include "raster/pixel_types.h"

namespace lumo::pyramid {

static_assert(std::is_trivially_copyable_v<StoredHeader> &&
              std::has_unique_object_representations_v<Header> && sizeof(TileEntry) == 24);

std::uint64_t Header::TileCount(unsigned level) const {
  constexpr std::uint64_t kMost = std::uint64_t{1} << 48;
  const LevelShape shape = Shape(level);
  const std::uint64_t tiles = std::uint64_t{shape.Columns()} * shape.Rows();
  if (tiles > kMost / BandGroups()) return kTooMany;
  return tiles * BandGroups();
}

std::uint64_t Header::TileNumber(unsigned level, unsigned column, unsigned row,
                                 unsigned band) const {
  const std::uint64_t place = std::uint64_t{row} * Shape(level).Columns() + column;
  return BandGroups() == 1 ? place : place * bands + band;
}

StoredHeader Store(const Header& header) {
  StoredHeader stored;
  std::memcpy(stored.magic, kMagic, sizeof kMagic);
  stored.header = header;
  stored.checksum = Checksum(&stored, offsetof(StoredHeader, checksum));
  return stored;
}

bool HasMagic(const StoredHeader& stored) {
  constexpr std::string_view kBegin = "VEXGPYRAMID";
  return std::string_view(stored.magic, sizeof stored.magic).starts_with(kBegin);
}

const char* FindFault(const Header& h) {
  constexpr std::uint32_t kMethods = kLastLevelMethod;
  if (h.samples == 0 || h.lines == 0 || h.bands == 0) return "a raster without pixels";
  if (DataTypeBytes(h.dataType) == 0) return "no such pixel type";
  if (h.tileSide == 0 || h.tileSide > kMostTileSide) return "tiles are 1 to 2048 pixels wide";
  if (h.levelMin > h.levelMax || h.levelMax >= kLevelCount) return "levels go from 0 to 31";
  if (h.resamplingMethod > kMethods) return "no such way of resampling";
  if (h.compression > Packing::kLz4) return "no such compression";
  for (unsigned level = h.levelMin; level <= h.levelMax; ++level) {
    if (h.TileCount(level) == Header::kTooMany) return "too many tiles";
  }
  return nullptr;
}

namespace {

bool LiesInside(const Extent& extent, std::uint64_t fileBytes) {
  return extent.offset >= kDataBegin && extent.offset <= fileBytes &&
         extent.bytes <= fileBytes - extent.offset;
}

const char* FindFaultOfPlaces(const Header& h, std::uint64_t fileBytes) {
  constexpr std::uint64_t kMostValueBytes = std::uint64_t{256} << 20;
  constexpr std::uint64_t kMostChanges = std::uint64_t{1} << 62;
  if (h.fileBytes < kDataBegin || h.fileBytes > fileBytes) return "the file is cut off";
  if (h.sequence > kMostChanges) return "the header is damaged";
  if (!LiesInside(h.values, h.fileBytes) || h.values.bytes > kMostValueBytes) {
    return "its values lie outside of it";
  }
  for (unsigned level = h.levelMin; level <= h.levelMax; ++level) {
    const Extent& index = h.levels[level];
    if (!LiesInside(index, h.fileBytes)) return "the index of a level lies outside of it";
    if (index.bytes / sizeof(TileEntry) != h.TileCount(level) ||
        index.bytes % sizeof(TileEntry) != 0) {
      return "the index of a level has another size than the level";
    }
  }
  return nullptr;
}

}  // namespace

bool Load(const StoredHeader& stored, std::uint64_t fileBytes, Header& header, std::string& fault) {
  const char* why = nullptr;
  if (!HasMagic(stored)) {
    why = "isn't a whole pyramid";
  } else if (std::memcmp(stored.magic, kMagic, sizeof kMagic) != 0) {
    why = "the pyramid is of another version";
  } else if (stored.checksum != Checksum(&stored, offsetof(StoredHeader, checksum))) {
    why = "the header is damaged";
  } else {
    why = FindFault(stored.header);
    if (why == nullptr) why = FindFaultOfPlaces(stored.header, fileBytes);
  }
  if (why != nullptr) {
    fault = why;
    return false;
  }
  header = stored.header;
  return true;
}

}  // namespace lumo::pyramid
