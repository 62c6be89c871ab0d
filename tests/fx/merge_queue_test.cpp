#include "fx/merge_queue.h"

#include <cmath>
#include <random>
#include <set>

#include <gtest/gtest.h>

namespace lumo {
namespace {

/// Pairs are queued, change what they cost, leave and come back. The first of them comes out as
/// from an ordered set: also where costs are equal, or differ by less than a float can tell.
TEST(MergeQueue, GivesTheCheapestPairTiesByNumber) {
  for (unsigned seed = 0; seed < 60; ++seed) {
    std::mt19937 random(seed);
    const unsigned count = 1 + seed * 37 % 900;
    const auto costOf = [&]() -> double {
      switch ((seed + random() % 2) % 5) {
        case 0:
          return static_cast<double>(random() % 3);
        case 1:
          return static_cast<double>(random() % 4) / 3;
        case 2:
          return 1 + static_cast<double>(random() % 9) * 0x1p-52;
        case 3:
          return std::ldexp(1.0 / 3, -static_cast<int>(random() % 1070));
        default:
          return static_cast<double>(random()) / 7;
      }
    };
    MergeQueue queue;
    queue.Reserve(count);
    std::vector<double> costs(count, -1);
    std::set<std::pair<double, unsigned>> wanted;
    const auto now = [&](std::uint32_t pair) { return costs[pair]; };
    const auto change = [&](unsigned pair) {
      if (costs[pair] >= 0) wanted.erase({costs[pair], pair});
      costs[pair] = -1;
      if (random() % 3 == 0) return;
      costs[pair] = costOf();
      wanted.emplace(costs[pair], pair);
      queue.Push({costs[pair], pair});
    };
    for (unsigned pair = 0; pair < count; ++pair) change(pair);
    MergeQueue::Entry first{};
    const auto ignore = [](std::uint32_t) {};
    for (unsigned step = 0; step < 3 * count; ++step) {
      ASSERT_EQ(queue.Pop(first, now, ignore, ignore), !wanted.empty());
      if (!wanted.empty()) {
        ASSERT_EQ(std::pair(first.cost, unsigned{first.pair}), *wanted.begin()) << "seed " << seed;
        costs[first.pair] = -1;
        wanted.erase(wanted.begin());
      }
      for (unsigned i = 0; i < 3; ++i) change(static_cast<unsigned>(random() % count));
      if (step % 97 == 0) {
        queue.Clean(now);
        ASSERT_GE(queue.Size(), wanted.size());
      }
    }
  }
}

}  // namespace
}  // namespace lumo
