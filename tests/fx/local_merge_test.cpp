#include "fx/local_merge.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <random>

#include <gtest/gtest.h>

#include "foundation/fault.h"
#include "fx/watershed.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using Labels = std::vector<std::int32_t>;

struct Scene {
  std::uint32_t width, height;
  Labels labels;
  std::vector<float> values;  // two for each pixel
};

constexpr unsigned kBands = 2;

/// The basins of noise of some levels, with holes; of few levels, or one, there are large ones.
Scene MakeBasins(std::uint32_t width, std::uint32_t height, unsigned levels, unsigned seed) {
  std::mt19937 random(seed);
  Scene scene{width, height, Labels(std::size_t{width} * height), {}};
  Labels image(scene.labels.size());
  std::vector<std::uint8_t> excluded;
  for (std::int32_t& level : image) level = static_cast<std::int32_t>(random() % levels);
  for (std::size_t i = 0; i < image.size(); ++i) excluded.push_back(random() % 40 == 0);
  Watershed().Label(image.data(), excluded.data(), width, height, scene.labels.data());
  for (std::size_t i = 0; i < image.size() * kBands; ++i) {
    scene.values.push_back(static_cast<float>(random() % 1000) / 7);
  }
  return scene;
}

/// Merges a whole image in rounds by the definition, and numbers its segments as they come.
Labels MergePlainly(const Scene& scene, const LocalMerge::Rules& rules) {
  struct Edge {
    std::uint32_t length, index;
    double cost;
  };
  std::map<std::int32_t, double> pixels;
  std::map<std::int32_t, std::vector<double>> means;
  std::map<std::pair<std::int32_t, std::int32_t>, Edge> edges;
  for (std::size_t i = 0; i < scene.labels.size(); ++i) {
    std::vector<double>& sums = means.try_emplace(scene.labels[i], kBands).first->second;
    for (unsigned band = 0; band < kBands; ++band) sums[band] += scene.values[i * kBands + band];
    pixels[scene.labels[i]] += 1;
    const auto visit = [&](std::size_t other) {
      const auto [low, high] = std::minmax(scene.labels[i], scene.labels[other]);
      if (low == high || low == 0) return;
      const auto next = static_cast<std::uint32_t>(edges.size());
      ++edges.try_emplace({low, high}, Edge{0, next, 0}).first->second.length;
    };
    if ((i + 1) % scene.width != 0) visit(i + 1);
    if (i + scene.width < scene.labels.size()) visit(i + scene.width);
  }
  for (auto& [label, sums] : means) {
    for (double& sum : sums) sum /= pixels[label];
  }
  std::map<std::int32_t, std::int32_t> parents;
  for (unsigned round = 0; round < rules.rounds; ++round) {
    using Choice = std::tuple<double, std::uint32_t>;
    std::map<std::int32_t, Choice> choices;
    for (auto& [pair, edge] : edges) {
      edge.cost = MergeCost({pixels[pair.first], means[pair.first].data()},
                            {pixels[pair.second], means[pair.second].data()}, kBands, edge.length,
                            rules.limits);
      if (!(edge.cost < rules.threshold)) continue;
      for (const std::int32_t label : {pair.first, pair.second}) {
        const Choice choice{edge.cost, edge.index};
        Choice& best = choices.try_emplace(label, choice).first->second;
        best = std::min(best, choice);
      }
    }
    std::map<std::int32_t, std::int32_t> into;
    for (const auto& [pair, edge] : edges) {
      const auto [low, high] = pair;
      const Choice choice{edge.cost, edge.index};
      if (choices.count(low) == 0 || choices[low] != choice || choices[high] != choice) continue;
      for (unsigned band = 0; band < kBands; ++band) {
        means[low][band] =
            JoinedMean(pixels[low], means[low][band], pixels[high], means[high][band]);
      }
      pixels[low] += pixels[high];
      into[high] = parents[high] = low;
    }
    std::map<std::pair<std::int32_t, std::int32_t>, Edge> joined;
    const auto now = [&](std::int32_t label) {
      return into.count(label) != 0 ? into[label] : label;
    };
    for (const auto& [pair, edge] : edges) {
      const auto ends = std::minmax({now(pair.first), now(pair.second)});
      if (ends.first == ends.second) continue;
      Edge& to = joined.try_emplace(ends, Edge{0, edge.index, 0}).first->second;
      to.length += edge.length;
      to.index = std::min(to.index, edge.index);
    }
    edges = std::move(joined);
  }
  std::map<std::int32_t, std::int32_t> numbers{{0, 0}};
  Labels result;
  for (std::int32_t label : scene.labels) {
    while (parents.count(label) != 0) label = parents[label];
    result.push_back(
        numbers.emplace(label, static_cast<std::int32_t>(numbers.size())).first->second);
  }
  return result;
}

