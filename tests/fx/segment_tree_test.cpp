#include "fx/segment_tree.h"

#include <cmath>
#include <cstring>
#include <fstream>
#include <map>
#include <random>
#include <set>

#include "foundation/fault.h"
#include "fx/seamless_segmentation.h"
#include "fx/tree_cut.h"
#include "fx/tree_labels_raster.h"
#include "fx/tree_scales.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/noise_scene.h"
#include "support/temporary_directory.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using Labels = std::vector<std::int32_t>;

struct Run {
  double mergeValue = 0;
  std::string tree;
  unsigned stripLines = 16;
  GrowthLimits growth = {};
  std::optional<double> mergePercent = {};
  MergeOrder order = MergeOrder::kTold;
};

constexpr MergeOrder kOrders[] = {MergeOrder::kTold, MergeOrder::kLocal};

/// The labels of a run; none where it failed.
template <typename T>
Labels Segment(const MemoryPtr<T>& scene, const Run& run, const IPC& ipc = {}) {
  SegmentRequest request;
  request.stretch = {0, 800, 0, 800};
  request.limits = ClipLimits::Of(0, 800, 40, 800);
  request.mergeValue = run.mergeValue;
  request.mergePercent = run.mergePercent;
  request.tree = run.tree;
  request.growth = run.growth;
  request.order = run.order;
  request.tileBytes =
      static_cast<unsigned>(run.stripLines * scene->Samples() * scene->Bands() * sizeof(T));
  const MemoryPtr<std::int32_t> labels(
      new MemoryTestRaster<std::int32_t>(scene->Samples(), scene->Lines(), 1));
  return SeamlessSegmentation<T>(scene, scene, labels, request, ipc).Run() ? labels->pixels
                                                                           : Labels();
}

/// The labels of a cut, as its raster shows them in blocks of a few lines.
Labels Cut(const SegmentTreePtr& tree, double mergeValue) {
  TreeCut cut;
  if (!CutTree(*tree, mergeValue, cut)) return {};
  TreeLabelsRaster raster(tree, std::move(cut));
  Labels labels;
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = 0;
  Array<std::int32_t> pixels;
  Array<unsigned char> states;
  for (unsigned top = 0; top < raster.Lines(); top += 50) {
    const unsigned bottom = std::min(top + 50, raster.Lines()) - 1;
    if (!raster.GetSubRect({0, top, raster.Samples() - 1, bottom}, bands, Interleave::BIP, pixels,
                           states)) {
      return {};
    }
    labels.insert(labels.end(), pixels.begin(), pixels.end());
    for (std::size_t i = 0; i < states.GetCount(); ++i) {
      EXPECT_EQ(states[static_cast<unsigned>(i)] == 0, pixels[static_cast<unsigned>(i)] != 0);
    }
  }
  return labels;
}

std::vector<double> CostsOf(const SegmentTree& tree) {
  std::vector<double> costs;
  EXPECT_TRUE(tree.ForEachMerge([&](const TreeMerge& merge) {
    costs.push_back(merge.cost);
    return true;
  }));
  return costs;
}

/// A cut at any cost has the labels of a run with that cost, and so has the run that made the tree.
template <typename T>
void CheckCuts(const MemoryPtr<T>& scene, const GrowthLimits& growth, std::size_t count = 16) {
  const test::TemporaryDirectory folder;
  const std::string file = folder.Path() / "a.tree";
  EXPECT_EQ(Segment(scene, {500, file, 16, growth}), Segment(scene, {500, "", 16, growth}));
  const SegmentTreePtr tree = SegmentTree::Open(file);
  ASSERT_TRUE(tree) << TakeFault().ToUTF8();
  std::vector<double> values{-1, 0, 1e-9, 1e300};
  if (count < values.size()) values.clear();
  std::vector<double> costs = CostsOf(*tree);
  std::sort(costs.begin(), costs.end());
  for (std::size_t i = 1; i <= count && !costs.empty(); ++i) {  // of merges themselves, and between
    const double cost = costs[(costs.size() - 1) * i / count];
    values.push_back(i % 2 == 0 ? cost : cost * 1.000001);
  }
  for (const double value : values) {
    ASSERT_EQ(Cut(tree, value), Segment(scene, {value, "", 5, growth})) << value;
  }
}

