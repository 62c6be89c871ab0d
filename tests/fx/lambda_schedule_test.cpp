#include "fx/lambda_schedule.h"

#include <map>
#include <random>
#include <set>
#include <tuple>

#include <gtest/gtest.h>

namespace lumo {
namespace {

using MergeList = std::vector<std::tuple<double, std::uint32_t, std::uint32_t>>;

struct Scene {
  std::uint32_t width;
  std::uint32_t height;
  std::uint32_t bands;
  std::uint32_t labelCount;
  std::vector<std::int32_t> labels;
  std::vector<double> values;  // band after band

  double Value(std::size_t pixel, std::uint32_t band) const {
    return values[band * labels.size() + pixel];
  }
};

/// A scene of random labels, some pixels of none, and few values, so that many costs are equal.
Scene MakeScene(std::mt19937& random, unsigned mostSide, unsigned values) {
  const std::uint32_t width = 1 + static_cast<std::uint32_t>(random() % mostSide);
  const std::uint32_t height = 1 + static_cast<std::uint32_t>(random() % mostSide);
  Scene scene{width,
              height,
              1 + static_cast<std::uint32_t>(random() % 3),
              2 + static_cast<std::uint32_t>(random() % (5 + width * height / 4)),
              {},
              {}};
  scene.labels.resize(std::size_t{scene.width} * scene.height);
  for (std::int32_t& label : scene.labels) {
    label = static_cast<std::int32_t>(random() % scene.labelCount);
  }
  scene.values.resize(scene.labels.size() * scene.bands);
  for (double& value : scene.values) value = static_cast<double>(random() % values);
  return scene;
}

/// The schedule in its plain form: ordered maps, a queue ordered by cost and number.
class PlainSchedule {
 public:
  explicit PlainSchedule(const Scene& scene) : regions_(scene.labelCount) {
    for (std::size_t pixel = 0; pixel < scene.labels.size(); ++pixel) {
      Region& region = regions_[static_cast<std::size_t>(scene.labels[pixel])];
      region.mean.resize(scene.bands);
      region.area += 1;
      for (std::uint32_t b = 0; b < scene.bands; ++b) region.mean[b] += scene.Value(pixel, b);
    }
    for (Region& region : regions_) {
      for (double& mean : region.mean) mean /= region.area;
    }
    for (std::uint32_t y = 0; y < scene.height; ++y) {
      for (std::uint32_t x = 0; x < scene.width; ++x) {
        const std::size_t at = std::size_t{y} * scene.width + x;
        if (x + 1 < scene.width) AddEdge(scene.labels[at], scene.labels[at + 1]);
        if (y + 1 < scene.height) AddEdge(scene.labels[at], scene.labels[at + scene.width]);
      }
    }
    for (Pair& pair : pairs_) pair.cost = Cost(pair);
    for (unsigned label = 1; label < regions_.size(); ++label) Search(label);
  }

  MergeList Run() {
    MergeList merges;
    while (!queue_.empty()) merges.push_back(Step());
    return merges;
  }

 private:
  struct Region {
    double area = 0;
    std::vector<double> mean;
    int minimum = -1;
    std::map<unsigned, int> neighbours;
  };
  struct Pair {
    unsigned low, high;
    double length = 0, cost = 0;
    bool chosen = false, queued = false;
  };

