#include "mosaic/mosaic_tables.h"

#include <cmath>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <numeric>
#include <random>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "mosaic/histogram_match.h"
#include "mosaic/mosaic_matching.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/mosaic_scenes.h"
#include "support/peer_program.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;
using Counts = std::vector<unsigned long long>;

template <typename T>
T NumberAt(const std::string& bytes, std::size_t at) {
  T number{};
  if (at + sizeof(T) <= bytes.size()) std::memcpy(&number, &bytes[at], sizeof(T));
  return number;
}

/// The tables of two histograms, by numpy.
std::vector<double> MatchedByNumpy(const Counts& reference, const Counts& scene, double low,
                                   double high) {
  const test::TemporaryDirectory directory;
  const auto write = [&](const char* name, const Counts& counts) {
    std::ofstream(directory.Path() / name, std::ios::binary)
        .write(reinterpret_cast<const char*>(counts.data()),
               static_cast<std::streamsize>(counts.size() * sizeof(counts[0])));
    return (directory.Path() / name).string();
  };
  std::ofstream(directory.Path() / "match.py") << R"(
import sys, numpy as np
ref, scene = (np.fromfile(name, np.uint64) for name in sys.argv[1:3])
low, high = map(float, sys.argv[3:5])
f_ref, f = (np.cumsum(c) / c.sum() for c in (ref, scene))
values = np.linspace(low, high, len(ref))
k = np.clip(np.searchsorted(f_ref, f, side='left'), 1, None)
part = (f - f_ref[k - 1]) / np.where(f_ref[k] > f_ref[k - 1], f_ref[k] - f_ref[k - 1], 1)
table = np.where(f <= f_ref[0], low, values[k - 1] + part * (values[k] - values[k - 1]))
table.tofile(sys.argv[5])
)";
  const std::string out = (directory.Path() / "out").string();
  std::ostringstream command;
  command.precision(17);
  command << "/usr/bin/python3 " << (directory.Path() / "match.py").string() << ' '
          << write("ref", reference) << ' ' << write("scene", scene) << ' ' << low << ' ' << high
          << ' ' << out;
  if (std::system(command.str().c_str()) != 0) return {};
  const std::string bytes = FileBytes(out);
  std::vector<double> table(bytes.size() / sizeof(double));
  std::memcpy(table.data(), bytes.data(), table.size() * sizeof(double));
  return table;
}

TEST(HistogramMatch, AgreesWithNumpy) {
  if (!test::HasProgram("/usr/bin/python3")) GTEST_SKIP() << "no python3";
  std::mt19937 random(11);
  const auto make = [&](std::size_t bins, double center, double width, unsigned gaps) {
    Counts counts(bins);
    std::normal_distribution<double> value(center, width);
    for (int i = 0; i < 50000; ++i) {
      const double at = value(random);
      if (at >= 0 && at < double(bins)) ++counts[static_cast<std::size_t>(at)];
    }
    for (std::size_t i = 0; gaps != 0 && i < bins; i += gaps) counts[i] = 0;
    counts[0] += 3;
    counts[bins - 1] += 1;
    return counts;
  };
  const struct {
    Counts reference, scene;
    double low, high;
  } cases[] = {{make(256, 100, 30, 0), make(200, 120, 20, 0), 0, 255},
               {make(1000, 300, 50, 3), make(65536, 30000, 9000, 2), -5, 2.5},
               {make(2, 0, 1, 0), make(50, 20, 9, 0), 7, 8}};
  for (const auto& c : cases) {
    const auto table = MatchDistributions({CumulativeDistribution(c.reference), c.low, c.high},
                                          {CumulativeDistribution(c.scene), 0, 1, c.scene.size()});
    const auto expected = MatchedByNumpy(c.reference, c.scene, c.low, c.high);
    ASSERT_EQ(table.size(), expected.size());
    for (std::size_t i = 0; i < table.size(); ++i) {
      ASSERT_NEAR(table[i], expected[i], 1e-9 * (c.high - c.low)) << i;
    }
  }
}