/// Merges an image strip by strip. @param mostBytes  [out] the memory that it took.
Labels MergeByStrips(const Scene& scene, const LocalMerge::Rules& rules, std::uint32_t stripLines,
                     std::uint64_t* mostBytes = nullptr) {
  const auto count =
      static_cast<std::uint32_t>(*std::max_element(scene.labels.begin(), scene.labels.end()));
  LabelForest forest;
  forest.Begin(std::uint64_t{count} + 1);
  LocalMerge merge;
  merge.Begin(kBands, rules, forest);
  StripBasins basins;
  LabelPairs scratch;
  for (std::size_t at = 0; at < scene.labels.size();) {
    const std::size_t pixels =
        std::min(std::size_t{stripLines} * scene.width, scene.labels.size() - at);
    Labels labels(scene.labels.begin() + static_cast<std::ptrdiff_t>(at),
                  scene.labels.begin() + static_cast<std::ptrdiff_t>(at + pixels));
    const bool isLast = at + pixels == scene.labels.size();
    const auto* const below = isLast ? nullptr : scene.labels.data() + at + pixels;
    basins = {};
    basins.Find({labels.data(), pixels, scene.width, below, at > 0}, {0, 0}, scratch);
    const float* const values = scene.values.data() + at * kBands;
    basins.AddUp(labels.data(), pixels, values, kBands);
    EXPECT_TRUE(merge.AddStrip(basins, values, nullptr));
    at += pixels;
  }
  EXPECT_TRUE(merge.Finish(nullptr));
  if (mostBytes != nullptr) *mostBytes = merge.MostBytes();
  Labels result = scene.labels;
  for (std::int32_t& label : result) {
    label = static_cast<std::int32_t>(forest.NumberOf(static_cast<std::uint32_t>(label)));
  }
  EXPECT_TRUE(forest.IsWell());
  return result;
}

TEST(LocalMerge, StripsOfAnyHeightGiveTheRoundsOfTheWhole) {
  const std::vector<Scene> scenes{MakeBasins(40, 70, 200, 1), MakeBasins(55, 60, 4, 2),
                                  MakeBasins(9, 200, 50, 3),  MakeBasins(1, 150, 9, 4),
                                  MakeBasins(150, 1, 9, 5),   MakeBasins(30, 30, 1, 6),
                                  MakeBasins(60, 40, 2, 7)};
  for (const Scene& scene : scenes) {
    for (const double threshold : {30.0, 2000.0, 1e12}) {
      for (const unsigned rounds : {1U, 3U, 12U, 500U}) {
        LocalMerge::Rules rules;
        rules.threshold = threshold;
        rules.rounds = rounds;
        if (rounds == 3) rules.limits = {30, 0.5};
        const Labels wanted = MergePlainly(scene, rules);
        unsigned threads = 1;
        for (const std::uint32_t stripLines : {1U, 2U, 7U, 500U}) {
          for (const std::size_t batch : {std::size_t{1}, std::size_t{60}, LocalMerge::kBatch}) {
            const ThreadLimit limit(threads);
            threads = threads % 4 + 1;
            rules.batch = batch;
            ASSERT_EQ(MergeByStrips(scene, rules, stripLines), wanted)
                << scene.width << " by " << scene.height << ", merging to " << threshold << " in "
                << rounds << " rounds, strips of " << stripLines << ", batches of " << batch;
          }
        }
      }
    }
  }
}

TEST(LocalMerge, TakesNoMoreMemoryForALongerImage) {
  std::uint64_t bytes[2] = {};
  for (const bool isLong : {false, true}) {
    const Scene scene = MakeBasins(50, isLong ? 8000 : 1000, 200, 11);
    LocalMerge::Rules rules;
    rules.threshold = 1e12;
    rules.batch = 500;
    MergeByStrips(scene, rules, 16, &bytes[isLong ? 1 : 0]);
  }
  EXPECT_LT(bytes[1], bytes[0] * 3 / 2);
}

TEST(LabelForest, NumbersWhatLabelsHaveBecomeThroughAFile) {
  constexpr std::uint32_t kLabels = 200'000;
  std::mt19937 random(5);
  std::vector<std::uint32_t> parents(kLabels, 0);
  LabelForest forest;
  forest.Begin(kLabels, 0);  // the fewest pages in memory
  for (std::uint32_t label = kLabels - 1; label > 1; --label) {
    if (random() % 3 == 0) continue;
    const std::uint32_t reach = random() % 50 == 0 ? label - 1 : std::min(label - 1, 3000U);
    parents[label] = label - 1 - random() % reach;
    forest.Join(label, parents[label]);
  }
  std::map<std::uint32_t, std::uint32_t> numbers;
  for (std::uint32_t step = 0; step < 30'000; ++step) {
    const std::uint32_t label = 1 + (step % 2 == 0 ? step : random() % (kLabels - 1));
    std::uint32_t root = label;
    while (parents[root] != 0) root = parents[root];
    if (step < 1000) {  // none has a number yet
      ASSERT_EQ(forest.RootOf(label), root);
      continue;
    }
    const auto next = static_cast<std::uint32_t>(numbers.size()) + 1;
    ASSERT_EQ(forest.NumberOf(label), numbers.emplace(root, next).first->second);
  }
  EXPECT_TRUE(forest.IsWell());
  EXPECT_EQ(forest.NumberOf(0), 0U);
}

TEST(LabelForest, SaysThatItsFileCantBeMade) {
  const char* const before = std::getenv("TMPDIR");
  const std::string kept = before == nullptr ? "" : before;
  setenv("TMPDIR", "/nowhere/at/all", 1);
  LabelForest forest;
  forest.Begin(1'000'000, 0);
  for (std::uint32_t label = 999'999; label > 1; --label) forest.Join(label, label - 1);
  EXPECT_FALSE(forest.IsWell());
  EXPECT_NE(TakeFault().ToUTF8().find("working file: "), std::string::npos);
  EXPECT_GT(forest.RootOf(999'999), 0U);  // it ends
  before == nullptr ? unsetenv("TMPDIR") : setenv("TMPDIR", kept.c_str(), 1);
}

}  // namespace
}  // namespace lumo