TEST(SegmentTree, CutsAreTheLabelsOfFreshRuns) {
  CheckCuts(MakeScene<std::uint8_t>(61, 75, 2, 1), {});
  CheckCuts(MakeScene<std::int16_t>(90, 44, 1, 2), {});
  CheckCuts(MakeScene<float>(50, 66, 3, 3), {40, 0.5});
  CheckCuts(MakeScene<double>(4, 130, 2, 4), {});
  CheckCuts(MakeScene<std::uint8_t>(30, 2, 1, 5), {});          // has no gradients
  CheckCuts(MakeScene<std::uint16_t>(1500, 400, 1, 6), {}, 2);  // several strips and blocks
}

TEST(SegmentTree, IsTheSameForAnyStripsAndThreads) {
  const test::TemporaryDirectory folder;
  const auto scene = MakeScene<float>(120, 95, 2, 7);
  for (const MergeOrder order : kOrders) {
    std::string first;
    for (const unsigned stripLines : {1U, 7U, 64U, 95U}) {
      for (const unsigned threads : {1U, 4U}) {
        const ThreadLimit limit(threads);
        const std::string file = folder.Path() / "a.tree";
        ASSERT_FALSE(Segment(scene, {0, file, stripLines, {}, {}, order}).empty());
        const std::string bytes = test::FileBytes(file);
        if (first.empty()) first = bytes;
        EXPECT_EQ(bytes, first) << stripLines << " lines, " << threads << " threads";
      }
    }
  }
}

TEST(SegmentTree, KnowsItsBasinsLevelsAndPercentages) {
  const test::TemporaryDirectory folder;
  const std::string file = folder.Path() / "a.tree";
  const auto scene = MakeScene<std::int16_t>(100, 80, 2, 8);
  const Labels half = Segment(scene, {0, file, 16, {}, 50});
  const SegmentTreePtr tree = SegmentTree::Open(file);
  ASSERT_TRUE(tree);
  ASSERT_FALSE(Segment(scene, {0, file + ".local", 9, {}, {}, MergeOrder::kLocal}).empty());
  const SegmentTreePtr local = SegmentTree::Open(file + ".local");
  ASSERT_TRUE(local && local->Scene().isNested && !tree->Scene().isNested);
  const Labels basinOf = Cut(tree, 0);

  // Pixels and squares, added up pixel by pixel about the means.
  TreeBasins basins;
  ASSERT_TRUE(tree->ReadBasins(basins));
  std::vector<double> sums(2 * basins.pixels.size()), squares(basins.pixels.size());
  std::vector<std::uint32_t> pixels(basins.pixels.size());
  for (const bool isSecond : {false, true}) {
    for (std::size_t i = 0; i < basinOf.size(); ++i) {
      if (basinOf[i] == 0) continue;
      const auto basin = static_cast<std::size_t>(basinOf[i] - 1);
      if (!isSecond) ++pixels[basin];
      for (unsigned band = 0; band < 2; ++band) {
        const double value = scene->pixels[2 * i + band];
        double& sum = sums[2 * basin + band];
        if (isSecond) {
          squares[basin] += std::pow(value - sum / pixels[basin], 2);
        } else {
          sum += value;
        }
      }
    }
  }
  for (const SegmentTreePtr& each : {tree, local}) {
    ASSERT_TRUE(each->ReadBasins(basins));
    EXPECT_EQ(basins.pixels, pixels);
    for (std::size_t i = 0; i < squares.size(); ++i) {
      ASSERT_NEAR(basins.squares[i], squares[i], 1e-6);
    }
  }

  double value = 0;
  ASSERT_TRUE(FindMergeValue(*tree, 50, value));
  const std::vector<double> costs = CostsOf(*tree);
  const auto below =
      std::count_if(costs.begin(), costs.end(), [&](double c) { return c <= value; });
  EXPECT_EQ(below, static_cast<std::ptrdiff_t>((costs.size() + 1) / 2));
  EXPECT_EQ(half, Cut(tree, value));

  std::vector<TreeCut> cuts;
  ASSERT_TRUE(CutTree(*tree, std::vector<double>{0, 10, 200, 5000}, cuts));
  for (std::size_t level = 0; level + 1 < cuts.size(); ++level) {
    const double next[] = {10, 200, 5000};
    const Labels upper = Cut(tree, next[level]);
    const std::vector<std::uint32_t> parents = ParentsOf(cuts[level], cuts[level + 1]);
    std::vector<std::uint64_t> counts(cuts[level].count);
    for (std::size_t i = 0; i < basinOf.size(); ++i) {
      const std::uint32_t number = cuts[level].numbers[static_cast<std::size_t>(basinOf[i])];
      if (number == 0) continue;
      ++counts[number - 1];
      ASSERT_EQ(static_cast<std::int32_t>(parents[number - 1]), upper[i]);
    }
    EXPECT_EQ(PixelsOf(cuts[level], basins), counts);
  }
}

