#include <cstring>
#include <random>

#include "raster/interleave_lines.h"

namespace lumo {
namespace {

/// Where element (sample, line, band) stands in a block, by the order of the axes.
std::size_t Position(Interleave order, std::size_t s, std::size_t l, std::size_t b,
                     std::size_t samples, std::size_t lines, std::size_t bands) {
  switch (order) {
    case Interleave::BIP:
      return (l * samples + s) * bands + b;
    case Interleave::BIL:
      return (l * bands + b) * samples + s;
    case Interleave::BSQ:
      return (b * lines + l) * samples + s;
    default:
      return l * samples + s;
  }
}

constexpr Interleave kOrders[] = {Interleave::None, Interleave::BIP, Interleave::BIL,
                                  Interleave::BSQ};

TEST(Interleave, PutsEveryElementWhereTheOrderOfTheAxesSays) {
  std::mt19937 random(3);
  const std::size_t shapes[][3] = {
      {1, 1, 1},    {5, 3, 2},    {17, 2, 3},  {33, 3, 4},  {19, 5, 6}, {64, 2, 15}, {7, 9, 16},
      {40, 2, 17},  {23, 3, 200}, {300, 2, 3}, {1, 50, 7},  {2, 1, 33}, {31, 4, 1},  {15, 1, 3},
      {16, 1, 3},   {17, 3, 6},   {47, 2, 2},  {16, 1, 4},  {50, 1, 8}, {131, 2, 6}, {67, 2, 64},
      {70, 1, 131}, {31, 2, 32},  {33, 1, 31}, {16, 2, 35}, {4, 2, 8},  {3, 3, 3}};
  for (const auto& [samples, lines, bands] : shapes) {
    for (const std::size_t bytes : {1, 2, 4, 8, 16}) {
      const std::size_t count = samples * lines * bands;
      // One element in front, so that nothing lies on a boundary of 16 bytes; none behind, so that
      // ASan sees a step outside.
      std::vector<unsigned char> source((count + 1) * bytes);
      const unsigned char* from = source.data() + bytes;
      for (unsigned char& byte : source) byte = static_cast<unsigned char>(random());
      for (const Interleave fromOrder : kOrders) {
        for (const Interleave toOrder : kOrders) {
          SCOPED_TRACE(testing::Message()
                       << samples << "x" << lines << "x" << bands << " of " << bytes << " from "
                       << static_cast<int>(fromOrder) << " to " << static_cast<int>(toOrder));
          const bool possible =
              bands == 1 || (fromOrder != Interleave::None && toOrder != Interleave::None);
          std::vector<unsigned char> result((count + 1) * bytes);
          unsigned char* to = result.data() + bytes;
          ASSERT_EQ(ConvertInterleave(from, fromOrder, to, toOrder, samples, lines, bands, bytes),
                    possible);
          if (!possible) continue;
          for (std::size_t b = 0; b < bands; ++b)
            for (std::size_t l = 0; l < lines; ++l)
              for (std::size_t s = 0; s < samples; ++s)
                ASSERT_EQ(
                    std::memcmp(&to[bytes * Position(toOrder, s, l, b, samples, lines, bands)],
                                &from[bytes * Position(fromOrder, s, l, b, samples, lines, bands)],
                                bytes),
                    0)
                    << s << " " << l << " " << b;
          // Two parts of the lines, each for itself, make the same block.
          std::vector<unsigned char> parts((count + 1) * bytes);
          for (const auto& [first, end] :
               {std::pair(std::size_t{0}, lines / 2), {lines / 2, lines}}) {
            std::vector<unsigned char> part;
            for (std::size_t b = 0; b < bands; ++b) {
              for (std::size_t l = first; l < end; ++l) {
                for (std::size_t s = 0; s < samples; ++s) {
                  const std::size_t at =
                      Position(fromOrder, s, l - first, b, samples, end - first, bands);
                  part.resize(std::max(part.size(), (at + 1) * bytes));
                  std::memcpy(&part[at * bytes],
                              &from[bytes * Position(fromOrder, s, l, b, samples, lines, bands)],
                              bytes);
                }
              }
            }
            ConvertLines(part.data(), fromOrder, {first, end - first, lines}, parts.data() + bytes,
                         toOrder, samples, bands, bytes);
          }
          ASSERT_EQ(parts, result);
        }
      }
    }
  }
}

TEST(Interleave, RefusesWhatItDoesNotKnow) {
  const unsigned char from[12] = {};
  unsigned char to[12] = {};
  EXPECT_FALSE(ConvertInterleave(from, Interleave::BIP, to, Interleave::BSQ, 2, 2, 1, 3));
  EXPECT_FALSE(
      ConvertInterleave(from, Interleave::BIP, to, static_cast<Interleave>(3), 2, 2, 3, 1));
  EXPECT_TRUE(ConvertInterleave(from, Interleave::BIP, to, Interleave::BSQ, 0, 2, 3, 1));
}

TEST(Interleave, TellsTheShapeOfABlock) {
  EXPECT_EQ(BlockDims(Interleave::BIP, 7, 5, 3), ArrayDims(5, 7, 3));
  EXPECT_EQ(BlockDims(Interleave::BIL, 7, 5, 3), ArrayDims(5, 3, 7));
  EXPECT_EQ(BlockDims(Interleave::BSQ, 7, 5, 3), ArrayDims(3, 5, 7));
  EXPECT_EQ(BlockDims(Interleave::None, 7, 5, 3), ArrayDims(5, 7));
  EXPECT_EQ(BlockDims(Interleave::BIP, 7, 5, 0).rank, 2U);
  EXPECT_EQ(BlockDims(static_cast<Interleave>(9), 7, 5, 3).count, 0U);
}

}  // namespace
}  // namespace lumo
