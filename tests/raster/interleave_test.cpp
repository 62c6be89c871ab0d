#include "raster/interleave.h"

#include <cstring>
#include <random>

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
  const std::size_t shapes[][3] = {{1, 1, 1},   {5, 3, 2},  {17, 2, 3},  {33, 3, 4},   {19, 5, 6},
                                   {64, 2, 15}, {7, 9, 16}, {40, 2, 17}, {23, 3, 200}, {300, 2, 3},
                                   {1, 50, 7},  {2, 1, 33}, {31, 4, 1}};
  for (const auto& [samples, lines, bands] : shapes) {
    for (const std::size_t bytes : {1, 2, 4, 8, 16}) {
      const std::size_t count = samples * lines * bands;
      std::vector<unsigned char> from(count * bytes);
      for (unsigned char& byte : from) byte = static_cast<unsigned char>(random());
      for (const Interleave fromOrder : kOrders) {
        for (const Interleave toOrder : kOrders) {
          SCOPED_TRACE(testing::Message()
                       << samples << "x" << lines << "x" << bands << " of " << bytes << " from "
                       << static_cast<int>(fromOrder) << " to " << static_cast<int>(toOrder));
          const bool possible =
              bands == 1 || (fromOrder != Interleave::None && toOrder != Interleave::None);
          std::vector<unsigned char> to(count * bytes);  // exact, so that ASan sees a step outside
          ASSERT_EQ(ConvertInterleave(from.data(), fromOrder, to.data(), toOrder, samples, lines,
                                      bands, bytes),
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