/// The mean over all labels of the standard deviation of their pixels from the means of their
/// bands.
double LocalVariance(const MemoryPtr<std::int16_t>& scene, const Labels& labels) {
  struct Sums {
    double pixels = 0, sums[2] = {}, squares[2] = {};
  };
  std::map<std::int32_t, Sums> all;
  for (std::size_t i = 0; i < labels.size(); ++i) {
    if (labels[i] == 0) continue;
    Sums& sums = all[labels[i]];
    ++sums.pixels;
    for (unsigned band = 0; band < 2; ++band) {
      const double value = scene->pixels[2 * i + band];
      sums.sums[band] += value;
      sums.squares[band] += value * value;
    }
  }
  double total = 0;
  for (const auto& [label, s] : all) {
    const double variance = (s.squares[0] + s.squares[1]) / s.pixels -
                            (s.sums[0] * s.sums[0] + s.sums[1] * s.sums[1]) / s.pixels / s.pixels;
    total += std::sqrt(std::max(variance, 0.0) / 2);
  }
  return total / static_cast<double>(all.size());
}

TEST(SegmentTree, SuggestsCostsAtPeaksOfTheChangeOfLocalVariance) {
  const test::TemporaryDirectory folder;
  const std::string file = folder.Path() / "a.tree";
  const auto scene = MakeScene<std::int16_t>(100, 80, 2, 13);
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {  // squares of 20 x 20 pixels
    const std::size_t x = i / 2 % 100 / 20, y = i / 200 / 20;
    scene->pixels[i] = static_cast<std::int16_t>(scene->pixels[i] + (x * 7 + y * 11) % 5 * 300);
  }
  for (const double compactness : {0.0, 0.5}) {
    Segment(scene, {0, file, 16, {1e9, compactness}});
    const SegmentTreePtr tree = SegmentTree::Open(file);
    std::vector<ScaleLevel> levels;
    ASSERT_TRUE(tree && FindScales(*tree, levels));
    ASSERT_GT(levels.size(), 20U);
    std::vector<double> rates;
    for (const ScaleLevel& level : levels) {
      const Labels labels = Cut(tree, level.mergeValue);
      const double variance = LocalVariance(scene, labels);
      ASSERT_NEAR(level.localVariance, variance, 1e-7 * variance) << level.mergeValue;
      ASSERT_EQ(level.segments, std::set<std::int32_t>(labels.begin(), labels.end()).size() - 1);
      const double before = rates.empty() ? variance : (&level - 1)->localVariance;
      rates.push_back((variance - before) / before * 100);
      ASSERT_NEAR(level.rate, rates.back(), 1e-4);
    }
    for (std::size_t i = 0; i < levels.size(); ++i) {
      // A peak's prominence is the smaller of the drops on its sides.
      double drops[2] = {}, lowest = levels[i].rate;
      for (const int step : {-1, 1}) {
        for (int at = static_cast<int>(i);
             at >= 0 && at < static_cast<int>(rates.size()) &&
             levels[static_cast<std::size_t>(at)].rate <= levels[i].rate;
             at += step) {
          const double rate = levels[static_cast<std::size_t>(at)].rate;
          drops[step > 0] = std::max(drops[step > 0], levels[i].rate - rate);
          if (step < 0) lowest = std::min(lowest, rate);
        }
      }
      if (levels[i].prominence == 0) continue;
      EXPECT_DOUBLE_EQ(levels[i].prominence, std::min(drops[0], drops[1]));
      const auto onset = std::find_if(levels.begin(), levels.end(), [&](const ScaleLevel& level) {
        return level.mergeValue == levels[i].onset;
      });
      EXPECT_EQ(onset->rate, lowest);
    }
    const std::vector<ScaleLevel> peaks = PeaksOf(levels, 0.1);
    ASSERT_FALSE(peaks.empty());
    for (const ScaleLevel& peak : peaks) EXPECT_GE(peak.prominence, 0.1 * peaks[0].prominence);
  }
}