TEST(HistogramMatch, KeepsValuesWhereThereIsNothingToMatch) {
  const std::vector<double> own{10, 12, 14};
  const std::vector<double> some = CumulativeDistribution(Counts{1, 2, 3});
  const std::vector<double> none = CumulativeDistribution(Counts{0, 0, 0});
  EXPECT_TRUE(none.empty());
  EXPECT_EQ(MatchDistributions({none, 0, 9}, {some, 10, 2, 3}), own);
  EXPECT_EQ(MatchDistributions({some, 0, 9}, {none, 10, 2, 3}), own);
  EXPECT_EQ(MatchDistributions({{1.0}, 5, 5}, {some, 10, 2, 3}), own);  // one bin
  EXPECT_EQ(MatchDistributions({{}, 0, 0}, {none, 10, 2, 0}), std::vector<double>());
}

/// Makes tables by the command and reads them.
class MosaicTables : public testing::Test {
 protected:
  std::string Base() const { return (directory_.Path() / "tables").string(); }

  MosaicSettings Settings(unsigned mode, Form bins = Form::kTold) const {
    MosaicSettings settings;
    settings.colourMatchMode = mode;
    settings.lutPath = String(Base());
    settings.bins = bins;
    return settings;
  }

  template <typename T>
  test::CommandOutcome Match(const std::vector<RasterPtr<T>>& scenes,
                             const MosaicSettings& settings) {
    const MosaicRasterPtr<T> mosaic =
        test::MakeMosaic(scenes, MakeGrid(0, 0, 1, 400, 400), settings);
    catalog::Add(mosaic);
    const auto outcome =
        test::RunCommand("MosaicStatsCommand",
                         {{"MosaicURI", FormatValue(mosaic->GetURI()).ToUTF8()}, {"Level", "0"}});
    catalog::Remove(mosaic);
    return outcome;
  }

  MosaicTable Table(unsigned scene, unsigned band) const {
    MosaicTableReader reader{String(Base())};
    EXPECT_TRUE(reader.IsValid()) << TakeFault().ToUTF8();
    MosaicTable table;
    EXPECT_TRUE(reader.Read(scene, band, table)) << TakeFault().ToUTF8();
    return table;
  }

  test::TemporaryDirectory directory_;
};

std::uint8_t Hills(unsigned x, unsigned y, unsigned band) {
  return static_cast<std::uint8_t>(90 + 40 * std::sin(x * 0.11 + band) + 30 * std::cos(y * 0.07) +
                                   (x * 31 + y * 17) % 11);
}

TEST_F(MosaicTables, FilesHaveTheirForm) {
  const auto scene = [](unsigned shift) {
    return test::MakeScene<std::uint8_t>(
        MakeGrid(shift, 0, 1, 100, 80), 2, [shift](unsigned x, unsigned y, unsigned band) {
          return static_cast<std::uint8_t>(Hills(x, y, band) + shift);
        });
  };
  MosaicSettings settings = Settings(1);
  settings.matchFlags = MakeArray<unsigned>({1, 1, 0});
  const auto made = Match<std::uint8_t>({scene(0), scene(20), scene(9)}, settings);
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  EXPECT_EQ(made.outputs.at("Success"), "1");

  const std::string items = FileBytes(Base() + ".mlh"), entries = FileBytes(Base() + ".mlt");
  ASSERT_EQ(items.size(), 1024U + 6 * 24);
  ASSERT_EQ(entries.size(), 1024U + std::size_t{6} * 65536 * 8);
  EXPECT_EQ(items.substr(0, 15), "MOSAICLUTBASE51");
  EXPECT_EQ(NumberAt<std::uint32_t>(items, 15), 3U);
  EXPECT_EQ(NumberAt<std::uint32_t>(items, 19), 2U);
  EXPECT_EQ(entries.substr(0, 11), "MOSAICLUT51");
  EXPECT_EQ(NumberAt<std::uint32_t>(entries, 11), 3U);
  EXPECT_EQ(NumberAt<std::uint32_t>(entries, 15), 2U);
  EXPECT_EQ(NumberAt<std::uint32_t>(entries, 19), 65536U);
  for (unsigned i = 23; i < 1024; ++i) ASSERT_EQ(entries[i] | items[i], 0) << i;

  for (const unsigned index : {0U, 1U, 2U, 3U}) {  // scene * 2 + band
    Counts counts(256);
    const unsigned shift = index / 2 * 20;
    for (unsigned y = 0; y < 80; ++y)
      for (unsigned x = 0; x < 100; ++x) ++counts[Hills(x, y, index % 2) + shift];
    unsigned low = 0, high = 255;
    while (counts[low] == 0) ++low;
    while (counts[high] == 0) --high;
    EXPECT_EQ(NumberAt<double>(items, 1024 + index * 24), low);
    EXPECT_EQ(NumberAt<double>(items, 1024 + index * 24 + 8), high);
    EXPECT_EQ(NumberAt<std::uint32_t>(items, 1024 + index * 24 + 16), high - low + 1);
    for (unsigned bin = 0; bin <= high - low; ++bin) {  // the shift goes, where there are values
      const double entry = NumberAt<double>(entries, 1024 + (std::size_t{index} * 65536 + bin) * 8);
      if (counts[low + bin] == 0) continue;
      ASSERT_NEAR(entry, low + bin - shift, 1e-9) << index << " " << bin;
    }
  }
  for (std::size_t at = 1024 + 4 * 24; at < items.size(); ++at) ASSERT_EQ(items[at], 0);
}

