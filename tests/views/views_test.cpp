#include <cmath>
#include <numbers>

#include "commands/catalog.h"
#include "georef/std_georef.h"
#include "support/run_command.h"
#include "support/test_rasters.h"
#include "views/band_stack_raster.h"
#include "views/complex_raster.h"
#include "views/skip_raster.h"
#include "views/sources/memory_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"
#include "views/virtual_raster.h"

namespace lumo {
namespace {

using Place = std::array<unsigned, 3>;  // sample, line, band

/// Reads a block in every order and compares each pixel with the ramp's value at `where(place)`.
template <typename T, typename Where>
void ExpectRamp(Raster<T>& view, const SubRect& rect, const std::vector<unsigned>& bands,
                const Where& where) {
  for (const Interleave order : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
    Array<T> pixels;
    Array<unsigned char> state;
    ASSERT_TRUE(view.GetSubRect(rect, MakeArray(bands), order, pixels, state));
    ASSERT_EQ(pixels.GetDims(),
              BlockDims(order, rect.Width(), rect.Height(), static_cast<unsigned>(bands.size())));
    const std::size_t w = rect.Width(), h = rect.Height(), n = bands.size();
    for (unsigned y = 0; y < h; ++y)
      for (unsigned x = 0; x < w; ++x)
        for (unsigned b = 0; b < n; ++b) {
          const std::size_t at = order == Interleave::BIP   ? (y * w + x) * n + b
                                 : order == Interleave::BIL ? (y * n + b) * w + x
                                                            : (b * h + y) * w + x;
          const Place place = where(Place{rect.left + x, rect.top + y, bands[b]});
          ASSERT_EQ(pixels[at], RampValue<T>(place[0], place[1], place[2]));
          ASSERT_EQ(state[at], 0);
        }
  }
}

TEST(SpatialSubsetRaster, ShowsARectangle) {
  const RasterPtr<int> parent(MakeRamp<int>(10, 8, 3));
  const struct {
    const char* name;
    SubRect given, want;
  } cases[] = {{"inside", {3, 2, 6, 4}, {3, 2, 6, 4}},
               {"reaching over", {5, 5, 1000000, 1000000}, {5, 5, 9, 7}},
               {"wholly outside", {50, 1, 60, 2}, {9, 1, 9, 2}},
               {"below", {1, 50, 2, 60}, {1, 7, 2, 7}}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    SpatialSubsetRaster<int> view(parent, c.given);
    EXPECT_EQ(view.Rect(), c.want);
    EXPECT_EQ(view.GetRasterDef().samples, c.want.Width());
    ExpectRamp(view, {0, 0, c.want.Width() - 1, c.want.Height() - 1}, {2, 0, 2}, [&](Place p) {
      return Place{p[0] + c.want.left, p[1] + c.want.top, p[2]};
    });
  }
}

TEST(SpectralSubsetRaster, ShowsBandsInItsOrder) {
  const RasterPtr<float> parent(MakeRamp<float>(6, 5, 3));
  SpectralSubsetRaster<float> view(parent, MakeArray<unsigned>({2, 0, 2}));
  EXPECT_EQ(view.Bands(), 3u);
  const unsigned map[] = {2, 0, 2};
  ExpectRamp(view, {1, 0, 4, 4}, {0, 1, 2, 0}, [&](Place p) {
    return Place{p[0], p[1], map[p[2]]};
  });
  EXPECT_EQ(view.NoDataValue(1), RampValue<float>(77, 0, 0));
  EXPECT_EQ(view.BandStats(1).band, 1u);
  EXPECT_EQ(SpectralSubsetRaster<float>(parent, {}).Bands(), 0u);
}

TEST(SkipRaster, ShowsGridPointsAndWritesThemAlone) {
  const Pointer<MemoryTestRaster<std::uint16_t>> parent(
      new MemoryTestRaster<std::uint16_t>(101, 101, 2));
  for (std::size_t i = 0; i < parent->pixels.size(); ++i) {
    parent->pixels[i] = static_cast<std::uint16_t>(i * 7);
  }
  const auto before = parent->pixels;
  SkipRaster<std::uint16_t> view(parent, 2, 3, true);
  EXPECT_EQ(view.Samples(), 50u);
  EXPECT_EQ(view.Lines(), 33u);
  Array<std::uint16_t> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(
      view.GetSubRect({10, 4, 20, 6}, MakeArray<unsigned>({1, 0}), Interleave::BSQ, pixels, state));
  const auto at = [&](unsigned x, unsigned y, unsigned band) {
    return parent->At(2 * x, 3 * y, band);
  };
  EXPECT_EQ(pixels[0], before[at(10, 4, 1)]);
  EXPECT_EQ(pixels[11 * 3 + 11 + 2], before[at(12, 5, 0)]);
  for (auto& pixel : pixels) pixel = 9;
  ASSERT_TRUE(
      view.PutSubRect({10, 4, 20, 6}, MakeArray<unsigned>({1, 0}), Interleave::BSQ, pixels, state));
  for (unsigned y = 0; y < 101; ++y)
    for (unsigned x = 0; x < 101; ++x)
      for (unsigned band = 0; band < 2; ++band) {
        const bool written = x % 2 == 0 && y % 3 == 0 && x >= 20 && x <= 40 && y >= 12 && y <= 18;
        const std::size_t i = parent->At(x, y, band);
        ASSERT_EQ(parent->pixels[i], written ? 9 : before[i]);
      }
  EXPECT_FALSE(SkipRaster<std::uint16_t>(parent, 0, 1, true).IsValid());
  EXPECT_FALSE(
      view.GetSubRect({0, 0, 50, 0}, MakeArray<unsigned>({0}), Interleave::BIP, pixels, state));
}

TEST(BandStackRaster, ShowsTheBandsOfAll) {
  Array<RasterPtr<int>> members{ArrayDims(3)};
  members[0] = MakeRamp<int>(7, 6, 2);
  members[2] = MakeRamp<int>(7, 6, 3);  // the one between is empty
  BandStackRaster<int> stack(members);
  EXPECT_EQ(stack.Bands(), 5u);
  const unsigned local[] = {0, 1, 0, 1, 2};
  for (const std::vector<unsigned>& bands :
       {std::vector<unsigned>{3, 0, 4, 1}, {0}, {1, 0}, {4, 4, 2}}) {
    ExpectRamp(stack, {2, 1, 5, 1}, bands, [&](Place p) { return Place{p[0], p[1], local[p[2]]}; });
  }
  Array<int> pixels;
  Array<unsigned char> state;
  EXPECT_FALSE(
      stack.GetSubRect({0, 0, 1, 1}, MakeArray<unsigned>({5}), Interleave::BIP, pixels, state));
  // A block without an axis for bands has the first of them, of whichever member.
  ASSERT_TRUE(stack.GetSubRect({2, 1, 4, 2}, MakeArray<unsigned>({3, 0, 4, 1}), Interleave::None,
                               pixels, state));
  EXPECT_EQ(pixels.GetDims(), ArrayDims(2, 3));
  EXPECT_EQ(pixels[5], RampValue<int>(4, 2, 1));
  EXPECT_EQ(stack.NoDataValue(3), RampValue<int>(77, 0, 1));
  EXPECT_FALSE(BandStackRaster<int>(Array<RasterPtr<int>>()).IsValid());
}

TEST(ComplexRaster, ShowsPartRealAndImaginary) {
  EXPECT_EQ(ComplexMagnitude(3, 4), 5.0);
  EXPECT_EQ(ComplexMagnitude(0, 0), 0.0);
  EXPECT_TRUE(std::isfinite(ComplexMagnitude(1e300, -1e300)));
  EXPECT_EQ(ComplexPhase(-1, 0), std::numbers::pi);
  EXPECT_EQ(ComplexPhase(0, 0), 0.0);
  EXPECT_DOUBLE_EQ(ComplexPhase(0, 1), std::numbers::pi / 2);
  EXPECT_DOUBLE_EQ(ComplexPhase(0, -1), -std::numbers::pi / 2);
  EXPECT_NEAR(ComplexPhase(-3, 2), std::atan2(2, -3), 1e-15);

  const Pointer<MemoryTestRaster<Complex<float>>> parent(
      new MemoryTestRaster<Complex<float>>(2, 1, 2));
  parent->pixels = {{3, 4}, {1, 0}, {0, 0}, {-1, 2}};
  parent->states = {0, 1, 0, 0};
  const struct {
    ComplexPart part;
    std::vector<float> want;
  } cases[] = {{ComplexPart::kReal, {3, 1, 0, -1}},
               {ComplexPart::kImag, {4, 0, 0, 2}},
               {ComplexPart::kMagnitude, {5, 1, 0, std::sqrt(5.0f)}},
               {ComplexPart::kPower, {std::log(5.0f), 0, -INFINITY, std::log(5.0f) / 2}},
               {ComplexPart::kPhase, {std::atan2(4.0f, 3.0f), 0, 0, std::atan2(2.0f, -1.0f)}}};
  for (const auto& c : cases) {
    ComplexRaster<float> view(parent, c.part);
    EXPECT_EQ(view.Bands(), 6u);
    EXPECT_EQ(view.DataType(), kDataTypeOf<float>);
    Array<float> pixels;
    Array<unsigned char> state;
    ASSERT_TRUE(view.GetSubRect({0, 0, 1, 0}, MakeArray<unsigned>({0, 3, 4, 5}), Interleave::BIP,
                                pixels, state));
    for (const unsigned x : {0u, 1u}) {
      const auto& second = parent->pixels[2 * x + 1];
      EXPECT_FLOAT_EQ(pixels[4 * x], c.want[2 * x]);
      EXPECT_FLOAT_EQ(pixels[4 * x + 1], c.want[2 * x + 1]);
      EXPECT_EQ(pixels[4 * x + 2], second.real);
      EXPECT_EQ(pixels[4 * x + 3], second.imag);
      EXPECT_EQ(state[4 * x + 2], x == 0 ? 1 : 0);
    }
    EXPECT_FALSE(view.CanWrite());
    EXPECT_FALSE(
        view.GetSubRect({0, 0, 1, 0}, MakeArray<unsigned>({0}), Interleave::None, pixels, state));
  }
}

TEST(MemoryRaster, ServesItsBlock) {
  std::vector<float> block(4 * 3 * 2);
  for (std::size_t i = 0; i < block.size(); ++i) block[i] = static_cast<float>(i);
  const GeoRefPtr geoRef(new StdGeoRef);
  geoRef->SetPixelSize(30, 30);
  geoRef->SetTieMap(500000.123456789012, 4000000);
  geoRef->SetRotation(12.5);
  MemoryRaster<float> raster("block", block.data(), 4, 3, 2, Interleave::BSQ, geoRef);
  ASSERT_TRUE(raster.IsValid());
  EXPECT_EQ(raster.TileDimensions(), (TileDimensions{4, 3}));
  EXPECT_TRUE(raster.GetRasterDef().geoRef->IsEqual(geoRef));
  Array<float> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(
      raster.GetSubRect({1, 2, 2, 2}, MakeArray<unsigned>({1, 0}), Interleave::BIP, pixels, state));
  EXPECT_EQ(std::vector<float>(pixels.begin(), pixels.end()), (std::vector<float>{21, 9, 22, 10}));
  for (auto& pixel : pixels) pixel = -1;
  ASSERT_TRUE(
      raster.PutSubRect({1, 2, 2, 2}, MakeArray<unsigned>({1, 0}), Interleave::BIP, pixels, state));
  EXPECT_EQ(block[21] + block[9] + block[22] + block[10], -4.0f);
  EXPECT_EQ(raster.Max(0, IPC()), 11.0f);
  EXPECT_FALSE(MemoryRaster<float>("none", nullptr, 4, 3, 2, Interleave::BSQ, geoRef).IsValid());
}

TEST(ViewCommands, MakeViewsOnOpenRasters) {
  const auto made =
      test::RunCommand("CreateMemoryRasterCommand",
                       {{"Samples", "5"}, {"Lines", "4"}, {"Bands", "3"}, {"DataType", "UInt16"}});
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  const std::string source = made.outputs.at("URI");
  const struct {
    const char* command;
    std::map<std::string, std::string> inputs;
    const char *samples, *bands;
  } cases[] = {
      {"CreateSpatialSubsetRasterCommand", {{"SubRect", "1 1 3 3"}}, "3", "3"},
      {"CreateSpectralSubsetRasterCommand", {{"Bands", "1:2 [2 2] "}}, "5", "2"},
      {"CreateSkipRasterCommand", {{"SkipX", "2"}, {"SkipY", "1"}}, "2", "3"},
      {"CreateVirtualRasterCommand", {}, "5", "3"},
      {"CreateBandStackRasterCommand", {{"SrcURI", "1:2 [" + source + source + "] "}}, "5", "6"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.command);
    auto inputs = c.inputs;
    inputs.emplace("SrcURI", source);
    const auto view = test::RunCommand(c.command, inputs);
    ASSERT_TRUE(view.Succeeded()) << view.reason;
    EXPECT_NE(view.outputs.at("URI"), source);
    const auto query = test::RunCommand("QueryRasterCommand", {{"URI", view.outputs.at("URI")}});
    EXPECT_EQ(query.outputs.at("Samples"), c.samples);
    EXPECT_EQ(query.outputs.at("Bands"), c.bands);
    test::RunCommand("CloseRasterCommand", {{"URI", view.outputs.at("URI")}});
  }
  const std::pair<const char*, std::map<std::string, std::string>> bad[] = {
      {"CreateSkipRasterCommand", {{"SkipX", "0"}, {"SkipY", "1"}}},
      {"CreateSpectralSubsetRasterCommand", {{"Bands", "1:1 [3] "}}},
      {"CreateComplexPhaseRasterCommand", {}},
      {"CreateBandStackRasterCommand", {{"SrcURI", "1:2 [" + source + "[none] ] "}}}};
  for (const auto& [command, given] : bad) {
    auto inputs = given;
    inputs.emplace("SrcURI", source);
    EXPECT_EQ(test::RunCommand(command, inputs).result, CommandResult::kFailed) << command;
  }
  test::RunCommand("CloseRasterCommand", {{"URI", source}});
}

}  // namespace
}  // namespace lumo