/// Reads all of a file. @return whether it could be read; the fault tells where not.
bool ReadAll(const std::string& file) {
  const SegmentTreePtr tree = SegmentTree::Open(file);
  if (!tree) return false;
  std::vector<std::uint32_t> strip;
  for (unsigned i = 0; i < tree->Strips(); ++i) {
    if (!tree->ReadStrip(i, strip)) return false;
  }
  TreeBasins basins;
  std::vector<TreeCut> cuts;
  double value = 0;
  std::vector<ScaleLevel> levels;
  return tree->ReadBasins(basins) && FindScales(*tree, levels) &&
         FindMergeValue(*tree, 40, value) &&
         CutTree(*tree, std::vector<double>{0, value, 1e300}, cuts);
}

void Write(const std::string& file, const std::string& bytes) {
  std::ofstream(file, std::ios::binary) << bytes;
}

/// Makes the checksums of all that the header and the indices name, then that of the header.
void Seal(std::string& bytes) {
  constexpr std::size_t kExtents = 88, kSum = 184;
  const auto number = [&](std::size_t at) {
    std::uint64_t value = 0;
    std::memcpy(&value, &bytes[at], sizeof value);
    return value;
  };
  const auto seal = [&](std::size_t at) {
    const std::uint64_t offset = number(at), count = number(at + 8);
    if (offset > bytes.size() || count > bytes.size() - offset) return;
    const std::uint64_t sum = Checksum(&bytes[offset], count);
    std::memcpy(&bytes[at + 16], &sum, sizeof sum);
  };
  for (std::size_t extent = kExtents; extent < kSum; extent += 24) {
    const std::uint64_t offset = number(extent), count = number(extent + 8);
    const bool isIndex =
        extent != kExtents && offset < bytes.size() && count <= bytes.size() - offset;
    for (std::size_t at = offset; isIndex && at + 24 <= offset + count; at += 24) seal(at);
    seal(extent);
  }
  const std::uint64_t sum = Checksum(bytes.data(), kSum);
  std::memcpy(&bytes[kSum], &sum, sizeof sum);
}