TEST_F(MosaicTables, UndoesAKnownGainAndOffset) {
  // The second scene sees the same ground, a part of it, by gain 0.82 and offset 14.
  const auto ground = [](unsigned x, unsigned y) {
    return 120 + 60 * std::sin(x * 0.05) * std::cos(y * 0.04) + (x * 7 + y * 13) % 17;
  };
  const auto first = test::MakeScene<std::uint16_t>(
      MakeGrid(0, 0, 1, 200, 150), 1,
      [&](unsigned x, unsigned y, unsigned) { return std::uint16_t(std::lround(ground(x, y))); });
  const auto second = test::MakeScene<std::uint16_t>(
      MakeGrid(120, 0, 1, 200, 150), 1, [&](unsigned x, unsigned y, unsigned) {
        return std::uint16_t(std::lround(0.82 * ground(x + 120, y) + 14));
      });
  ASSERT_TRUE(Match<std::uint16_t>({first, second}, Settings(0)).Succeeded());
  const MosaicTable table = Table(1, 0);
  double before = 0, after = 0, reference = 0, worst = 0;
  for (unsigned y = 0; y < 150; ++y) {
    for (unsigned x = 120; x < 200; ++x) {
      const double value = std::lround(0.82 * ground(x, y) + 14);
      const double matched = table.entries[static_cast<std::size_t>(value - table.minimum)];
      before += value;
      after += matched;
      reference += std::lround(ground(x, y));
      worst = std::max(worst, std::abs(matched - ground(x, y)));
    }
  }
  const double pixels = 80 * 150;
  EXPECT_GT(std::abs(before - reference) / pixels, 5);
  EXPECT_LT(std::abs(after - reference) / pixels, 0.5);
  EXPECT_LT(worst, 2);
  const MosaicTable own = Table(0, 0);  // the reference, to itself
  for (std::size_t bin = 0; bin < own.entries.size(); ++bin) {
    EXPECT_NEAR(own.entries[bin], own.minimum + double(bin), 1e-9);
  }
}

TEST_F(MosaicTables, MatchesSmallOverlapsAsWholes) {
  // An overlap of exactly a tenth of the scene is too small; one column more is not.
  for (const unsigned columns : {10U, 11U}) {
    const auto first = test::MakeScene<std::int16_t>(
        MakeGrid(0, 0, 1, 100, 50), 1, [](unsigned x, unsigned y, unsigned) {
          return std::int16_t(x < 80 ? 100 + (x + y) % 50 : 500 + (x + y) % 50);
        });
    const auto second = test::MakeScene<std::int16_t>(
        MakeGrid(100 - double(columns), 0, 1, 100, 50), 1, [&](unsigned x, unsigned y, unsigned) {
          return std::int16_t(x < columns ? 1000 + (x + y) % 50 : 3000 + (x + y) % 50);
        });
    ASSERT_TRUE(Match<std::int16_t>({first, second}, Settings(0)).Succeeded());
    const MosaicTable table = Table(1, 0);
    EXPECT_EQ(table.minimum, 1000);
    EXPECT_EQ(table.maximum > 3000, columns == 10);
    EXPECT_EQ(table.entries.front() < 200, columns == 10);  // of the whole reference
    EXPECT_GE(table.entries.front(), columns == 10 ? 100 : 500);
  }
}

