#include "commands/catalog.h"
#include "stats/dynamic_raster_histogram.h"
#include "stats/dynamic_raster_stats.h"
#include "support/run_command.h"
#include "support/stats_support.h"
#include "support/test_rasters.h"
#include "views/computed_raster.h"

namespace lumo {
namespace {

using test::Near;
using test::RunCommand;
using Value = std::int32_t;
constexpr auto kExtended = StatsMode::kExtended;

/// A ramp of 200 by 100 by 2, and its keepers. Blocks are of 1 MiB, so it is read at once.
struct Kept {
  Pointer<RampRaster<Value>> ramp = MakeRamp<Value>(200, 100, 2);
  DynamicRasterStats<Value> stats{ramp.Get()};
  DynamicRasterHistogram<Value> histogram{ramp.Get()};
  IPC ipc;

  AsyncPtr Count(Value upper = 99) {
    return histogram.HistogramAllBands(0, upper, 10, HistogramSign::kBoth, ipc);
  }
};

RasterBandStats<Value> Entry(unsigned band, unsigned mask, double mean) {
  RasterBandStats<Value> entry;
  entry.band = band;
  entry.mask = mask;
  entry.mean = mean;
  return entry;
}

TEST(DynamicRasterStats, ComputeOnceAndKeep) {
  Kept kept;
  EXPECT_FALSE(kept.stats.StatsExist(0, StatsMask::Min));
  EXPECT_EQ(kept.stats.BandStats(1).band, 1U);
  EXPECT_EQ(kept.stats.BandStats(1).mask, 0U);
  EXPECT_EQ(kept.stats.Min(1, kept.ipc), 1'000'000);
  EXPECT_EQ(kept.ipc.progress->GetProgress(), 1.0);
  EXPECT_EQ(kept.stats.Max(0, kept.ipc), 99'199);
  EXPECT_TRUE(Near(kept.stats.Mean(0, kept.ipc), 49'599.5L));
  EXPECT_EQ(kept.stats.PixelCount(1, kept.ipc), 20'000U);
  EXPECT_TRUE(kept.stats.StatsExist(1, StatsMask::Basic));
  EXPECT_FALSE(kept.stats.StatsExist(1, StatsMask::Extended));
  EXPECT_EQ(kept.ramp->reads, 1U);
  EXPECT_EQ(kept.stats.Mean(2, kept.ipc), 0);  // no such band
  EXPECT_EQ(kept.stats.SumXY(0, 1, kept.ipc), 0);
  EXPECT_EQ(kept.ramp->reads, 1U);
}

TEST(DynamicRasterStats, ModeDecidesWhatIsComputed) {
  Kept kept;
  kept.stats.SetBandStats(Entry(0, StatsMask::Basic, 5));
  kept.stats.SetStatsMode(kExtended);
  EXPECT_FALSE(kept.stats.StatsExist(0, StatsMask::Mean));
  // Band 1 is band 0 and a million: the variance of a uniform grid of 200 by 100 steps of 1000.
  const long double variance = (199 * 201 / 12.0L + 1e6L * 99 * 101 / 12) * 20'000 / 19'999;
  EXPECT_TRUE(Near(kept.stats.Cov(0, 1, kept.ipc), variance));
  EXPECT_TRUE(Near(kept.stats.Cov(1, 1, kept.ipc), variance));
  EXPECT_GT(kept.stats.SumXY(1, 0, kept.ipc), 0);
  EXPECT_EQ(kept.stats.Cov(0, 2, kept.ipc), 0);
  EXPECT_TRUE(kept.stats.StatsExist(1, StatsMask::Extended));
  kept.stats.SetStatsMode(StatsMode::kBasic);
  EXPECT_TRUE(kept.stats.StatsExist(1, StatsMask::Extended));
  EXPECT_EQ(kept.stats.Cov(0, 1, kept.ipc), 0);
  EXPECT_EQ(kept.ramp->reads, 1U);
}

TEST(DynamicRasterStats, EnteredByHand) {
  Kept kept;
  kept.stats.SetBandStats(Entry(1, StatsMask::Mean, 5));
  kept.stats.SetBandStats(Entry(2, StatsMask::Mean, 5));
  EXPECT_EQ(kept.stats.Mean(1, kept.ipc), 5);
  EXPECT_FALSE(kept.stats.StatsExist(2, StatsMask::Mean));
  kept.stats.SetBandStats(Entry(1, StatsMask::Mean | StatsMask::Max, 6));
  EXPECT_EQ(kept.stats.BandStats(1).mean, 6);
  EXPECT_EQ(kept.ramp->reads, 0U);
  EXPECT_EQ(kept.stats.Min(1, kept.ipc), 1'000'000);  // not at hand: computed, with all others
  EXPECT_TRUE(Near(kept.stats.Mean(1, kept.ipc), 1'049'599.5L));
}

TEST(DynamicRasterStats, OneComputationAtATime) {
  Kept kept;
  kept.ramp->delay = std::chrono::milliseconds(50);
  const AsyncPtr run = kept.stats.StatsBuild(kept.ipc);
  ASSERT_TRUE(run);
  EXPECT_FALSE(kept.stats.StatsBuild(kept.ipc));
  EXPECT_TRUE(kept.stats.StatsAsync() == run);
  kept.stats.SetStatsMode(kExtended);
  kept.stats.SetBandStats(Entry(0, StatsMask::Mean, 5));
  EXPECT_EQ(kept.stats.StatsMode(), StatsMode::kBasic);
  EXPECT_EQ(kept.stats.Min(1, kept.ipc), 1'000'000);  // waits for the one that runs
  EXPECT_FALSE(kept.stats.StatsAsync());
  EXPECT_EQ(kept.ramp->reads, 1U);
}

TEST(DynamicRasterStats, AnAbortOrAFailureLeavesWhatStood) {
  for (const bool fails : {false, true}) {
    Kept kept;
    kept.stats.SetBandStats(Entry(0, StatsMask::Mean, 5));
    if (fails) {
      kept.ramp->failAtRead = 0;
    } else {
      kept.ramp->abort = kept.ipc.abort;
      kept.ramp->abortAtRead = 0;
    }
    EXPECT_EQ(kept.stats.Max(0, kept.ipc), 0);
    EXPECT_EQ(kept.stats.Mean(0, kept.ipc), 5);
    EXPECT_FALSE(kept.stats.StatsExist(1, StatsMask::Min));
    EXPECT_EQ(kept.stats.Max(0, IPC()), 99'199);  // another try goes well
  }
}

TEST(DynamicRasterStats, EndWithTheRasterWhileTheyRun) {
  auto kept = std::make_unique<Kept>();
  kept->ramp->delay = std::chrono::milliseconds(20);
  const AsyncPtr stats = kept->stats.StatsBuild(kept->ipc);
  const AsyncPtr histogram = kept->Count();
  ASSERT_TRUE(stats && histogram);
  kept.reset();
  EXPECT_TRUE(stats->IsFinished() && histogram->IsFinished());
}

TEST(DynamicRasterStats, OfComplexNumbersAreEmpty) {
  const auto ramp = MakeRamp<Complex<float>>(5, 5, 1);
  DynamicRasterStats<Complex<float>> stats(ramp.Get());
  DynamicRasterHistogram<Complex<float>> histogram(ramp.Get());
  EXPECT_FALSE(stats.StatsBuild(IPC()));
  EXPECT_EQ(stats.Mean(0, IPC()), 0);
  EXPECT_FALSE(histogram.HistogramAllBands({}, {}, 5, HistogramSign::kBoth, IPC()));
}

TEST(DynamicRasterHistogram, RunsLeaveOneEntryEach) {
  Kept kept;
  const auto run = [&](Value upper) {
    const AsyncPtr async = kept.Count(upper);
    ASSERT_TRUE(async);
    async->WaitFinished();
  };
  run(99);
  run(99);
  run(199);
  ASSERT_EQ(kept.histogram.BandHistogram(0).GetCount(), 2U);
  ASSERT_EQ(kept.histogram.BandHistogram(1).GetCount(), 2U);
  const auto first = kept.histogram.BandHistogram(0)[0];
  EXPECT_EQ(first.binSize, 11);  // 99 / 9
  EXPECT_EQ(first.max, 109);
  EXPECT_EQ(first.counts[2], 11U);  // samples 22 to 32 of line 0
  kept.histogram.SetBandHistogram(first);
  auto other = first;
  other.source = StatsSource::kNative;
  kept.histogram.SetBandHistogram(other);
  ASSERT_EQ(kept.histogram.BandHistogram(0).GetCount(), 3U);
  EXPECT_EQ(kept.histogram.BandHistogram(0)[2].source, StatsSource::kNative);
}

TEST(DynamicRasterHistogram, OneRunAtATimeOverBandsThatAreThere) {
  Kept kept;
  const auto bands = MakeArray<unsigned>({1, 2});
  EXPECT_FALSE(kept.histogram.HistogramByBinCount(0, 9, 5, bands, HistogramSign::kBoth, kept.ipc));
  kept.ramp->delay = std::chrono::milliseconds(50);
  const AsyncPtr run = kept.histogram.HistogramByBinSize(
      1'000'000, 1'000'099, 50.0, MakeArray<unsigned>({1}), HistogramSign::kPositive, kept.ipc);
  ASSERT_TRUE(run);
  EXPECT_TRUE(kept.histogram.HistogramAsync() == run);
  EXPECT_FALSE(kept.Count());
  EXPECT_EQ(kept.histogram.BandHistogram(1).GetCount(), 0U);
  run->WaitFinished();
  ASSERT_EQ(kept.histogram.BandHistogram(1).GetCount(), 1U);
  EXPECT_EQ(kept.histogram.BandHistogram(1)[0].counts[1], 50U);
  EXPECT_EQ(kept.histogram.BandHistogram(0).GetCount(), 0U);
}

TEST(DynamicRasterHistogram, AFailureLeavesNothingAnAbortWhatItCounted) {
  Kept kept;
  kept.ramp->failAtRead = 0;
  kept.Count()->WaitFinished();
  EXPECT_EQ(kept.histogram.BandHistogram(0).GetCount(), 0U);
  kept.ipc.abort->Set(true);
  kept.Count()->WaitFinished();
  ASSERT_EQ(kept.histogram.BandHistogram(0).GetCount(), 1U);
  EXPECT_EQ(kept.histogram.BandHistogram(0)[0].counts[0], 0U);
}

/// A raster of 4 by 2 by 2 in the catalog: pixels 0 to 7 and ten times as much.
class StatsCommands : public testing::Test {
 protected:
  class Shown final : public ComputedRaster<Value> {
   public:
    using ComputedRaster::ComputedRaster;
    ~Shown() override { StopComputing(); }
    URI GetURI() const override { return URI("stats commands"); }
  };

  StatsCommands() {
    for (int i = 0; i < 8; ++i) {
      pixels_->pixels[2 * i] = i;
      pixels_->pixels[2 * i + 1] = 10 * i;
    }
    catalog::Add(raster_);
  }
  ~StatsCommands() override { catalog::Remove(raster_); }

  test::CommandOutcome Run(const char* name, std::map<std::string, std::string> inputs = {}) {
    inputs.try_emplace("URI", "[stats commands] ");
    return RunCommand(name, inputs);
  }

  Pointer<MemoryTestRaster<Value>> pixels_{new MemoryTestRaster<Value>(4, 2, 2)};
  RasterPtr<Value> raster_{new Shown(pixels_)};
};

TEST_F(StatsCommands, GiveStatistics) {
  auto basic = Run("GetBasicRasterStatsCommand");
  ASSERT_TRUE(basic.Succeeded()) << basic.reason;
  EXPECT_EQ(basic.outputs["Min"], "1:2 [0 0] ");
  EXPECT_EQ(basic.outputs["Max"], "1:2 [7 70] ");
  EXPECT_EQ(basic.outputs["Mean"], "1:2 [3.5 35] ");
  EXPECT_EQ(basic.outputs["Sum"], "1:2 [28 280] ");
  EXPECT_EQ(basic.outputs["Sum2"], "1:2 [140 14000] ");
  EXPECT_EQ(basic.outputs.count("Cov"), 0U);
  auto extended = Run("GetExtendedRasterStatsCommand");
  ASSERT_TRUE(extended.Succeeded()) << extended.reason;
  const auto cov = ParseValue<Array<double>>(String(extended.outputs["Cov"]));
  ASSERT_EQ(cov.GetDims(), ArrayDims(2, 2));
  EXPECT_TRUE(Near(cov[0], 6) && Near(cov[1], 60) && Near(cov[2], 60) && Near(cov[3], 600));
  EXPECT_EQ(extended.outputs["SumXY"], "2:2 2 [140 1400 1400 14000] ");
  EXPECT_EQ(Run("SetRasterStatsModeCommand", {{"StatsMode", "DoBasic"}}).outputs["StatsMode"],
            "DoBasic");
  EXPECT_EQ(Run("SaveRasterStatsCommand").outputs["Return"], "0");  // it has nowhere to
}

TEST_F(StatsCommands, TakeStatisticsByHand) {
  const char* const text = "1 4 0 0 99 0 0 0 0 0: [] 0: [] ";
  EXPECT_TRUE(Run("SetRasterBandStatsCommand", {{"RasterBandStats", text}}).Succeeded());
  EXPECT_EQ(raster_->Mean(1, IPC()), 99);
  EXPECT_FALSE(Run("SetRasterBandStatsCommand", {{"RasterBandStats", "2 4 0"}}).Succeeded());
}

TEST_F(StatsCommands, CountHistograms) {
  const std::map<std::string, std::string> bounds{{"LowerBound", "0"}, {"UpperBound", "7"}};
  const auto with = [&](std::map<std::string, std::string> more) {
    more.insert(bounds.begin(), bounds.end());
    return Run("CalculateRasterHistogramCommand", more);
  };
  EXPECT_TRUE(with({{"BinCount", "8"}}).Succeeded());
  EXPECT_TRUE(with({{"BinSize", "4"}, {"Bands", "1:1 [0] "}, {"Sign", "Positive"}}).Succeeded());
  auto got = Run("GetRasterHistogramCommand", {{"Bands", "1:2 [1 0] "}});
  ASSERT_TRUE(got.Succeeded());
  const auto list =
      ParseValue<Array<RasterBandHistogram<Value>>>(String(got.outputs["Histograms"]));
  ASSERT_EQ(list.GetCount(), 3U);
  EXPECT_EQ(list[0].band, 1U);
  EXPECT_EQ(list[1].counts[7], 1U);
  EXPECT_EQ(list[2].counts[1], 4U);
  EXPECT_EQ(list[2].sign, HistogramSign::kPositive);
  auto byHand = list[0];
  byHand.source = StatsSource::kOrva;
  EXPECT_TRUE(
      Run("SetRasterBandHistogramCommand", {{"RasterBandHistogram", FormatValue(byHand).ToUTF8()}})
          .Succeeded());
  EXPECT_EQ(raster_->BandHistogram(1).GetCount(), 2U);
  EXPECT_EQ(Run("SaveRasterHistogramCommand").outputs["Return"], "0");
}

TEST_F(StatsCommands, SayWhyTheyFail) {
  const struct {
    const char* command;
    std::map<std::string, std::string> inputs;
    const char* reason;
  } cases[] = {
      {"GetBasicRasterStatsCommand", {{"URI", "[nothing] "}}, "no open raster"},
      {"CalculateRasterHistogramCommand", {{"LowerBound", "0"}, {"UpperBound", "7"}}, "neither"},
      {"CalculateRasterHistogramCommand",
       {{"LowerBound", "0"}, {"UpperBound", "7"}, {"BinSize", "1"}},
       "neither"},
      {"CalculateRasterHistogramCommand",
       {{"LowerBound", "0"}, {"UpperBound", "7"}, {"BinCount", "2"}, {"Bands", "1:1 [2] "}},
       "band 2"},
      {"CalculateRasterHistogramCommand",
       {{"LowerBound", "7"}, {"UpperBound", "0"}, {"BinCount", "2"}},
       "upper bound"},
      {"GetRasterHistogramCommand", {{"Bands", "1:1 [2] "}}, "band 2"},
      {"SetRasterBandHistogramCommand", {{"RasterBandHistogram", "0"}}, "no histogram"},
  };
  for (const auto& c : cases) {
    const auto outcome = Run(c.command, c.inputs);
    EXPECT_EQ(outcome.result, CommandResult::kFailed) << c.command;
    EXPECT_THAT(outcome.reason, testing::HasSubstr(c.reason));
  }
}

}  // namespace
}  // namespace lumo
