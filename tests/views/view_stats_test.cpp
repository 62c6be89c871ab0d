#include <cmath>
#include <functional>

#include "commands/catalog.h"
#include "support/run_command.h"
#include "support/stats_support.h"
#include "support/test_rasters.h"
#include "views/band_stack_raster.h"
#include "views/skip_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"
#include "views/virtual_raster.h"

namespace lumo {
namespace {

using test::Near;
using test::RunCommand;
using Pixel = std::int16_t;
using View = RasterPtr<Pixel>;

/// Pixels and states in memory, BIP, that can be read and written in any order.
class PixelStore final : public TestRaster<Pixel> {
 public:
  PixelStore(unsigned samples, unsigned lines, unsigned bands, unsigned seed)
      : TestRaster(samples, lines, bands),
        pixels(std::size_t{samples} * lines * bands),
        states(pixels.size()) {
    for (std::size_t i = 0; i < pixels.size(); ++i) {
      seed = seed * 1664525 + 1013904223;  // Numerical Recipes
      pixels[i] = static_cast<Pixel>(static_cast<int>(seed >> 18) - 8192);
      states[i] = seed % 11 == 0 ? PixelValueState::NoData : 0;
    }
  }

  bool CanWrite() const override { return true; }
  std::uint64_t WriteCount() const override { return writes; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<Pixel>& block, Array<unsigned char>& state) override {
    const ArrayDims dims = BlockDims(interleave, rect.Width(), rect.Height(), bands.GetCount());
    if (!block.Resize(dims) || !state.Resize(dims)) return false;
    std::vector<Pixel> bip;
    std::vector<unsigned char> bipState;
    ForEach(rect, bands, [&](std::size_t at) {
      bip.push_back(pixels[at]);
      bipState.push_back(states[at]);
    });
    if (onRead) onRead();
    return Convert(bip.data(), Interleave::BIP, block.GetData(), interleave, rect, bands) &&
           Convert(bipState.data(), Interleave::BIP, state.GetData(), interleave, rect, bands);
  }

  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<Pixel>& block, Array<unsigned char>& state) override {
    std::vector<Pixel> bip(block.GetCount());
    std::vector<unsigned char> bipState(block.GetCount());
    if (!Convert(block.GetData(), interleave, bip.data(), Interleave::BIP, rect, bands) ||
        !Convert(state.GetData(), interleave, bipState.data(), Interleave::BIP, rect, bands)) {
      return false;
    }
    std::size_t from = 0;
    ForEach(rect, bands, [&](std::size_t at) {
      pixels[at] = bip[from];
      states[at] = bipState[from++];
    });
    ++writes;
    return true;
  }

  std::vector<Pixel> pixels;
  std::vector<unsigned char> states;
  std::atomic<std::uint64_t> writes{0};
  std::function<void()> onRead;  // after the pixels were copied