/// A quarter of a float scene's values, mapped by its table as a reader does it.
template <typename T>
double Mapped(const MosaicTable& table, T value) {
  const double bins = double(table.entries.size()) - 1;
  const double at = (double(value) - table.minimum) / (table.maximum - table.minimum) * bins;
  return table
      .entries[std::min(static_cast<std::size_t>(std::lround(at)), table.entries.size() - 1)];
}

TEST_F(MosaicTables, ExactBinsMatchFloats) {
  std::mt19937 random(2);
  std::uniform_real_distribution<float> noise(0, 0.05F);
  std::vector<float> ground(100 * 100);
  for (std::size_t i = 0; i < ground.size(); ++i) {
    ground[i] = 0.4F + 0.3F * float(std::sin(double(i % 100) * 0.05)) + noise(random);
  }
  const auto at = [&](unsigned x, unsigned y) { return ground[y * 100 + x]; };
  const auto first = test::MakeScene<float>(
      MakeGrid(0, 0, 1, 100, 100), 1, [&](unsigned x, unsigned y, unsigned) { return at(x, y); });
  const auto second = test::MakeScene<float>(
      MakeGrid(0, 0, 1, 100, 100), 1,
      [&](unsigned x, unsigned y, unsigned) { return 1.5F * at(x, y) + 0.2F; });
  for (const unsigned mode : {0U, 1U}) {
    ASSERT_TRUE(Match<float>({first, second}, Settings(mode, Form::kExact)).Succeeded());
    const MosaicTable table = Table(1, 0);
    ASSERT_EQ(table.entries.size(), 65536U);
    for (const float value : ground) EXPECT_NEAR(Mapped(table, 1.5F * value + 0.2F), value, 1e-3);
  }
  // The told bins count nothing of values within 1: the scene keeps its own.
  ASSERT_TRUE(Match<float>({first, second}, Settings(1)).Succeeded());
  const MosaicTable told = Table(1, 0);
  for (const float value : ground) {
    EXPECT_NEAR(Mapped(told, 1.5F * value + 0.2F), 1.5F * value + 0.2F, 1e-4);
  }
}

TEST_F(MosaicTables, KeepsTheValuesOfScenesWithoutADistribution) {
  const auto of = [](int value) {
    return test::MakeScene<std::int32_t>(
        MakeGrid(0, 0, 1, 20, 20), 1, [value](auto...) { return value; }, 0);
  };
  // A constant reference has one bin; a scene without pixels has counted nothing.
  ASSERT_TRUE(Match<std::int32_t>({of(7), of(90), of(0)}, Settings(1)).Succeeded());
  EXPECT_EQ(Table(0, 0).entries, std::vector<double>{7});
  EXPECT_EQ(Table(1, 0).entries, std::vector<double>{90});
  EXPECT_EQ(Table(2, 0).entries, std::vector<double>{0});
}

TEST_F(MosaicTables, BinsOfWideIntegersGrow) {
  const struct {
    std::int32_t range;
    double size;
  } cases[] = {{32766, 1}, {65533, 1}, {65534, 2}, {2000000000, 61037}};
  for (const auto& c : cases) {
    EXPECT_EQ((MatchingHistogram<std::int32_t>(-5, c.range - 5, Form::kTold).binSize), c.size);
  }
}

