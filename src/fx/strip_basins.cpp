#include "fx/strip_basins.h"

#include <algorithm>

#include "fx/pair_join.h"

namespace lumo {

/// Makes numbers of labels: for its own their order, for others that in which they are met.
void StripBasins::Number(std::int32_t* labels, std::size_t count, const Labels& own) {
  std::int32_t last = 0, number = 0;
  for (std::size_t i = 0; i < count; ++i) {
    if (labels[i] != last) {
      last = labels[i];
      const std::uint32_t place = static_cast<std::uint32_t>(last) - own.first;  // far off below it
      if (last == 0) {
        number = 0;
      } else if (place - 1 < own.count) {
        number = static_cast<std::int32_t>(place);
      } else {
        const auto next = static_cast<std::uint32_t>(own.count + others_.size() + 1);
        number = static_cast<std::int32_t>(others_.try_emplace(last, next).first->second);
      }
    }
    labels[i] = number;
  }
}

void StripBasins::Mark(const Lines& lines, const std::vector<std::int32_t>& below) {
  if (lines.hasAbove) {
    for (std::uint32_t x = 0; x < lines.width; ++x) {
      basins[static_cast<std::size_t>(lines.labels[x])].continues = true;
    }
  }
  for (const std::int32_t number : below) basins[static_cast<std::size_t>(number)].goesOn = true;
  basins[0] = {};
}

void StripBasins::ListRuns(const Lines& lines) {
  for (std::size_t at = 0; at < lines.pixels;) {
    const std::int32_t number = lines.labels[at];
    const std::size_t first = at;
    for (++at; at % lines.width != 0 && lines.labels[at] == number;) ++at;
    if (basins[static_cast<std::size_t>(number)].continues) {
      runs.push_back(
          {first, static_cast<std::uint32_t>(at - first), static_cast<std::uint32_t>(number)});
    }
  }
}

/// Finds the basins. @return  the numbers of those of the line below; none at the end.
std::vector<std::int32_t> StripBasins::FindBasins(const Lines& lines, const Labels& own) {
  std::vector<std::int32_t> below;
  if (lines.below != nullptr) below.assign(lines.below, lines.below + lines.width);
  Number(lines.labels, lines.pixels, own);
  Number(below.data(), below.size(), own);
  basins.resize(std::size_t{own.count} + others_.size() + 1);
  for (std::uint32_t i = 1; i <= own.count; ++i) basins[i].label = own.first + i;
  for (const auto& [label, number] : others_) {
    basins[number].label = static_cast<std::uint32_t>(label);
  }
  others_ = {};
  Mark(lines, below);
  return below;
}

void StripBasins::Find(const Lines& lines, const Labels& own, LabelPairs& scratch) {
  const std::vector<std::int32_t> below = FindBasins(lines, own);
  ListRuns(lines);
  scratch.Begin(basins.size());
  ForEachStripEdge(lines.labels, lines.pixels, lines.width, below.empty() ? nullptr : below.data(),
                   [&](std::uint32_t a, std::uint32_t b) { scratch.AddEdge(a, b); });
  pairs = scratch.Pairs();
}

void StripBasins::FindInParts(const Lines& lines, const Labels& own, LabelPairs& scratch) {
  constexpr std::size_t kLines = 32;
  const std::vector<std::int32_t> below = FindBasins(lines, own);
  const std::size_t part = kLines * lines.width;
  std::vector<bool> atSeams(basins.size());
  for (std::size_t at = part; at < lines.pixels; at += part) {
    for (std::uint32_t x = 0; x < lines.width; ++x) {
      atSeams[static_cast<std::size_t>(lines.labels[at + x])] = true;
    }
  }
  detail::PairList list;
  detail::PairJoin<detail::PairList> join(list, std::move(atSeams));
  for (std::size_t at = 0; at < lines.pixels; at += part) {
    const std::size_t count = std::min(part, lines.pixels - at);
    const std::int32_t* const last = below.empty() ? nullptr : below.data();
    scratch.Begin(basins.size() / (lines.pixels / part + 1));
    ForEachStripEdge(lines.labels + at, count, lines.width,
                     at + count < lines.pixels ? lines.labels + at + count : last,
                     [&](std::uint32_t a, std::uint32_t b) { scratch.AddEdge(a, b); });
    for (const LabelPair& pair : scratch.Pairs()) join.Add(pair);
  }
  pairs = std::move(list.pairs);
}

}  // namespace lumo
