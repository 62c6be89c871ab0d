#include <random>

#include <gtest/gtest.h>

#include "commands/catalog.h"
#include "support/run_command.h"
#include "support/test_rasters.h"

namespace lumo {
namespace {

TEST(CopyRasterCommand, CopiesTheSameInAllBlocks) {
  // Larger than a block of 1 MiB, and no whole number of tiles.
  constexpr unsigned kWidth = 1300, kHeight = 700;
  const Pointer<OrderedTestRaster<std::uint16_t>> source(
      new OrderedTestRaster<std::uint16_t>(kWidth, kHeight, 3, Interleave::BIP));
  source->tileWidth = 256;
  source->tileHeight = 128;
  std::mt19937 random(5);
  for (std::uint16_t& pixel : source->pixels) pixel = static_cast<std::uint16_t>(random());
  for (unsigned char& state : source->states) state = random() % 40 == 0 ? 2 : 0;
  catalog::Add(source);
  for (const char* blocks : {"Told", "Stream", "Target"}) {
    SCOPED_TRACE(blocks);
    const Pointer<MemoryTestRaster<std::uint16_t>> target(
        new MemoryTestRaster<std::uint16_t>(kWidth, kHeight, 2));
    catalog::Add(target);
    const auto copied =
        test::RunCommand("CopyRasterCommand", {{"SrcURI", FormatValue(source->GetURI()).ToUTF8()},
                                               {"DstURI", FormatValue(target->GetURI()).ToUTF8()},
                                               {"Bands", "1:2 [2 0] "},
                                               {"Blocks", blocks}});
    ASSERT_TRUE(copied.Succeeded()) << copied.reason;
    std::uint64_t valid[2] = {};
    for (std::size_t i = 0; i < std::size_t{kWidth} * kHeight; ++i) {
      for (const unsigned place : {0, 1}) {
        const std::size_t from = 3 * i + (place == 0 ? 2 : 0);
        ASSERT_EQ(target->pixels[2 * i + place], source->pixels[from]) << i;
        ASSERT_EQ(target->states[2 * i + place], source->states[from]) << i;
        valid[place] += source->states[from] == 0;
      }
    }
    EXPECT_EQ(copied.outputs.at("ValidPixels"),
              "1:2 [" + std::to_string(valid[0]) + " " + std::to_string(valid[1]) + "] ");
    catalog::Remove(target);
  }
  catalog::Remove(source);
}

}  // namespace
}  // namespace lumo
