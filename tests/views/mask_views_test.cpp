#include <cmath>
#include <limits>

#include "commands/catalog.h"
#include "raster/block_strides.h"
#include "regions/pixel_address_roi_def.h"
#include "support/placed_raster.h"
#include "support/run_command.h"
#include "support/stats_support.h"
#include "support/test_rasters.h"
#include "views/masked_raster.h"
#include "views/no_data_raster.h"
#include "views/roi_raster.h"
#include "views/spectral_subset_raster.h"

namespace lumo {
namespace {

using Pixel = std::int16_t;
using Source = Pointer<OrderedTestRaster<Pixel>>;
constexpr unsigned kWidth = 203, kHeight = 9, kBands = 3;

constexpr Pixel ValueAt(unsigned x, unsigned y, unsigned band) {
  return static_cast<Pixel>((x / 3 * 7 + y * 5 + band) % 11);
}
/// Every state, in no order that goes with the values.
constexpr unsigned char StateAt(unsigned x, unsigned y, unsigned band) {
  return static_cast<unsigned char>((x * 5 + y * 3 + band * 2) % 8);
}

Source MakeSource(bool withStates = true, Interleave order = Interleave::BIL) {
  Source source(new OrderedTestRaster<Pixel>(kWidth, kHeight, kBands, order));
  for (unsigned y = 0; y < kHeight; ++y)
    for (unsigned x = 0; x < kWidth; ++x)
      for (unsigned b = 0; b < kBands; ++b) {
        source->pixels[source->At(x, y, b)] = ValueAt(x, y, b);
        source->states[source->At(x, y, b)] = withStates ? StateAt(x, y, b) : 0;
      }
  return source;
}

/// A raster that has one level, which it gives whatever is asked for.
class LevelledRaster final : public RasterView<Pixel> {
 public:
  LevelledRaster(const RasterPtr<Pixel>& parent, const RasterPtr<Pixel>& level)
      : RasterView(parent), level_(level) {}
  RasterPtr<Pixel> PyramidLevel(unsigned) override { return level_; }

