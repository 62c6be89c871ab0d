#include "tile_order.h"

#include <algorithm>
#include <bit>

#include "pyramid/pyramid_tasks.h"
#include "raster/level_reduction.h"

namespace lumo::pyramid {

TileOrder::TileOrder(const Header& header)
    : header_(header),
      isAlongZ_(header.BandGroups() != 1 && ReductionOf(static_cast<PyramidResamplingMethod>(
                                                header.resamplingMethod)) == LevelReduction::kTold),
      blocks_(header.Shape(0)),
      bits_(static_cast<unsigned>(
          std::bit_width(std::max({blocks_.Columns(), blocks_.Rows(), 1U}) - 1))) {
  if (!BeginBand()) band_ = header_.BandGroups();  // no level has a pixel
}

/// False when there is no tile.
bool TileOrder::BeginBand() {
  rows_ = {};
  index_ = 0;
  level_ = header_.levelMin;
  return isAlongZ_ ? FindAlongZ() : ChooseRow();
}

/// Goes to the next band, which has as many tiles.
void TileOrder::EndBand() {
  if (++band_ != header_.BandGroups()) BeginBand();
}

void TileOrder::Advance() {
  if (isAlongZ_) {
    if (!FindAlongZ()) EndBand();
    return;
  }
  if (++next_.column < header_.Shape(next_.level).Columns()) return;
  ++rows_[next_.level];
  if (!ChooseRow()) EndBand();
}

/// Finds the row of tiles whose lines come to their end first. False behind the last one.
bool TileOrder::ChooseRow() {
  constexpr std::uint64_t kNone = ~std::uint64_t{0};
  std::uint64_t least = kNone;
  for (unsigned level = header_.levelMin; level <= header_.levelMax; ++level) {
    const LevelShape shape = header_.Shape(level);
    if (shape.IsEmpty() || rows_[level] == shape.Rows()) continue;
    const unsigned row = rows_[level];
    const std::uint64_t lines = std::uint64_t{row} * shape.tileSide + shape.RowHeight(row);
    if (lines << level >= least) continue;
    least = lines << level;
    next_ = {level, 0, row, band_};
  }
  return least != kNone;
}

/// Finds the next tile whose blocks end at one of the walk. False behind the last block.
bool TileOrder::FindAlongZ() {
  const std::uint64_t end = std::uint64_t{1} << 2 * bits_;
  while (index_ < end) {
    const ZPosition at = PositionAlongZ(index_, bits_);
    if (at.x >= blocks_.Columns() || at.y >= blocks_.Rows()) {
      // A square of the walk that begins off the grid lies off it whole.
      const int zeros = index_ != 0 ? std::countr_zero(index_) : 0;
      index_ += std::uint64_t{1} << (zeros / 2 * 2);
      continue;
    }
    while (level_ <= header_.levelMax) {
      if (EndsAtBlock(level_++)) return true;
    }
    level_ = header_.levelMin;
    ++index_;
  }
  return false;
}

/// True where a tile of a level ends at the block, which is the next one then.
bool TileOrder::EndsAtBlock(unsigned level) {
  const LevelShape shape = header_.Shape(level);
  const ZPosition at = PositionAlongZ(index_, bits_);
  const auto column = static_cast<unsigned>(at.x >> level),
             row = static_cast<unsigned>(at.y >> level);
  if (column >= shape.Columns() || row >= shape.Rows()) return false;
  const auto lastOf = [&](std::uint64_t tile, unsigned blocks) {
    return std::min<std::uint64_t>(((tile + 1) << level) - 1, blocks - 1);
  };
  if (at.x != lastOf(column, blocks_.Columns()) || at.y != lastOf(row, blocks_.Rows()))
    return false;
  next_ = {level, column, row, band_};
  return true;
}

}  // namespace lumo::pyramid
