#include "fx/tile_stitcher.h"

#include <map>
#include <random>
#include <set>

#include <gtest/gtest.h>

namespace lumo {
namespace {

using Labels = std::vector<std::int32_t>;

TEST(TileStitcher, TakesTheLabelThatIsSharedMost) {
  // Two tiles of 2 by 4; the first has a border of one column.
  const Labels left{1, 1, 1,  //
                    1, 1, 2,  //
                    3, 3, 2,  //
                    3, 3, 3};
  TileStitcher stitcher(2, 2, 4);
  Labels out(left.size(), 9);
  stitcher.Stitch(0, 0, {2, 4, 1, 0, 1, 0, 0, 1}, left.data(), nullptr, out.data());
  EXPECT_EQ(out, left);  // 1, 2, 3 in the order of the tile's labels
  // Label 5 shares two pixels with 2 and one with 1; label 2 one with 3; label 7 shares none.
  const Labels right{5, 7,  //
                     5, 7,  //
                     5, 2,  //
                     2, 2};
  Labels stitched(right.size(), 9);
  stitcher.Stitch(1, 0, {2, 4, 1, 0, 0, 0, 0, 1}, right.data(), nullptr, stitched.data());
  EXPECT_EQ(stitched, (Labels{2, 4, 2, 4, 2, 3, 3, 3}));
  EXPECT_EQ(stitcher.LabelCount(), 4U);
}

TEST(TileStitcher, MatchesTheRowAboveAndLeavesOutExcludedPixels) {
  TileStitcher stitcher(2, 1, 2);
  // Tiles of 1 by 2 with a border of 1 where another follows.
  const Labels first{1, 2,  //
                     1, 3,  //
                     1, 3};
  Labels out(6);
  stitcher.Stitch(0, 0, {1, 2, 1, 0, 1, 0, 1, 1}, first.data(), nullptr, out.data());
  // One segment, which shares one pixel with 2 and two with 3.
  const Labels second{8, 8, 8};
  Labels out2(3);
  stitcher.Stitch(1, 0, {1, 2, 1, 0, 0, 0, 1, 1}, second.data(), nullptr, out2.data());
  EXPECT_EQ(out2, (Labels{3, 3, 3}));
  // Excluded pixels share nothing and have no label.
  const Labels third{4, 6, 4, 6};
  const std::vector<std::uint8_t> excluded{0, 1, 0, 0};
  Labels out3(4);
  stitcher.Stitch(0, 1, {1, 2, 1, 0, 1, 0, 0, 1}, third.data(), excluded.data(), out3.data());
  EXPECT_EQ(out3, (Labels{1, 0, 1, 4}));
}

/// Cells of random points on a plane: segments that reach over tiles.
Labels MakeCells(unsigned side, std::mt19937& random) {
  std::vector<std::pair<int, int>> points(40);
  for (auto& [x, y] : points) {
    x = static_cast<int>(random() % side);
    y = static_cast<int>(random() % side);
  }
  Labels labels(std::size_t{side} * side);
  for (unsigned i = 0; i < labels.size(); ++i) {
    const int x = static_cast<int>(i % side), y = static_cast<int>(i / side);
    int best = 0, least = 1 << 30;
    for (int p = 0; p < static_cast<int>(points.size()); ++p) {
      const auto& [px, py] = points[static_cast<std::size_t>(p)];
      const int distance = (x - px) * (x - px) + (y - py) * (y - py);
      if (distance < least) {
        least = distance;
        best = p;
      }
    }
    labels[i] = best + 1;
  }
  return labels;
}

TEST(TileStitcher, GivesCutCellsOneLabelAlongARowOfTiles) {
  std::mt19937 random(3);
  constexpr unsigned kSide = 60, kTile = 20, kBorder = 2, kTiles = 3;
  for (int round = 0; round < 20; ++round) {
    const Labels cells = MakeCells(kSide, random);
    TileStitcher stitcher(kTiles, kTile, kSide);
    std::map<std::int32_t, std::set<std::int32_t>> cellsOf;  // of a stitched label
    std::map<std::int32_t, std::set<std::int32_t>> labelsOf;
    for (unsigned column = 0; column < kTiles; ++column) {
      const unsigned left = column == 0 ? 0 : kBorder, right = column + 1 < kTiles ? kBorder : 0;
      const TileDimensions shape{kTile, kSide, 1, left, right, 0, 0, 1};
      const unsigned width = kTile + left + right;
      std::map<std::int32_t, std::int32_t> own;  // the tile's own numbers
      Labels labels(std::size_t{width} * kSide), out(labels.size());
      const auto cellAt = [&](std::size_t i) {
        return cells[i / width * kSide + column * kTile - left + i % width];
      };
      for (std::size_t i = 0; i < labels.size(); ++i) {
        const auto next = static_cast<std::int32_t>(own.size()) + 1;
        labels[i] = own.emplace(cellAt(i), next).first->second;
      }
      stitcher.Stitch(column, 0, shape, labels.data(), nullptr, out.data());
      for (std::size_t i = 0; i < labels.size(); ++i) {
        const std::size_t x = i % width;
        if (x < left || x >= left + kTile) continue;
        cellsOf[out[i]].insert(cellAt(i));
        labelsOf[cellAt(i)].insert(out[i]);
      }
    }
    // Cells are convex, so one that lies in two tiles has pixels in the column that both have.
    for (const auto& [label, its] : cellsOf) EXPECT_EQ(its.size(), 1U) << label;
    for (const auto& [cell, its] : labelsOf) EXPECT_EQ(its.size(), 1U) << cell;
  }
}

}  // namespace
}  // namespace lumo