 private:
  template <typename Visit>
  void ForEach(const SubRect& rect, const Array<unsigned>& bands, const Visit& visit) const {
    for (std::size_t y = rect.top; y <= rect.bottom; ++y)
      for (std::size_t x = rect.left; x <= rect.right; ++x)
        for (const unsigned band : bands) visit((y * Samples() + x) * Bands() + band);
  }
  template <typename E>
  static bool Convert(const E* from, Interleave order, E* to, Interleave wanted,
                      const SubRect& rect, const Array<unsigned>& bands) {
    return ConvertInterleave(from, order, to, wanted, rect.Width(), rect.Height(), bands.GetCount(),
                             sizeof(E));
  }
};

/// A source that computes its statistics.
class Source final : public ComputedRaster<Pixel> {
 public:
  explicit Source(const Pointer<PixelStore>& store) : ComputedRaster(View(store)) {}
  ~Source() override { StopComputing(); }
};

/// All pixels of a view, by band; NaN where they don't count.
std::vector<std::vector<double>> ReadAll(Raster<Pixel>& view) {
  std::vector<unsigned> bands(view.Bands());
  for (unsigned i = 0; i < bands.size(); ++i) bands[i] = i;
  Array<Pixel> pixels;
  Array<unsigned char> states;
  EXPECT_TRUE(view.GetSubRect({0, 0, view.Samples() - 1, view.Lines() - 1}, MakeArray(bands),
                              Interleave::BIP, pixels, states));
  std::vector<std::vector<double>> all(bands.size());
  for (unsigned i = 0; i < pixels.GetCount(); ++i) {
    all[i % bands.size()].push_back(states[i] == 0 ? pixels[i] : NAN);
  }
  return all;
}

struct Pair {
  long double n = 0, sumXY = 0, cov = 0, meanX = 0;
};

/// Statistics of two bands where both count, in two passes.
Pair ByHand(const std::vector<double>& x, const std::vector<double>& y) {
  Pair pair;
  long double meanY = 0;
  const auto forEach = [&](const auto& visit) {
    for (std::size_t i = 0; i < x.size(); ++i) {
      if (!std::isnan(x[i]) && !std::isnan(y[i])) visit((long double)x[i], (long double)y[i]);
    }
  };
  forEach([&](long double a, long double b) {
    ++pair.n;
    pair.sumXY += a * b;
    pair.meanX += a;
    meanY += b;
  });
  pair.meanX /= pair.n;
  meanY /= pair.n;
  forEach([&](long double a, long double b) { pair.cov += (a - pair.meanX) * (b - meanY); });
  pair.cov /= pair.n - 1;
  return pair;
}

void ExpectStatsByHand(Raster<Pixel>& view) {
  const auto all = ReadAll(view);
  view.SetStatsMode(StatsMode::kExtended);
  for (unsigned i = 0; i < all.size(); ++i) {
    const Pair band = ByHand(all[i], all[i]);
    EXPECT_TRUE(Near(view.Mean(i, IPC()), band.meanX)) << "band " << i;
    EXPECT_TRUE(Near(view.Sum2(i, IPC()), band.sumXY)) << "band " << i;
    for (unsigned j = 0; j < all.size(); ++j) {
      const Pair pair = ByHand(all[i], all[j]);
      EXPECT_TRUE(Near(view.SumXY(i, j, IPC()), pair.sumXY)) << i << ", " << j;
      EXPECT_LT(std::fabs(view.Cov(i, j, IPC()) - pair.cov), 1e-9 * std::sqrt(band.sumXY * 1e6))
          << i << ", " << j;
    }
    const RasterBandStats<Pixel> stats = view.BandStats(i);
    EXPECT_EQ(stats.band, i);
    EXPECT_EQ(stats.mask, StatsMask::Extended);
    ASSERT_EQ(stats.sumXY.GetCount(), all.size());
    for (unsigned j = 0; j < all.size(); ++j) {
      EXPECT_TRUE(Near(stats.sumXY[j], ByHand(all[i], all[j]).sumXY)) << i << ", " << j;
    }
    EXPECT_TRUE(view.StatsExist(i, StatsMask::Extended));
  }
}

void ExpectHistogramByHand(Raster<Pixel>& view) {
  const auto all = ReadAll(view);
  HistogramRequest<Pixel> request;
  request.lower = -8192;
  request.upper = 8191;
  request.binCount = 7;
  request.bins = Form::kExact;
  const AsyncPtr run = view.CountHistogram(request, IPC());
  ASSERT_TRUE(run);
  run->WaitFinished();
  for (unsigned band = 0; band < all.size(); ++band) {
    std::vector<unsigned long long> counts(7);
    for (const double value : all[band]) {
      if (!std::isnan(value)) ++counts[static_cast<std::size_t>((value + 8192) * 7 / 16384)];
    }
    const auto histograms = view.BandHistogram(band);
    ASSERT_EQ(histograms.GetCount(), 1U);
    EXPECT_EQ(std::vector(histograms[0].counts.begin(), histograms[0].counts.end()), counts);
  }
}

View Spectral(const View& parent, const std::vector<unsigned>& bands) {
  return View(new SpectralSubsetRaster<Pixel>(parent, MakeArray(bands)));
}

View Stack(const std::vector<View>& members) {
  return View(new BandStackRaster<Pixel>(MakeArray(members)));
}

/// Views of every class on two stores.
class ViewStats : public testing::Test {
 protected:
  std::vector<std::pair<const char*, View>> Views() const {
    return {{"source", first},
            {"spectral", Spectral(first, {3, 2, 0})},
            {"spectral, a band twice", Spectral(first, {2, 0, 2})},
            {"spectral of spectral", Spectral(Spectral(first, {3, 2, 1}), {1, 0})},
            {"spatial", View(new SpatialSubsetRaster<Pixel>(first, {2, 1, 9, 6}))},
            {"spectral of spatial",
             Spectral(View(new SpatialSubsetRaster<Pixel>(first, {2, 1, 9, 6})), {2, 0})},
            {"skip", View(new SkipRaster<Pixel>(first, 2, 1, true))},
            {"stack", Stack({first, second})},
            {"stack of a view and a source without statistics",
             Stack({Spectral(second, {1}), View(secondStore), first})},
            {"stack of one source twice", Stack({first, first})},
            {"spectral of stack", Spectral(Stack({first, second}), {5, 0, 3})},
            {"virtual", View(new VirtualRaster<Pixel>(first))},
            {"local", View(new LocalRaster<Pixel>(Spectral(first, {1, 0})))}};
  }

