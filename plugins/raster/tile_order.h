#pragma once

#include <array>
#include <compare>

#include "pyramid_header.h"

namespace lumo::pyramid {

/// Which tile of a pyramid.
struct TilePlace {
  unsigned level;
  unsigned column;
  unsigned row;
  unsigned band;  ///< of a raster that is stored band by band; else 0

  friend auto operator<=>(const TilePlace&, const TilePlace&) = default;
};

/// Walks through the tiles of a pyramid in the order in which they lie in its file, whoever makes
/// them: band by band where these are apart, then as the raster's lines below a row of tiles come
/// to their end, finer levels first. Of bands that are apart and read along Z, tile by tile, as the
/// blocks of the raster below one come to their end. So levels that are made at the same time, or
/// elsewhere, come to the same bytes.
class TileOrder {
 public:
  /// @param header  outlives the object.
  explicit TileOrder(const Header& header);

  /// True behind the last tile.
  bool IsAtEnd() const { return band_ == header_.BandGroups(); }
  /// The next tile, where there is one.
  const TilePlace& Next() const { return next_; }
  void Advance();

 private:
  bool BeginBand();
  void EndBand();
  bool ChooseRow();
  bool FindAlongZ();
  bool EndsAtBlock(unsigned level);

  const Header& header_;
  const bool isAlongZ_;
  unsigned band_ = 0;
  std::array<unsigned, kLevelCount> rows_{};  // that come next
  LevelShape blocks_;                         // of the raster, along Z
  unsigned bits_ = 0;                         // of the walk through them
  std::uint64_t index_ = 0;                   // of the block in the walk
  unsigned level_ = 0;                        // that is looked at next
  TilePlace next_{};
};

}  // namespace lumo::pyramid
