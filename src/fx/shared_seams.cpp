#include "fx/shared_seams.h"

#include <algorithm>

namespace lumo {
namespace {

bool IsSound(const SeamStrip& strip, std::uint32_t width) {
  return strip.first.size() == width && strip.last.size() == width &&
         strip.isSameAbove.size() == width && strip.zone.IsSound(width);
}

bool GetSeams(ShareReader& from, SeamStrip& strip) {
  return GetList(from, strip.first) && GetList(from, strip.last) &&
         GetList(from, strip.isSameAbove) && GetList(from, strip.zone.up) &&
         GetList(from, strip.zone.hasLeft) && GetList(from, strip.zone.first) &&
         GetList(from, strip.zone.last);
}

bool GetWays(ShareReader& from, ShareWays& ways) {
  return from.Get(ways.ways.minima) && GetList(from, ways.ways.firstLabels) &&
         GetList(from, ways.ways.lastLabels) && GetList(from, ways.isFirstFar) &&
         GetList(from, ways.isLastFar) && GetList(from, ways.levels);
}

/// True for ways that lead to minima of the share, or to shares that are there.
bool IsSound(const ShareWays& ways, std::uint32_t width, bool hasAbove, bool hasBelow,
             bool isRanked) {
  const auto leads = [&](std::int32_t label) {
    if (label >= 0) return static_cast<std::uint32_t>(label) <= ways.ways.minima;
    const std::int64_t beyond = -1 - std::int64_t{label};
    return beyond < width ? hasAbove : hasBelow && beyond < 2 * std::int64_t{width};
  };
  return ways.ways.firstLabels.size() == width && ways.ways.lastLabels.size() == width &&
         ways.isFirstFar.size() == width && ways.isLastFar.size() == width &&
         (!isRanked || ways.levels.size() == ways.ways.minima) &&
         std::all_of(ways.ways.firstLabels.begin(), ways.ways.firstLabels.end(), leads) &&
         std::all_of(ways.ways.lastLabels.begin(), ways.ways.lastLabels.end(), leads);
}

/// Lists the minima that go on from the share above.
void ListJoins(const ShareWays& upper, std::uint32_t firstUpper, const ShareWays& lower,
               std::uint32_t firstLower, std::vector<MinimumNumbers::Join>& joins) {
  for (std::size_t x = 0; x < upper.ways.lastLabels.size(); ++x) {
    // On one level, or one of them would have a way down.
    if (upper.isLastFar[x] == 0 || lower.isFirstFar[x] == 0) continue;
    if (upper.ways.lastLabels[x] <= 0 || lower.ways.firstLabels[x] <= 0) continue;  // excluded
    const MinimumNumbers::Join join{
        firstUpper + static_cast<std::uint32_t>(upper.ways.lastLabels[x]) - 1,
        firstLower + static_cast<std::uint32_t>(lower.ways.firstLabels[x]) - 1};
    if (joins.empty() || joins.back() != join) joins.push_back(join);
  }
}

}  // namespace

void PutSeams(ShareWriter& to, const SeamStrip& strip) {
  PutList(to, strip.first);
  PutList(to, strip.last);
  PutList(to, strip.isSameAbove);
  PutList(to, strip.zone.up);
  PutList(to, strip.zone.hasLeft);
  PutList(to, strip.zone.first);
  PutList(to, strip.zone.last);
}

bool ReadSettledSeams(const SegmentShares& shares, const ShareCut& cut,
                      std::vector<SeamStrip>& strips) {
  strips.resize(cut.Shares());
  for (unsigned share = 0; share < strips.size(); ++share) {
    ShareReader from;
    if (!shares.Open(0, share, 0, from)) return false;
    if (!GetSeams(from, strips[share]) || !IsSound(strips[share], cut.width)) {
      return shares.Refuse(0, share);
    }
  }
  SettleSeams(strips, cut.width);
  return true;
}

void PutWays(ShareWriter& to, const ShareWays& ways) {
  to.Put(ways.ways.minima);
  PutList(to, ways.ways.firstLabels);
  PutList(to, ways.ways.lastLabels);
  PutList(to, ways.isFirstFar);
  PutList(to, ways.isLastFar);
  PutList(to, ways.levels);
}

bool SharedSeams::Read(const SegmentShares& shares, const ShareCut& cut, bool isRanked) {
  width_ = cut.width;
  std::vector<ShareWays> ways(cut.Shares());
  for (unsigned share = 0; share < ways.size(); ++share) {
    ShareReader from;
    if (!shares.Open(1, share, 0, from)) return false;
    if (!GetWays(from, ways[share]) ||
        !IsSound(ways[share], width_, share > 0, share + 1 < ways.size(), isRanked)) {
      return shares.Refuse(1, share);
    }
  }
  if (!Number(ways)) return false;
  first_.resize(ways.size());
  last_.resize(ways.size());
  for (unsigned share = 0; share < ways.size(); ++share) {
    const auto follow = [&](std::int32_t label) { return Follow(ways, share, label); };
    const auto followAll = [&](const std::vector<std::int32_t>& from, auto& to) {
      to.resize(from.size());
      std::transform(from.begin(), from.end(), to.begin(), follow);
      return std::find(to.begin(), to.end(), -1) == to.end();
    };
    if (!followAll(ways[share].ways.firstLabels, first_[share]) ||
        !followAll(ways[share].ways.lastLabels, last_[share])) {
      return shares.Refuse(1, share);
    }
  }
  if (!isRanked) return true;
  MinimumNumbers::Ranking ranking(numbers_);
  for (const ShareWays& share : ways) {
    for (const std::int32_t level : share.levels) ranking.Add(level);
  }
  ranks_ = ranking.Finish();
  return true;
}

/// Numbers the minima of all shares.
bool SharedSeams::Number(const std::vector<ShareWays>& ways) {
  numbers_.Clear();
  std::vector<MinimumNumbers::Join> joins;
  for (unsigned share = 0; share < ways.size(); ++share) {
    if (!numbers_.AddStrip(ways[share].ways.minima)) return false;
    if (share == 0) continue;
    ListJoins(ways[share - 1], numbers_.FirstNumberOf(share - 1), ways[share],
              numbers_.FirstNumberOf(share), joins);
  }
  numbers_.Connect(joins);
  return true;
}

/// The label of the minimum to which a way leads; -1 for one that leads around in a circle.
std::int32_t SharedSeams::Follow(const std::vector<ShareWays>& ways, unsigned share,
                                 std::int32_t label) const {
  for (std::uint64_t steps = 2 * ways.size() * std::uint64_t{width_}; label < 0; --steps) {
    if (steps == 0) return -1;
    const auto beyond = static_cast<std::uint32_t>(-1 - label);
    if (beyond < width_) {
      label = ways[--share].ways.lastLabels[beyond];
    } else {
      label = ways[++share].ways.firstLabels[beyond - width_];
    }
  }
  if (label == 0) return 0;
  return static_cast<std::int32_t>(numbers_.LabelOf(share, static_cast<std::uint32_t>(label) - 1));
}

std::vector<bool> SharedSeams::MarkSeamBasins() const {
  std::vector<bool> marks(std::size_t{numbers_.Count()} + 1);
  for (std::size_t share = 1; share < first_.size(); ++share) {
    for (const std::int32_t label : first_[share]) marks[static_cast<std::size_t>(label)] = true;
  }
  return marks;
}

}  // namespace lumo
