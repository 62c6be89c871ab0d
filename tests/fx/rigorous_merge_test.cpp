#include "fx/rigorous_merge.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <random>

#include <gtest/gtest.h>

namespace lumo {
namespace {

/// Adds `pixels` pixels of one band to a segment.
void Add(RigorousMerge& merge, std::uint32_t label, unsigned pixels, double value) {
  for (unsigned i = 0; i < pixels; ++i) merge.AddPixel(label, &value, 0);
}

TEST(RigorousMerge, NumbersGroupsAndTheLabelsThatStayAlone) {
  RigorousMerge merge;
  merge.Begin(6, 1);
  // Costs: 1 and 2 are alike, 4 and 5 are, 3 differs from all, 0 and 6 have no pixels.
  Add(merge, 1, 2, 10);
  Add(merge, 2, 2, 11);  // 2 * 2 / 4 * 1 / length
  Add(merge, 3, 5, 90);
  Add(merge, 4, 3, 50);
  Add(merge, 5, 3, 50);
  const std::vector<LabelPair> pairs{{4, 5, 1}, {1, 2, 2}, {2, 3, 1}, {3, 4, 1}, {0, 6, 1}};
  // Rows come by their lower label: 1 and 2 are group 1, 4 and 5 group 2. The labels that stay
  // alone, 0, 3 and 6, follow from the number of the last group on.
  EXPECT_EQ(merge.Join(pairs, 0.6), (std::vector<std::uint32_t>{2, 1, 1, 3, 2, 2, 4}));
  EXPECT_EQ(merge.Join(pairs, 0.5), (std::vector<std::uint32_t>{1, 2, 3, 4, 1, 1, 5}));
  EXPECT_EQ(merge.Join(pairs, 0), (std::vector<std::uint32_t>{0, 1, 2, 3, 4, 5, 6}));
  EXPECT_EQ(merge.Join(pairs, -1), (std::vector<std::uint32_t>{0, 1, 2, 3, 4, 5, 6}));
}

TEST(RigorousMerge, GivesTheComponentsOfTheGraphBelowTheThreshold) {
  std::mt19937 random(7);
  RigorousMerge merge;
  for (int round = 0; round < 500; ++round) {
    const std::uint32_t labels = 2 + random() % 30;
    merge.Begin(labels, 1);
    std::vector<double> values(labels + 1);
    for (std::uint32_t label = 0; label <= labels; ++label) {
      values[label] = static_cast<double>(random() % 8);
      Add(merge, label, 2, values[label]);
    }
    std::vector<LabelPair> pairs;
    for (int i = 0; i < 40; ++i) {
      const std::uint32_t a = random() % labels, b = a + 1 + random() % (labels - a);
      pairs.push_back({a, b, 1});
    }
    const std::vector<std::uint32_t> numbers = merge.Join(pairs, 4.5);
    // Components by spreading the smallest label until nothing changes. The cost is the square of
    // the difference.
    std::vector<std::uint32_t> component(labels + 1);
    for (std::uint32_t label = 0; label <= labels; ++label) component[label] = label;
    for (bool hasChanged = true; hasChanged;) {
      hasChanged = false;
      for (const LabelPair& pair : pairs) {
        if (std::abs(values[pair.low] - values[pair.high]) > 2.1) continue;
        const std::uint32_t least = std::min(component[pair.low], component[pair.high]);
        hasChanged |= component[pair.low] != least || component[pair.high] != least;
        component[pair.low] = component[pair.high] = least;
      }
    }
    std::uint32_t first =
        std::numeric_limits<std::uint32_t>::max();  // alone, with a group's number
    for (std::uint32_t label = labels + 1; label-- > 0;) {
      const auto count = std::count(component.begin(), component.end(), component[label]);
      if (count == 1) first = label;
    }
    for (std::uint32_t a = 0; a <= labels; ++a) {
      for (std::uint32_t b = 0; b < a; ++b) {
        if (a == first || b == first) continue;
        EXPECT_EQ(numbers[a] == numbers[b], component[a] == component[b]) << a << " " << b;
      }
    }
  }
}

TEST(RigorousMerge, ToldSumsLoseWhatAFloatCantHold) {
  for (const Form sums : {Form::kTold, Form::kExact}) {
    RigorousMerge merge;
    merge.Begin(2, 1, sums);
    Add(merge, 1, 1, 16'777'216.0);  // 2^24
    Add(merge, 1, 3, 1.0);           // told: each is lost
    Add(merge, 2, 1, 4'194'304.75);  // the exact mean of 1
    const std::vector<std::uint32_t> numbers = merge.Join({{1, 2, 1}}, 0.1);
    EXPECT_EQ(numbers[1] == numbers[2], sums == Form::kExact);
  }
}

}  // namespace
}  // namespace lumo