TEST_F(MosaicTables, AFailureLeavesTheOlderTables) {
  const auto scene = [](unsigned bands) {
    return test::MakeScene<std::uint8_t>(MakeGrid(0, 0, 1, 50, 50), bands, Hills);
  };
  ASSERT_TRUE(Match<std::uint8_t>({scene(2), scene(2)}, Settings(1)).Succeeded());
  const std::string older = FileBytes(Base() + ".mlh") + FileBytes(Base() + ".mlt");

  const auto gone = Match<std::uint8_t>({scene(2), RasterPtr<std::uint8_t>()}, Settings(0));
  EXPECT_EQ(gone.result, CommandResult::kFailed);
  EXPECT_EQ(gone.outputs.at("Success"), "0");
  EXPECT_NE(gone.reason.find("scene 1"), std::string::npos) << gone.reason;
  EXPECT_NE(Match<std::uint8_t>({scene(2), scene(1)}, Settings(1)).reason.find("has 1 bands"),
            std::string::npos);
  EXPECT_NE(Match<std::uint8_t>({scene(2)}, Settings(2)).reason.find("mode"), std::string::npos);
  const auto broken = MakePlaced<std::uint8_t>(MakeGrid(0, 0, 1, 50, 50), 2, Hills);
  broken->fails = true;
  const RasterPtr<std::uint8_t> view(
      new SpatialSubsetRaster<std::uint8_t>(RasterPtr<std::uint8_t>(broken), {0, 0, 49, 49}));
  EXPECT_EQ(Match<std::uint8_t>({scene(2), view}, Settings(1)).result, CommandResult::kFailed);
  {
    const test::FileSizeLimit limit(100000);
    const auto full = Match<std::uint8_t>({scene(2), scene(2)}, Settings(1));
    EXPECT_EQ(full.result, CommandResult::kFailed);
    EXPECT_NE(full.reason.find(Base() + ".mlt:"), std::string::npos) << full.reason;
  }
  EXPECT_EQ(FileBytes(Base() + ".mlh") + FileBytes(Base() + ".mlt"), older);
  EXPECT_EQ(std::distance(fs::directory_iterator(directory_.Path()), fs::directory_iterator()), 2);

  for (const std::size_t size : {0U, 500U, 1023U}) {
    fs::resize_file(Base() + ".mlh", size);
    EXPECT_FALSE(MosaicTableReader(String(Base())).IsValid());
  }
  EXPECT_FALSE(MosaicTableReader(String(Base() + "no")).IsValid());
  EXPECT_FALSE(fs::exists(Base() + "no.mlh"));
}

TEST_F(MosaicTables, AnAbortEndsTheRun) {
  const auto ramp = MakeRamp<std::uint16_t>(300, 200, 1);
  unsigned reads = 0;
  for (unsigned at = 0;; ++at) {  // in each read
    const IPC ipc;
    ramp->abort = ipc.abort;
    ramp->reads = 0;
    ramp->abortAtRead = at;
    const RasterPtr<std::uint16_t> fresh(
        new SpatialSubsetRaster<std::uint16_t>(RasterPtr<std::uint16_t>(ramp), {0, 0, 299, 199}));
    const auto mosaic =
        test::MakeMosaic<std::uint16_t>({fresh}, MakeGrid(0, 0, 1, 300, 200), Settings(1));
    const bool isMade = MatchScenes(*mosaic->Definition(), ipc);
    reads = ramp->reads;
    EXPECT_EQ(isMade, !ipc.abort->IsSet());
    EXPECT_EQ(fs::exists(Base() + ".mlh"), isMade);
    if (isMade) break;
    EXPECT_EQ(TakeFault().ToUTF8(), "the matching was aborted");
    ASSERT_LT(at, 100U);
  }
  EXPECT_GT(reads, 1U);
}

TEST_F(MosaicTables, ProgressGrowsToItsEnd) {
  struct Reports : AsyncCallback {
    void OnProgress(double progress) override { values.push_back(progress); }
    std::vector<double> values;
  };
  const auto scene = [](double x) {
    return test::MakeScene<std::uint8_t>(MakeGrid(x, 0, 1, 50, 50), 2, Hills);
  };
  for (const unsigned mode : {0U, 1U}) {
    const Pointer<Reports> reports(new Reports);
    const IPC ipc(AbortFlagPtr(new StandardAbortFlag),
                  ProgressReportPtr(new StandardProgressReport(reports)));
    const auto mosaic = test::MakeMosaic<std::uint8_t>({scene(0), scene(20), scene(48)},
                                                       MakeGrid(0, 0, 1, 99, 50), Settings(mode));
    ASSERT_TRUE(MatchScenes(*mosaic->Definition(), ipc));
    EXPECT_TRUE(std::is_sorted(reports->values.begin(), reports->values.end()));
    EXPECT_NEAR(reports->values.back(), 1, 1e-9);
  }
}

}  // namespace
}  // namespace lumo