TEST(SegmentTree, RefusesDamagedFilesWithOneLine) {
  const test::TemporaryDirectory folder;
  const std::string file = folder.Path() / "a.tree", damaged = folder.Path() / "b.tree";
  Segment(MakeScene<std::uint8_t>(40, 30, 1, 9), {5, file});
  const std::string whole = test::FileBytes(file);
  std::string sealed = whole;
  Seal(sealed);
  ASSERT_EQ(sealed, whole);
  const auto check = [&](const std::string& bytes, bool mustFail, const std::string& what) {
    Write(damaged, bytes);
    TakeFault();
    const bool isRead = ReadAll(damaged);
    const std::string fault = TakeFault().ToUTF8();
    EXPECT_TRUE(!isRead || !mustFail) << what;
    if (!isRead) {
      EXPECT_THAT(fault, testing::StartsWith(damaged + ": ")) << what;
      EXPECT_EQ(fault.find('\n'), std::string::npos) << fault;
    }
  };
  for (std::size_t size = 0; size < whole.size(); size += 1 + size / 20) {
    check(whole.substr(0, size), true, "cut to " + std::to_string(size));
  }
  for (std::size_t at = 0; at < whole.size(); at += at < 192 ? 1 : 11) {
    std::string bytes = whole;
    bytes[at] = static_cast<char>(bytes[at] ^ (1 << at % 8));
    check(bytes, true, "a bit of byte " + std::to_string(at));
  }
  // Every field of the header and of the indices with values that harm, and right checksums.
  std::mt19937 random(10);
  const std::uint64_t harmful[] = {0,
                                   1,
                                   2,
                                   191,
                                   192,
                                   0x7FFFFFFF,
                                   0xFFFFFFFF,
                                   ~std::uint64_t{0},
                                   whole.size() - 1,
                                   whole.size(),
                                   std::uint64_t{1} << 40};
  const std::size_t indices = whole.size() - 4 * 24;
  for (std::size_t at = 16; at < whole.size(); at += at < 192 ? 4 : 2) {
    if (at >= 192 && at < indices && random() % 16 != 0) continue;
    for (const std::uint64_t value : harmful) {
      for (const std::size_t size : {std::size_t{4}, std::size_t{8}}) {
        if (at >= 192 && random() % 16 != 0) continue;
        std::string bytes = whole;
        std::memcpy(&bytes[at], &value, std::min(size, bytes.size() - at));
        Seal(bytes);
        check(bytes, false, std::to_string(value) + " at " + std::to_string(at));
      }
    }
  }
}

/// Raises an abort flag at a fraction of the work.
class AbortAt final : public StandardProgressReport {
 public:
  AbortAt(const AbortFlagPtr& flag, double fraction) : flag_(flag), fraction_(fraction) {}
  void Update(double progress) override {
    StandardProgressReport::Update(progress);
    if (progress >= fraction_) flag_->Set(true);
  }

 private:
  AbortFlagPtr flag_;
  double fraction_;
};

TEST(SegmentTree, LeavesNothingBehindAfterAnAbort) {
  const test::TemporaryDirectory folder;
  const auto scene = MakeScene<std::uint8_t>(200, 150, 1, 12);
  for (const MergeOrder order : kOrders) {
    const double end = order == MergeOrder::kLocal ? 0.7 : 0.9;  // it has three passes
    for (double fraction = 0; fraction < end; fraction += 0.07) {
      const AbortFlagPtr flag(new StandardAbortFlag);
      Segment(scene, {5, folder.Path() / "a.tree", 10, {}, {}, order},
              IPC(flag, ProgressReportPtr(new AbortAt(flag, fraction))));
      EXPECT_TRUE(flag->IsSet());
      EXPECT_TRUE(std::filesystem::is_empty(folder.Path())) << fraction;
    }
  }
}

TEST(SegmentTree, LeavesNothingBehindWhereItCanNotBeWritten) {
  const test::TemporaryDirectory folder;
  const std::string file = folder.Path() / "a.tree";
  const auto scene = MakeScene<std::uint8_t>(100, 90, 1, 11);
  const auto files = [&] {
    return std::distance(std::filesystem::directory_iterator(folder.Path()), {});
  };
  for (const MergeOrder order : kOrders) {
    ASSERT_FALSE(Segment(scene, {5, file, 16, {}, {}, order}).empty());
    const std::string older = test::FileBytes(file);
    // The working file, with cells and the lines at which strips meet, has 9000 and 10,200 bytes.
    ASSERT_GT(older.size(), 30000U);
    for (std::size_t size = 19200; size < older.size(); size += older.size() / 9) {
      const test::FileSizeLimit full(size);
      EXPECT_TRUE(Segment(scene, {900, file, 16, {}, {}, order}).empty());
      EXPECT_THAT(TakeFault().ToUTF8(), testing::StartsWith(file + ": "));
      EXPECT_EQ(files(), 1);
      EXPECT_TRUE(test::FileBytes(file) == older) << size;
    }
  }
  Write(file, "something else");
  EXPECT_TRUE(Segment(scene, {5, file}).empty());
  EXPECT_EQ(TakeFault().ToUTF8(), file + ": is there, and no tree of segments: it stays");
  EXPECT_EQ(test::FileBytes(file), "something else");
}

}  // namespace
}  // namespace lumo