 private:
  RasterPtr<Pixel> level_;
};

/// Reads rectangles in every order, and compares each state with `want(x, y, band)`.
template <typename Want>
void ExpectStates(Raster<Pixel>& view, const Want& want) {
  for (const SubRect& rect : {SubRect(0, 0, view.Samples() - 1, view.Lines() - 1),
                              SubRect(view.Samples() / 2, 1, view.Samples() - 1, 1)})
    for (const std::vector<unsigned>& bands :
         {std::vector<unsigned>{2, 0, 2, 1}, std::vector<unsigned>{1}})
      for (const Interleave order :
           {Interleave::None, Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
        if (order == Interleave::None && bands.size() != 1) continue;
        Array<Pixel> pixels;
        Array<unsigned char> states;
        ASSERT_TRUE(view.GetSubRect(rect, MakeArray(bands), order, pixels, states));
        const BlockStrides strides(order, rect.Width(), rect.Height(), bands.size());
        for (unsigned y = 0; y < rect.Height(); ++y)
          for (unsigned x = 0; x < rect.Width(); ++x)
            for (std::size_t i = 0; i < bands.size(); ++i) {
              const std::size_t at = x * strides.pixel + y * strides.line + i * strides.band;
              ASSERT_EQ(states[at], want(rect.left + x, rect.top + y, bands[i]))
                  << x << ' ' << y << ' ' << i << ' ' << static_cast<int>(order);
            }
      }
}

/// Compares count, sum and histogram with those of the pixels that have a state of 0.
template <typename Want>
void ExpectNumbers(Raster<Pixel>& view, const Want& want) {
  for (unsigned band = 0; band < kBands; ++band) {
    std::uint64_t count = 0;
    double sum = 0;
    std::vector<unsigned long long> bins(11);
    for (unsigned y = 0; y < kHeight; ++y)
      for (unsigned x = 0; x < kWidth; ++x) {
        if (want(x, y, band) != 0) continue;
        ++count;
        sum += ValueAt(x, y, band);
        ++bins[static_cast<std::size_t>(ValueAt(x, y, band))];
      }
    EXPECT_EQ(view.Sum(band, IPC()), sum) << band;
    EXPECT_EQ(view.BandStats(band).pixelCount, count) << band;
    const AsyncPtr run =
        view.HistogramByBinSize(0, 10, 1, MakeArray<unsigned>({band}), HistogramSign::kBoth, IPC());
    ASSERT_TRUE(run);
    run->WaitFinished();
    const auto histograms = view.BandHistogram(band);
    ASSERT_NE(histograms.GetCount(), 0u);
    const auto& counts = histograms[histograms.GetCount() - 1].counts;
    EXPECT_EQ(std::vector<unsigned long long>(counts.begin(), counts.end()), bins) << band;
  }
}

template <typename T>
Array<RasterMaskDef<T>> DefsOf(const std::vector<std::pair<unsigned, std::vector<T>>>& defs) {
  Array<RasterMaskDef<T>> made{ArrayDims(static_cast<unsigned>(defs.size()))};
  for (unsigned i = 0; i < made.GetCount(); ++i) {
    made[i] = {defs[i].first, MakeArray<T>(defs[i].second)};
  }
  return made;
}

bool HasValue(unsigned x, unsigned y, unsigned band, const std::vector<Pixel>& values) {
  return std::find(values.begin(), values.end(), ValueAt(x, y, band)) != values.end();
}

TEST(RasterMask, MarksValuesWhateverTheStates) {
  RasterMask mask(RasterPtr<Pixel>(MakeSource()), DefsOf<Pixel>({{2, {3, 7}}, {0, {}}, {1, {9}}}));
  ASSERT_TRUE(mask.IsValid());
  EXPECT_EQ(mask.Planes(), kBands);
  EXPECT_EQ(mask.BytesPerPlane(), (kWidth * kHeight + 7) / 8);
  std::vector<unsigned char> marks(kWidth + 5);
  for (const bool inversed : {false, true}) {
    mask.SetInversed(inversed);
    for (unsigned y = 0; y < kHeight + 1; ++y)
      for (const unsigned from : {0u, 1u, 70u}) {
        mask.GetMarks(from, y, marks.size(), marks.data());
        for (unsigned x = from; x < from + marks.size(); ++x) {
          const bool isOn = x < kWidth && y < kHeight;
          // Inversed, the plane of band 0 marks all.
          const bool want =
              isOn && (inversed || HasValue(x, y, 2, {3, 7}) || HasValue(x, y, 1, {9}));
          ASSERT_EQ(mask.IsMarked(x, y), want) << x << ' ' << y;
          ASSERT_EQ(marks[x - from], want ? 1 : 0) << x << ' ' << y;
        }
      }
  }
  EXPECT_EQ(mask.ChangeCount(), 1u);
  EXPECT_FALSE(mask.IsMarked(0, 0, kBands));
}

TEST(RasterMask, PutsTheFirstPixelIntoTheTopBit) {
  const Pointer<MemoryTestRaster<float>> source(new MemoryTestRaster<float>(10, 2, 1));
  source->pixels[9] = std::numeric_limits<float>::quiet_NaN();
  source->pixels[11] = 255;
  const RasterMask mask(RasterPtr<float>(source), DefsOf<float>({{0, {255, NAN}}}));
  EXPECT_EQ(mask.PlaneBits(0)[0], 0);
  EXPECT_EQ(mask.PlaneBits(0)[1], 0x40 | 0x10);
  EXPECT_EQ(mask.BytesPerPlane(), 3u);
}

TEST(RasterMask, FailsWholeWhereTheRasterDoes) {
  const Pointer<RampRaster<Pixel>> source(new RampRaster<Pixel>(40, 3000, 1));
  source->tileHeight = 1;
  source->failAtRead = 0;
  const RasterMask mask(RasterPtr<Pixel>(source), DefsOf<Pixel>({{0, {1}}}));
  EXPECT_FALSE(mask.IsValid());
  EXPECT_EQ(mask.Planes(), 0u);
  EXPECT_FALSE(mask.IsMarked(1, 0));
}

TEST(RasterMask, ResamplesToTheNearestTowardTheFirst) {
  RasterMask source(RasterPtr<Pixel>(MakeSource()), DefsOf<Pixel>({{1, {2, 4, 8}}}));
  for (const bool inversed : {false, true}) {
    source.SetInversed(inversed);
    for (const auto& [width, height] : {std::pair{101u, 4u}, {1u, 9u}, {406u, 1u}, {3u, 20u}}) {
      const RasterMask mask(source, width, height, 2);
      EXPECT_FALSE(mask.IsInversed());
      for (unsigned y = 0; y < height; ++y)
        for (unsigned x = 0; x < width; ++x) {
          const auto place = [](unsigned at, unsigned to, unsigned from) {
            if (to == 1) return 0u;
            return static_cast<unsigned>(static_cast<float>(from - 1) *
                                         (static_cast<float>(at) / static_cast<float>(to - 1)));
          };
          const unsigned sx = place(x, width, kWidth), sy = place(y, height, kHeight);
          ASSERT_EQ(mask.IsMarked(x, y, 1), source.IsMarked(sx, sy, 1)) << x << ' ' << y;
          ASSERT_EQ(mask.IsMarked(x, y, 0), inversed);
        }
    }
  }
}

TEST(MaskedRaster, SetsAndClearsItsBitAlone) {
  const Source source = MakeSource(), small(MakeSource());
  const RasterMaskPtr one(new RasterMask(RasterPtr<Pixel>(source), DefsOf<Pixel>({{1, {2, 4}}})));
  const RasterMaskPtr other(new RasterMask(*one, 90, 4, 2));
  const auto state = [&](const RasterMaskPtr& mask) {
    return [mask](unsigned x, unsigned y, unsigned band) {
      return (StateAt(x, y, band) & ~2) | (mask && mask->IsMarked(x, y) ? 2 : 0);
    };
  };
  MaskedRaster<Pixel> view(source, one);
  ExpectStates(view, state(one));
  one->SetInversed(true);  // with two planes that mark everything then
  ExpectStates(view, state(one));
  one->SetInversed(false);
  // Masks of bands, one smaller than the raster, one absent; and fewer than bands.
  MaskedRaster<Pixel> mixed(source, MakeArray<RasterMaskPtr>({one, other}));
  ExpectStates(mixed, [&](unsigned x, unsigned y, unsigned band) {
    return state(band == 0 ? one : band == 1 ? other : RasterMaskPtr())(x, y, band);
  });
  MaskedRaster<Pixel> none(source, RasterMaskPtr());
  ExpectStates(none, state({}));
  EXPECT_FALSE(MaskedRaster<Pixel>({}, one).IsValid());
}

TEST(MaskedRaster, CountsWhatIsLeftAndCountsAgainWhenInversed) {
  const Source source = MakeSource(false);
  const RasterPtr<Pixel> band(new SpectralSubsetRaster<Pixel>(source, MakeArray<unsigned>({1})));
  const RasterMaskPtr mask(new RasterMask(band, DefsOf<Pixel>({{0, {2, 4, 6}}})));
  MaskedRaster<Pixel> view(source, mask);
  const auto marked = [&](unsigned x, unsigned y, unsigned) {
    return mask->IsMarked(x, y) ? 2 : 0;
  };
  ExpectNumbers(view, marked);
  mask->SetInversed(true);
  EXPECT_FALSE(view.StatsExist(0, StatsMask::Min));
  ExpectNumbers(view, marked);
}

TEST(MaskedRaster, ShowsTheResampledMaskAtALevel) {
  const Source whole = MakeSource();
  const Source level(new OrderedTestRaster<Pixel>(101, 4, kBands, Interleave::BSQ));
  const RasterPtr<Pixel> parent(new LevelledRaster(whole, level));
  const RasterMaskPtr mask(new RasterMask(RasterPtr<Pixel>(whole), DefsOf<Pixel>({{0, {1, 5}}})));
  MaskedRaster<Pixel> view(parent, mask);
  const RasterPtr<Pixel> reduced = view.PyramidLevel(1);
  ASSERT_TRUE(reduced);
  const RasterMask want(*mask, 101, 4, kBands);
  ExpectStates(*reduced,
               [&](unsigned x, unsigned y, unsigned) { return want.IsMarked(x, y) ? 2 : 0; });
  EXPECT_TRUE(view.StoredPyramidLevel(1).IsNull());
  EXPECT_TRUE(MaskedRaster<Pixel>(whole, mask).PyramidLevel(1).IsNull());
}

TEST(NoDataRaster, MarksByItsValues) {
  const Source source = MakeSource();
  for (const std::vector<Pixel>& values :
       {std::vector<Pixel>{4}, std::vector<Pixel>{10, 0, 3}, std::vector<Pixel>{}})
    for (const bool replace : {false, true}) {
      NoDataRaster<Pixel> view(source, MakeArray<Pixel>(values), replace);
      const auto want = [&](unsigned x, unsigned y, unsigned band) {
        const unsigned others = StateAt(x, y, band) & (replace ? ~1u : ~0u);
        return others | (HasValue(x, y, band, values) ? 1u : 0u);
      };
      ExpectStates(view, want);
      ExpectNumbers(view, want);
      EXPECT_TRUE(view.HasNoDataValue(7));
      EXPECT_EQ(view.NoDataValue(1), values.empty() ? 0 : values[0]);
      EXPECT_TRUE(view.GetRasterDef().noData.empty());
    }
  NoDataRaster<Pixel> all(source, true);
  ExpectStates(all, [](unsigned x, unsigned y, unsigned band) { return StateAt(x, y, band) & ~1; });
  EXPECT_FALSE(all.HasNoDataValue(0));
  const NoDataRaster<Pixel> exact(source, MakeArray<Pixel>({-7, 4}), true, Form::kExact);
  EXPECT_EQ(exact.GetRasterDef().noData, (std::map<unsigned, double>{{0, -7}, {1, -7}, {2, -7}}));
}

TEST(NoDataRaster, TakesNaNForNaN) {
  const Pointer<MemoryTestRaster<float>> source(new MemoryTestRaster<float>(3, 1, 1));
  source->pixels = {1, NAN, 2};
  Array<float> pixels;
  Array<unsigned char> states;
  NoDataRaster<float> view(source, MakeArray<float>({NAN}), false);
  ASSERT_TRUE(
      view.GetSubRect({0, 0, 2, 0}, MakeArray<unsigned>({0}), Interleave::BIP, pixels, states));
  EXPECT_THAT(std::vector<int>(states.begin(), states.end()), testing::ElementsAre(0, 1, 0));
}

TEST(NoDataRaster, BurnsTheFirstValueWhereItWrites) {
  const Pointer<MemoryTestRaster<Pixel>> store(new MemoryTestRaster<Pixel>(3, 1, 1));
  const auto bands = MakeArray<unsigned>({0});
  const auto written = [&](NoDataRaster<Pixel>&& view) {
    auto pixels = MakeArray<Pixel>({5, 6, 7});
    auto states = MakeArray<unsigned char>({1, 2, 5});
    EXPECT_TRUE(view.PutSubRect({0, 0, 2, 0}, bands, Interleave::BIP, pixels, states));
    EXPECT_EQ(store->states, (std::vector<unsigned char>{1, 2, 5}));
    EXPECT_EQ(pixels[0], store->pixels[0]);  // in the caller's array too
    return store->pixels;
  };
  using Pixels = std::vector<Pixel>;
  EXPECT_EQ(written(NoDataRaster<Pixel>(store, MakeArray<Pixel>({-1, 6}), false)),
            (Pixels{-1, 6, -1}));
  EXPECT_EQ(written(NoDataRaster<Pixel>(store, MakeArray<Pixel>({}), true)), (Pixels{5, 6, 7}));
  EXPECT_EQ(written(NoDataRaster<Pixel>(store, true)), (Pixels{5, 6, 7}));
}

/// A region of the pixels of which `isIn(x, y)` is true.
template <typename IsIn>
Pointer<PixelAddressROIDef> MakePixels(unsigned width, unsigned height, const IsIn& isIn) {
  std::vector<Point2D<unsigned>> points;
  for (unsigned y = 0; y < height; ++y)
    for (unsigned x = 0; x < width; ++x) {
      if (isIn(x, y)) points.push_back({x, y});
    }
  Pointer<PixelAddressROIDef> region(new PixelAddressROIDef);
  EXPECT_TRUE(region->SetAddresses(MakeArray<Point2D<unsigned>>(points)));
  return region;
}

TEST(ROIRaster, SetsAndClearsItsBitAlone) {
  const Source source = MakeSource();
  // Runs of whole groups of pixels, parts of them, and single ones.
  const auto isIn = [](unsigned x, unsigned y) {
    return (y == 2 && x < 130) || (y == 4 && x % 3 == 1) || (y > 5 && x > 3 && x < 190);
  };
  const Pointer<PixelAddressROIDef> region = MakePixels(kWidth, kHeight, isIn);
  ROIRaster<Pixel> view(source, region);
  ExpectStates(view, [&](unsigned x, unsigned y, unsigned band) {
    return (StateAt(x, y, band) & ~4) | (isIn(x, y) ? 0 : 4);
  });
  Array<Pixel> pixels(ArrayDims(1, 1, 1));
  Array<unsigned char> states(ArrayDims(1, 1, 1));
  EXPECT_FALSE(
      view.PutSubRect({0, 0, 0, 0}, MakeArray<unsigned>({0}), Interleave::BIP, pixels, states));

  for (const Interleave order : {Interleave::BIP, Interleave::BSQ}) {
    ROIRaster<Pixel> ordered(MakeSource(false, order), region);
    ExpectNumbers(ordered, [&](unsigned x, unsigned y, unsigned) { return isIn(x, y) ? 0 : 4; });
  }
  ROIRaster<Pixel> plain(MakeSource(false), region);
  ExpectNumbers(plain, [&](unsigned x, unsigned y, unsigned) { return isIn(x, y) ? 0 : 4; });
  region->SetAddresses(MakeArray<Point2D<unsigned>>({{1, 1}, {8, 8}}));  // the next numbers show it
  ExpectNumbers(plain, [&](unsigned x, unsigned y, unsigned) {
    return x == y && (x == 1 || x == 8) ? 0 : 4;
  });
  ROIRaster<Pixel> without(source, ROIDefPtr());
  ExpectStates(without, StateAt);
}

TEST(ROIRaster, HasAPixelOfALevelWhereOneOfItsPixelsIs) {
  const Source whole = MakeSource();
  const Source level(new OrderedTestRaster<Pixel>(25, 2, kBands, Interleave::BIP));
  const RasterPtr<Pixel> parent(new LevelledRaster(whole, level));
  ROIRaster<Pixel> view(parent, MakePixels(kWidth, kHeight, [](unsigned x, unsigned y) {
                          return (x == 37 && y == 6) || x > 160;
                        }));
  const RasterPtr<Pixel> reduced = view.PyramidLevel(3);
  ASSERT_TRUE(reduced);
  ExpectStates(*reduced, [](unsigned x, unsigned y, unsigned) {
    return x >= 20 || (x == 4 && y == 0) ? 0 : 4;
  });
}

class MaskCommands : public testing::Test {
 protected:
  MaskCommands() : source_(MakeSource(false)) { catalog::Add(source_); }
  ~MaskCommands() override { catalog::Remove(source_); }

  test::CommandOutcome Run(const char* command, std::map<std::string, std::string> inputs) const {
    if (!inputs.contains("SrcURI")) inputs["SrcURI"] = FormatValue(source_->GetURI()).ToUTF8();
    return test::RunCommand(command, inputs);
  }
  static RasterPtr<Pixel> Made(const test::CommandOutcome& outcome) {
    EXPECT_TRUE(outcome.Succeeded()) << outcome.reason;
    return RasterPtr<Pixel>(catalog::Find(ParseValue<URI>(String(outcome.outputs.at("URI")))));
  }

  const BasicRasterPtr source_;
};

TEST_F(MaskCommands, StackBandsMaskAndRectangle) {
  const auto mask = Run("CreateRasterMaskCommand", {{"MaskBands", "1:2 [0 2] "},
                                                    {"MaskValues", "1:2 [1:2 [3 7]  1:1 [9] ] "}});
  ASSERT_TRUE(mask.Succeeded()) << mask.reason;
  EXPECT_FALSE(mask.outputs.contains("DataType"));
  const auto isMarked = [](unsigned x, unsigned y) {
    return HasValue(x, y, 0, {3, 7}) || HasValue(x, y, 2, {9});
  };
  const RasterPtr<Pixel> view = Made(Run(
      "CreateSubsetRasterCommand",
      {{"SubRect", "20 1 60 7"}, {"Bands", "1:2 [2 1] "}, {"MaskURI", mask.outputs.at("URI")}}));
  ASSERT_EQ(view->Samples(), 41u);
  ASSERT_EQ(view->Bands(), 2u);
  Array<Pixel> pixels;
  Array<unsigned char> states;
  ASSERT_TRUE(
      view->GetSubRect({0, 0, 40, 6}, MakeArray<unsigned>({0}), Interleave::None, pixels, states));
  for (unsigned y = 0; y < 7; ++y)
    for (unsigned x = 0; x < 41; ++x) {
      ASSERT_EQ(pixels[y * 41 + x], ValueAt(x + 20, y + 1, 2));
      ASSERT_EQ(states[y * 41 + x], isMarked(x + 20, y + 1) ? 2 : 0);
    }
  EXPECT_EQ(Made(Run("CreateMaskedRasterCommand", {{"MaskURI", mask.outputs.at("URI")}}))->Bands(),
            3u);
  test::RunCommand("CloseRasterMaskCommand", {{"URI", mask.outputs.at("URI")}});
  EXPECT_TRUE(catalog::Find(ParseValue<URI>(String(mask.outputs.at("URI")))).IsNull());
  // Without a wish it is the source itself, open once more.
  const auto same = Run("CreateSubsetRasterCommand", {});
  EXPECT_TRUE(Made(same).Get() == RasterPtr<Pixel>(source_).Get());
  test::RunCommand("CloseRasterCommand", {{"URI", same.outputs.at("URI")}});
  EXPECT_FALSE(catalog::Find(source_->GetURI()).IsNull());
}

TEST_F(MaskCommands, NoDataHasFurtherInputs) {
  const auto text = [&](std::map<std::string, std::string> more) {
    more["NoDataValues"] = "1:2 [4 6] ";
    const RasterPtr<Pixel> view = Made(Run("CreateNoDataRasterCommand", more));
    return std::tuple(view->HasNoDataValue(0), view->NoDataValue(0),
                      view->GetRasterDef().noData.size());
  };
  EXPECT_EQ(text({}), std::tuple(true, 4, 0u));
  EXPECT_EQ(text({{"Description", "Exact"}, {"Replace", "1"}}), std::tuple(true, 4, 3u));
  EXPECT_EQ(text({{"RemoveAll", "1"}}), std::tuple(false, 0, 0u));
}

TEST_F(MaskCommands, RefuseWhatCantBe) {
  const struct {
    const char* command;
    std::map<std::string, std::string> inputs;
  } cases[] = {
      {"CreateRasterMaskCommand", {{"MaskBands", "1:2 [0 1] "}, {"MaskValues", "1:1 [1:1 [3] ] "}}},
      {"CreateRasterMaskCommand", {{"MaskBands", "1:1 [3] "}, {"MaskValues", "1:1 [1:1 [3] ] "}}},
      {"CreateRasterMaskCommand",
       {{"MaskBands", "1:1 [0] "}, {"MaskValues", "1:1 [1:1 [99999] ] "}}},
      {"CreateRasterMaskCommand", {{"MaskBands", "1:1 [0] "}, {"MaskValues", "three"}}},
      {"CreateMaskedRasterCommand", {{"MaskURI", "[none] "}}},
      {"CreateROIRasterCommand", {{"ROIDefURI", "[none] "}}},
      {"CreateROIRasterCommand", {{"ROIDefURI", FormatValue(source_->GetURI()).ToUTF8()}}},
      {"CreateNoDataRasterCommand", {{"NoDataValues", "1:1 [70000] "}}},
      {"CreateSubsetRasterCommand", {{"MaskURI", "[none] "}}},
      {"CreateSubsetRasterCommand", {{"Bands", "1:1 [3] "}}},
      {"CreateSubsetRasterCommand", {{"SrcURI", "[none] "}}}};
  for (const auto& c : cases) {
    const auto outcome = Run(c.command, c.inputs);
    EXPECT_FALSE(outcome.Succeeded()) << c.command;
    EXPECT_FALSE(outcome.reason.empty()) << c.command;
  }
}

}  // namespace
}  // namespace lumo