  void AddEdge(int a, int b) {
    if (a == b || a == 0 || b == 0) return;
    const auto low = static_cast<unsigned>(std::min(a, b)),
               high = static_cast<unsigned>(std::max(a, b));
    const auto [at, isNew] =
        regions_[low].neighbours.emplace(high, static_cast<int>(pairs_.size()));
    if (isNew) {
      pairs_.push_back({low, high});
      regions_[high].neighbours[low] = at->second;
    }
    pairs_[static_cast<std::size_t>(at->second)].length += 1;
  }
  Pair& At(int pair) { return pairs_[static_cast<std::size_t>(pair)]; }
  double Cost(const Pair& pair) const {
    const Region &u = regions_[pair.low], &v = regions_[pair.high];
    double sum = 0;
    for (std::size_t b = 0; b < u.mean.size(); ++b) {
      sum += (u.mean[b] - v.mean[b]) * (u.mean[b] - v.mean[b]);
    }
    return u.area * v.area / (u.area + v.area) * sum / pair.length;
  }
  void Search(unsigned label) {
    Region& region = regions_[label];
    region.minimum = -1;
    double best = 2147483647.0;
    for (const auto& [other, pair] : region.neighbours) {
      if (At(pair).cost < best) {
        best = At(pair).cost;
        region.minimum = pair;
      }
    }
    if (region.minimum >= 0) Choose(region.minimum);
  }
  void Choose(int pair) {
    if (!At(pair).chosen) {
      At(pair).chosen = true;
      return;
    }
    At(pair).queued = true;
    queue_.insert({At(pair).cost, pair});
  }
  std::tuple<double, unsigned, unsigned> Step() {
    const auto [cost, merged] = *queue_.begin();
    queue_.erase(queue_.begin());
    const unsigned low = At(merged).low, high = At(merged).high;
    Region &a = regions_[low], &b = regions_[high];
    for (std::size_t k = 0; k < a.mean.size(); ++k) {
      a.mean[k] = b.area / (a.area + b.area) * b.mean[k] + a.area / (a.area + b.area) * a.mean[k];
    }
    a.area += b.area;
    a.neighbours.erase(high);
    b.neighbours.erase(low);
    for (const auto& [other, pair] : b.neighbours) {
      regions_[other].neighbours.erase(high);
      if (a.neighbours.contains(other)) {
        At(a.neighbours[other]).length += At(pair).length;
      } else {
        a.neighbours[other] = regions_[other].neighbours[low] = pair;
        At(pair).low = std::min(low, other);
        At(pair).high = std::max(low, other);
      }
    }
    for (const auto& [other, pair] : a.neighbours) At(pair).cost = Cost(At(pair));
    for (const auto& [other, pair] : a.neighbours) Update(other, pair, low, high);
    Search(low);
    return {cost, low, high};
  }
  void Update(unsigned label, int pair, unsigned low, unsigned high) {
    const int old = regions_[label].minimum;
    if (old < 0) return Search(label);
    Pair& nearest = At(old);
    const unsigned far = nearest.low == label ? nearest.high : nearest.low;
    if (far == low || far == high) {
      nearest.chosen = false;
      return Search(label);
    }
    const Pair& changed = At(pair);
    if (std::pair(nearest.cost, old) <= std::pair(changed.cost, pair)) return;
    if (nearest.queued) {
      nearest.queued = false;
      queue_.erase({nearest.cost, old});
    } else {
      nearest.chosen = false;
    }
    regions_[label].minimum = pair;
    Choose(pair);
  }

