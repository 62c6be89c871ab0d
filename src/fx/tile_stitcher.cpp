#include "fx/tile_stitcher.h"

#include <algorithm>
#include <limits>

namespace lumo {

TileStitcher::TileStitcher(std::uint32_t tilesAcross, std::uint32_t width, std::uint32_t height)
    : width_(width + 1),
      column_(std::size_t{height} + 1),
      rows_(std::size_t{tilesAcross} * (std::size_t{width} + 1)) {}

/// Matches the labels of `seam_`, and takes those that share more than what is known.
void TileStitcher::MatchSeam() {
  std::erase_if(seam_, [](const auto& pair) { return pair.first == 0 || pair.second == 0; });
  std::sort(seam_.begin(), seam_.end());
  for (auto at = seam_.begin(); at != seam_.end();) {
    const auto end = std::find_if(at, seam_.end(), [&](const auto& pair) { return pair != *at; });
    const auto shared = static_cast<std::uint32_t>(end - at);
    Target& target = targets_[static_cast<std::size_t>(at->first)];
    if (shared > target.shared) {  // of equal ones the lower label has come first
      target.label = at->second;
      target.shared = shared;
    }
    at = end;
  }
}

void TileStitcher::Stitch(std::uint32_t column, std::uint32_t row, const TileDimensions& shape,
                          const std::int32_t* labels, const std::uint8_t* excluded,
                          std::int32_t* stitched) {
  const std::size_t fullWidth = std::size_t{shape.width} + shape.borderLeft + shape.borderRight;
  const std::size_t fullHeight = std::size_t{shape.height} + shape.borderTop + shape.borderBottom;
  const auto placeOf = [&](std::size_t x, std::size_t y) {
    return (y + shape.borderTop) * fullWidth + x + shape.borderLeft;
  };
  const auto labelAt = [&](std::size_t place) {
    return excluded != nullptr && excluded[place] != 0 ? 0 : labels[place];
  };
  // The pixels that get labels: one more on the sides where another tile follows.
  const std::size_t columns = shape.width + (shape.borderRight != 0 ? 1U : 0U);
  const std::size_t lines = shape.height + (shape.borderBottom != 0 ? 1U : 0U);

  targets_.clear();
  for (std::size_t place = 0; place < fullWidth * fullHeight; ++place) {
    const auto label = static_cast<std::size_t>(labelAt(place));
    if (label >= targets_.size()) targets_.resize(label + 1);
    targets_[label].isThere = true;
  }
  std::int32_t* const rowAbove = rows_.data() + std::size_t{column} * width_;
  if (column > 0) {
    seam_.clear();
    for (std::size_t y = 0; y < lines; ++y) seam_.emplace_back(labelAt(placeOf(0, y)), column_[y]);
    MatchSeam();
  }
  if (row > 0) {
    seam_.clear();
    for (std::size_t x = 0; x < columns; ++x) {
      seam_.emplace_back(labelAt(placeOf(x, 0)), rowAbove[x]);
    }
    MatchSeam();
  }
  constexpr auto kMost = static_cast<std::uint32_t>(std::numeric_limits<std::int32_t>::max());
  for (std::size_t label = 1; label < targets_.size(); ++label) {
    Target& target = targets_[label];
    if (!target.isThere || target.label != 0) continue;
    if (given_ < kMost) ++given_;
    target.label = static_cast<std::int32_t>(given_);
  }
  if (!targets_.empty()) targets_[0].label = 0;

  std::fill_n(stitched, fullWidth * fullHeight, 0);
  for (std::size_t y = 0; y < lines; ++y) {
    for (std::size_t x = 0; x < columns; ++x) {
      const std::size_t place = placeOf(x, y);
      stitched[place] = targets_[static_cast<std::size_t>(labelAt(place))].label;
    }
  }
  for (std::size_t y = 0; y < lines; ++y) column_[y] = stitched[placeOf(columns - 1, y)];
  for (std::size_t x = 0; x < columns; ++x) rowAbove[x] = stitched[placeOf(x, lines - 1)];
}

}  // namespace lumo