  Pointer<PixelStore> firstStore{new PixelStore(12, 9, 4, 1)};
  Pointer<PixelStore> secondStore{new PixelStore(12, 9, 2, 2)};
  View first{new Source(firstStore)};
  View second{new Source(secondStore)};
};

TEST_F(ViewStats, HoldForTheBandsThatAViewShows) {
  for (const auto& [name, view] : Views()) {
    SCOPED_TRACE(name);
    if (std::string(name).find("without") != std::string::npos) {
      EXPECT_EQ(view->Mean(1, IPC()), 0);  // a member's own answer
      continue;
    }
    ExpectStatsByHand(*view);
    ExpectHistogramByHand(*view);
  }
}

TEST_F(ViewStats, PairsOfAStackDoNotComeFromItsMembers) {
  first->SetStatsMode(StatsMode::kExtended);
  first->Cov(0, 1, IPC());
  const View stack = Stack({View(secondStore), first});
  EXPECT_EQ(stack->BandStats(2).mask, StatsMask::Basic);  // the member has arrays of its own bands
  EXPECT_FALSE(stack->StatsExist(2, StatsMask::Cov));
  stack->SetStatsMode(StatsMode::kExtended);
  const auto all = ReadAll(*stack);
  for (unsigned i = 0; i < all.size(); ++i)
    for (unsigned j = 0; j < all.size(); ++j) {
      EXPECT_TRUE(Near(stack->SumXY(i, j, IPC()), ByHand(all[i], all[j]).sumXY)) << i << ", " << j;
    }
}

TEST_F(ViewStats, CommandsGiveTheMatricesOfAView) {
  for (const auto& [name, view] :
       {std::pair("spectral", Spectral(first, {3, 2, 1})), {"stack", Stack({second, first})}}) {
    SCOPED_TRACE(name);
    first->SetStatsMode(StatsMode::kBasic);
    catalog::Add(view);
    auto got = RunCommand("GetExtendedRasterStatsCommand",
                          {{"URI", FormatValue(view->GetURI()).ToUTF8()}});
    ASSERT_TRUE(got.Succeeded()) << got.reason;
    const auto sumXY = ParseValue<Array<double>>(String(got.outputs["SumXY"]));
    const auto all = ReadAll(*view);
    ASSERT_EQ(sumXY.GetCount(), all.size() * all.size());
    for (unsigned i = 0; i < sumXY.GetCount(); ++i) {
      const unsigned bands = view->Bands();
      EXPECT_TRUE(Near(sumXY[i], ByHand(all[i / bands], all[i % bands]).sumXY)) << i;
    }
    catalog::Remove(view);
  }
}

TEST_F(ViewStats, ValuesEnteredInAViewReachItsParentUnderTheParentsBands) {
  const View view = Spectral(first, {3, 1});
  RasterBandStats<Pixel> stats;
  stats.band = 1;
  stats.mask = StatsMask::Mean;
  stats.mean = 5;
  stats.SetCov(1, 11);
  stats.cov[0] = 13;
  view->SetBandStats(stats);
  EXPECT_EQ(first->BandStats(1).mean, 5);
  EXPECT_EQ(first->BandStats(1).mask, StatsMask::Mean);  // of bands 0 and 2 nothing is known
  stats.cov = MakeArray<double>({10, 11, 12, 13});
  stats.mask = StatsMask::Cov;
  Spectral(first, {3, 1, 0, 2})->SetBandStats(stats);
  const auto cov = first->BandStats(1).cov;
  EXPECT_EQ(std::vector(cov.begin(), cov.end()), (std::vector<double>{12, 11, 13, 10}));
}

TEST_F(ViewStats, AreGoneOncePixelsAreWritten) {
  for (const auto& [name, view] : Views()) {
    SCOPED_TRACE(name);
    if (std::string(name).find("without") != std::string::npos) continue;
    ExpectStatsByHand(*view);
    ExpectHistogramByHand(*view);
    RasterBandStats<Pixel> entered = view->BandStats(0);
    entered.mean = 1e6;
    view->SetBandStats(entered);
    const std::uint64_t before = view->WriteCount();
    Array<Pixel> pixels = MakeArray<Pixel>({100, -200});
    Array<unsigned char> states = MakeArray<unsigned char>({0, 0});
    EXPECT_TRUE(
        view->PutSubRect({1, 2, 2, 2}, MakeArray<unsigned>({0}), Interleave::BIP, pixels, states));
    EXPECT_NE(view->WriteCount(), before);
    EXPECT_FALSE(view->StatsExist(0, StatsMask::Mean));
    EXPECT_EQ(view->BandHistogram(0).GetCount(), 0U);
    ExpectStatsByHand(*view);
    ExpectHistogramByHand(*view);
    // A write below the view counts as well.
    firstStore->pixels[4 * (12 * 3 + 4)] = 4000;
    ++firstStore->writes;
    ExpectStatsByHand(*view);
  }
}

TEST_F(ViewStats, AComputationThatAWriteOvertakesGivesNothing) {
  unsigned reads = 0;
  firstStore->onRead = [&] {
    if (++reads != 1) return;
    std::fill(firstStore->pixels.begin(), firstStore->pixels.end(), Pixel{77});
    std::fill(firstStore->states.begin(), firstStore->states.end(), static_cast<unsigned char>(0));
    ++firstStore->writes;
  };
  EXPECT_EQ(first->Mean(0, IPC()), 77);
  EXPECT_GE(reads, 2U);
  reads = 0;
  HistogramRequest<Pixel> request{0, 100, 1, 0, {}, HistogramSign::kBoth, Form::kTold};
  first->CountHistogram(request, IPC())->WaitFinished();
  EXPECT_EQ(first->BandHistogram(0).GetCount(), 0U);
}

TEST(VirtualRaster, ForwardsThePixelCount) {
  class Counted final : public RasterView<Pixel> {
   public:
    std::uint64_t PixelCount(unsigned band, const IPC&) override { return 40 + band; }
  };
  const View source(new Counted);
  EXPECT_EQ(LocalRaster<Pixel>(source).PixelCount(2, IPC()), 42U);
  EXPECT_EQ(VirtualRaster<Pixel>(source).PixelCount(1, IPC()), 41U);
  EXPECT_EQ(VirtualRaster<Pixel>(View()).PixelCount(1, IPC()), 0U);
  EXPECT_EQ(Spectral(source, {2})->PixelCount(0, IPC()), 0U);
}

TEST(ViewCommands, AViewWithoutPixelsFails) {
  const Pointer<PixelStore> store(new PixelStore(5, 4, 1, 1));
  catalog::Add(store);
  const std::string uri = FormatValue(store->GetURI()).ToUTF8();
  for (const auto& [x, y] : {std::pair("6", "1"), {"1", "5"}}) {
    EXPECT_FALSE(
        RunCommand("CreateSkipRasterCommand", {{"SrcURI", uri}, {"SkipX", x}, {"SkipY", y}})
            .Succeeded());
  }
  auto whole =
      RunCommand("CreateSkipRasterCommand", {{"SrcURI", uri}, {"SkipX", "5"}, {"SkipY", "4"}});
  EXPECT_TRUE(whole.Succeeded()) << whole.reason;
  catalog::Remove(BasicRasterPtr(catalog::Find(ParseValue<URI>(String(whole.outputs["URI"])))));
  catalog::Remove(store);
}

}  // namespace
}  // namespace lumo