  std::vector<Region> regions_;
  std::vector<Pair> pairs_;
  std::set<std::pair<double, int>> queue_;
};

/// Labels are part of what merges have made of them.
void CheckRoots(LambdaSchedule& schedule, const Scene& scene, const MergeList& merges) {
  std::vector<std::uint32_t> roots(scene.labelCount);
  for (std::uint32_t label = 0; label < roots.size(); ++label) roots[label] = label;
  for (auto merge = merges.rbegin(); merge != merges.rend(); ++merge) {  // the last holds for all
    roots[std::get<2>(*merge)] = roots[std::get<1>(*merge)];
  }
  for (const std::int32_t label : std::set(scene.labels.begin(), scene.labels.end())) {
    if (label == 0) continue;
    const auto asked = static_cast<std::uint32_t>(label);
    ASSERT_EQ(schedule.RootOf(asked), roots[asked]) << "label " << label;
  }
}

MergeList RunFast(LambdaSchedule& schedule, LabelPairs& pairs, const Scene& scene,
                  std::uint32_t hubNeighbours = MergeHubs::kNeighbours) {
  schedule.Begin(scene.labelCount, scene.bands);
  schedule.MakeHubsAbove(hubNeighbours);
  pairs.Begin(scene.labelCount);
  for (std::size_t pixel = 0; pixel < scene.labels.size(); ++pixel) {
    if (scene.labels[pixel] == 0) continue;
    schedule.AddPixel(static_cast<std::uint32_t>(scene.labels[pixel]), scene.values.data() + pixel,
                      scene.labels.size());
  }
  ForEachEdge({scene.width, scene.height, scene.width, scene.height}, scene.labels.data(), nullptr,
              [&](std::uint32_t a, std::uint32_t b) {
                if (a != 0 && b != 0) pairs.AddEdge(a, b);
              });
  schedule.Build(pairs.Pairs());
  MergeList merges;
  for (LambdaSchedule::Merge merge; schedule.Step(merge);) {
    merges.emplace_back(merge.lambda, merge.lower, merge.higher);
  }
  CheckRoots(schedule, scene, merges);
  return merges;
}

TEST(LambdaSchedule, MergesAsThePlainFormDoesTiesIncluded) {
  std::mt19937 random(5);
  LambdaSchedule schedule;  // keeps its arrays from scene to scene
  LabelPairs pairs;
  std::size_t merged = 0;
  for (int round = 0; round < 3000; ++round) {
    const Scene scene = MakeScene(random, 9, 4);
    const MergeList merges = RunFast(schedule, pairs, scene);
    ASSERT_EQ(merges, PlainSchedule(scene).Run()) << "round " << round;
    merged += merges.size();
  }
  EXPECT_GT(merged, 10'000U);
}

TEST(LambdaSchedule, MergesHubsAsThePlainFormDoesTiesIncluded) {
  std::mt19937 random(6);
  LambdaSchedule schedule;
  LabelPairs pairs;
  for (int round = 0; round < 300; ++round) {
    // Of few values many costs are equal; of many, and large scenes, hubs move by little.
    const Scene scene = MakeScene(random, round % 10 == 0 ? 60 : 15, round % 2 == 0 ? 4 : 999);
    const MergeList wanted = PlainSchedule(scene).Run();
    for (const std::uint32_t neighbours : {0U, 1U, 3U, 8U}) {
      ASSERT_EQ(RunFast(schedule, pairs, scene, neighbours), wanted)
          << "round " << round << ", hubs above " << neighbours;
    }
  }
}

/// With limits of growth, and joins of small segments at the end, hubs change nothing either.
TEST(LambdaSchedule, JoinsTheSameSmallSegmentsWithHubs) {
  std::mt19937 random(7);
  for (int round = 0; round < 200; ++round) {
    const Scene scene = MakeScene(random, 25, 300);
    LabelPairs pairs;
    pairs.Begin(scene.labelCount);
    ForEachEdge({scene.width, scene.height, scene.width, scene.height}, scene.labels.data(),
                nullptr, [&](std::uint32_t a, std::uint32_t b) {
                  if (a != 0 && b != 0) pairs.AddEdge(a, b);
                });
    const auto run = [&](std::uint32_t neighbours) {
      LambdaSchedule schedule;
      schedule.Begin(scene.labelCount, scene.bands);
      schedule.MakeHubsAbove(neighbours);
      schedule.Limit({30.0 + round, round % 3 * 0.5});
      for (std::size_t pixel = 0; pixel < scene.labels.size(); ++pixel) {
        if (scene.labels[pixel] == 0) continue;
        schedule.AddPixel(static_cast<std::uint32_t>(scene.labels[pixel]),
                          scene.values.data() + pixel, scene.labels.size());
      }
      schedule.Build(pairs.Pairs());
      MergeList merges;
      const auto add = [&](const LambdaSchedule::Merge& merge) {
        merges.emplace_back(merge.lambda, merge.lower, merge.higher);
      };
      LambdaSchedule::Merge merge;
      while (merges.size() < scene.labelCount / 2 && schedule.Step(merge)) add(merge);
      schedule.JoinSmall(20, add);
      return merges;
    };
    const MergeList wanted = run(0xFFFFFFFF);
    for (const std::uint32_t neighbours : {0U, 2U, 7U}) ASSERT_EQ(run(neighbours), wanted) << round;
  }
}

TEST(LabelPairs, NumbersPairsByTheirFirstEdgeHoweverManyThereAre) {
  LabelPairs pairs;
  pairs.Begin(2);  // far too few: the table has to grow
  for (std::uint32_t low = 1; low < 200; ++low) {
    for (std::uint32_t high = 200; high > low; --high) {
      pairs.AddEdge(low, high);
      pairs.AddEdge(high, low);
    }
  }
  ASSERT_EQ(pairs.Pairs().size(), 199U * 200 / 2);
  std::size_t at = 0;
  for (std::uint32_t low = 1; low < 200; ++low) {
    for (std::uint32_t high = 200; high > low; --high, ++at) {
      EXPECT_EQ(pairs.Pairs()[at].low, low);
      EXPECT_EQ(pairs.Pairs()[at].high, high);
      EXPECT_EQ(pairs.Pairs()[at].length, 2U);
    }
  }
}

}  // namespace
}  // namespace lumo
